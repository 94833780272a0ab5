// Past the end, Name/Key/Value give empty texts rather than reading outside the copies.
#include "config/ConfigIterators.h"

namespace ph_fwk {

FileIO_SectionIterator::FileIO_SectionIterator(std::vector<std::string> names)
    : m_names(std::move(names)) {}

bool FileIO_SectionIterator::Next() {
    if (AtEnd()) {
        return false;
    }
    ++m_nPosition;
    return true;
}

bool FileIO_SectionIterator::AtEnd() const { return m_nPosition >= m_names.size(); }

std::string FileIO_SectionIterator::Name() const {
    return AtEnd() ? std::string() : m_names[m_nPosition];
}

FileIO_KeyIterator::FileIO_KeyIterator(std::vector<std::pair<std::string, std::string>> pairs)
    : m_pairs(std::move(pairs)) {}

bool FileIO_KeyIterator::Next() {
    if (AtEnd()) {
        return false;
    }
    ++m_nPosition;
    return true;
}

bool FileIO_KeyIterator::AtEnd() const { return m_nPosition >= m_pairs.size(); }

std::string FileIO_KeyIterator::Key() const {
    return AtEnd() ? std::string() : m_pairs[m_nPosition].first;
}

std::string FileIO_KeyIterator::Value() const {
    return AtEnd() ? std::string() : m_pairs[m_nPosition].second;
}

}  // namespace ph_fwk
