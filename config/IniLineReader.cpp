#include "config/IniLineReader.h"

#include "config/IniStore.h"

#include <cstring>

namespace qv_ini {
namespace {

bool IsBreak(char c) { return c == '\n' || c == '\r' || c == '\0'; }

}  // namespace

LineReader::LineReader(FILE* stream, const char* prefix, size_t prefixLength) : m_stream(stream) {
    std::memcpy(m_chunk, prefix, prefixLength);
    m_length = prefixLength;
}

int LineReader::Next(std::string_view* line) {
    m_carry.clear();
    bool started = false;
    bool checkedFirst = false;
    for (;;) {
        if (m_position == m_length) {
            int filled = Fill();
            if (filled < 0) {
                return filled;
            }
            if (filled == 0) {
                *line = m_carry;
                return started ? 1 : 0;
            }
        }
        if (!checkedFirst) {
            checkedFirst = true;
            char c = m_chunk[m_position];
            if (IsBreak(c) && c != m_previousBreak) {
                ++m_position;
                continue;
            }
        }
        started = true;
        size_t end = m_position;
        while (end < m_length && !IsBreak(m_chunk[end])) {
            ++end;
        }
        if (end == m_length) {
            m_carry.append(m_chunk + m_position, end - m_position);
            m_position = end;
            continue;
        }
        m_previousBreak = m_chunk[end];
        if (m_carry.empty()) {
            *line = std::string_view(m_chunk + m_position, end - m_position);
        } else {
            m_carry.append(m_chunk + m_position, end - m_position);
            *line = m_carry;
        }
        m_position = end + 1;
        return 1;
    }
}

int LineReader::Fill() {
    if (m_eof) {
        return 0;
    }
    size_t n = std::fread(m_chunk, 1, kChunkSize, m_stream);
    m_position = 0;
    m_length = n;
    if (n < kChunkSize) {
        if (std::ferror(m_stream)) {
            return kIniReadError;
        }
        m_eof = true;
    }
    return n > 0 ? 1 : 0;
}

}  // namespace qv_ini
