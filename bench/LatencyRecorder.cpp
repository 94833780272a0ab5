#include "bench/LatencyRecorder.h"

#include <algorithm>
#include <cstdio>

namespace qv {
namespace bench {

void LatencyRecorder::Sort() {
    if (!m_bSorted) {
        std::sort(m_samples.begin(), m_samples.end());
        m_bSorted = true;
    }
}

double LatencyRecorder::PercentileUs(double p) {
    if (m_samples.empty()) {
        return 0.0;
    }
    Sort();
    const size_t last = m_samples.size() - 1;
    const size_t index = std::min(last, static_cast<size_t>(p * static_cast<double>(last) + 0.5));
    return static_cast<double>(m_samples[index]) / 1000.0;
}

bool LatencyRecorder::WriteDistribution(const std::string& path, uint32_t points) {
    std::FILE* file = std::fopen(path.c_str(), "w");
    if (file == nullptr) {
        return false;
    }
    Sort();
    std::fprintf(file, "# latency_us fraction_at_or_below (%zu requests)\n", m_samples.size());
    const size_t count = m_samples.size();
    const size_t step = points == 0 ? 1 : std::max<size_t>(1, count / points);
    for (size_t i = 0; i < count; i += step) {
        std::fprintf(file, "%.3f %.6f\n", static_cast<double>(m_samples[i]) / 1000.0,
                     static_cast<double>(i + 1) / static_cast<double>(count));
    }
    if (count != 0) {
        std::fprintf(file, "%.3f 1.000000\n", static_cast<double>(m_samples.back()) / 1000.0);
    }
    return std::fclose(file) == 0;
}

}  // namespace bench
}  // namespace qv
