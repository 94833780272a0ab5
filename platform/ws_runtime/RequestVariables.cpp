#include "platform/ws_runtime/RequestVariables.h"

#include <utility>

namespace qv {
namespace wsruntime {

namespace {

char Fold(char c) {
    if (c >= 'a' && c <= 'z') {
        return static_cast<char>(c - 'a' + 'A');
    }
    return c == '-' ? '_' : c;
}

}  // namespace

void RequestVariables::AddExact(std::string name, std::string value) {
    m_variables.push_back(Variable{std::move(name), std::move(value), false});
    const Variable& added = m_variables.back();
    try {
        m_exact.emplace(std::string_view(added.name), &added.value);  // a repeat keeps the first
    } catch (...) {
        m_variables.pop_back();
        throw;
    }
}

void RequestVariables::AddHeader(std::string name, std::string value) {
    m_variables.push_back(Variable{std::move(name), std::move(value), true});
}

bool RequestVariables::HeaderMatches(std::string_view header, std::string_view name) {
    if (header.size() != name.size()) {
        return false;
    }
    for (std::string_view::size_type i = 0; i < header.size(); ++i) {
        if (Fold(header[i]) != Fold(name[i])) {
            return false;
        }
    }
    return true;
}

const std::string* RequestVariables::Find(std::string_view name) const {
    std::string_view exactName;
    return Find(name, exactName);
}

const std::string* RequestVariables::Find(std::string_view name,
                                          std::string_view& exactName) const {
    exactName = std::string_view();
    // The exact ones first, whatever the order of adding; then the headers in order.
    const auto exact = m_exact.find(name);
    if (exact != m_exact.end()) {
        exactName = exact->first;
        return exact->second;
    }
    for (const Variable& variable : m_variables) {
        if (variable.isHeader && HeaderMatches(variable.name, name)) {
            return &variable.value;
        }
    }
    return nullptr;
}

}  // namespace wsruntime
}  // namespace qv
