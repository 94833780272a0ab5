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
}

void RequestVariables::AddHeader(std::string name, std::string value) {
    m_variables.push_back(Variable{std::move(name), std::move(value), true});
}

bool RequestVariables::HeaderMatches(const std::string& header, const std::string& name) {
    if (header.size() != name.size()) {
        return false;
    }
    for (std::string::size_type i = 0; i < header.size(); ++i) {
        if (Fold(header[i]) != Fold(name[i])) {
            return false;
        }
    }
    return true;
}

const std::string* RequestVariables::Find(const std::string& name) const {
    // Query and form variables come before headers in m_variables only if the host added
    // them first; search the exact ones first whatever the order of adding.
    for (const Variable& variable : m_variables) {
        if (!variable.isHeader && variable.name == name) {
            return &variable.value;
        }
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
