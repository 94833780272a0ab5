// The latency of every request of one benchmark, kept across its repetitions, and their
// distribution: percentiles and a data file for the plot (latency in microseconds, then
// the fraction of requests that took at most that long). Used by one thread.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace qv {
namespace bench {

class LatencyRecorder {
public:
    void Add(uint64_t nanoseconds) { m_samples.push_back(nanoseconds); }
    void Reserve(uint32_t count) { m_samples.reserve(count); }
    uint32_t Count() const { return static_cast<uint32_t>(m_samples.size()); }

    // The latency in microseconds below which the fraction `p` (0..1) of the requests
    // stayed; 0 without samples.
    double PercentileUs(double p);
    // Writes the cumulative distribution, at most `points` lines plus the largest sample;
    // false when the file cannot be written.
    bool WriteDistribution(const std::string& path, uint32_t points);

private:
    void Sort();

    std::vector<uint64_t> m_samples;
    bool m_bSorted = false;
};

}  // namespace bench
}  // namespace qv
