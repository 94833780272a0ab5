// The line reader of the INI parser: reads a stream in chunks of 2084 bytes and hands out
// its lines. A line ends at LF, CR or NUL; a break character first in a line that differs
// from the one that ended the previous line is skipped, so CR LF and LF CR are one break.
// Lines have no length limit. Used by one thread; a read error gives kIniReadError.
#pragma once

#include <cstddef>
#include <cstdio>
#include <string>
#include <string_view>

namespace qv_ini {

class LineReader {
public:
    static constexpr size_t kChunkSize = 2084;

    // prefix: bytes already taken from the stream (at most 4) that come first.
    LineReader(FILE* stream, const char* prefix, size_t prefixLength);
    LineReader(const LineReader&) = delete;
    LineReader& operator=(const LineReader&) = delete;

    // 1 with a line (valid until the next call), 0 at the end, kIniReadError.
    int Next(std::string_view* line);

private:
    int Fill();

    FILE* m_stream;
    char m_chunk[kChunkSize];
    size_t m_position = 0;
    size_t m_length = 0;
    bool m_eof = false;
    char m_previousBreak = '\0';
    std::string m_carry;
};

}  // namespace qv_ini
