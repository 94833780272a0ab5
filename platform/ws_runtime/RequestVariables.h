// The variables of one HTTP request as the host runtime offers them to the plug-in, in the
// order they are searched: query parameters and form fields match their name exactly;
// header names match ignoring ASCII case with '-' and '_' equivalent (X-QV-Accept answers
// X_QV_ACCEPT). The first match wins.
//
// Filled by one thread, then only read (Find is const and may run on several threads).
// Nothing fails except memory exhaustion (std::bad_alloc) while adding. Exact names are
// found through an index (a plug-in reads a hundred variables of one request), headers by
// a scan of the headers alone. Not copyable: the index points into the stored names.
#pragma once

#include <deque>
#include <string>
#include <string_view>
#include <unordered_map>

#include "platform/ws_runtime/WsRuntime.h"

namespace qv {
namespace wsruntime {

class QV_WS_RUNTIME_API RequestVariables {
public:
    RequestVariables() = default;
    RequestVariables(const RequestVariables&) = delete;
    RequestVariables& operator=(const RequestVariables&) = delete;

    void AddExact(std::string name, std::string value);   // query parameter or form field
    void AddHeader(std::string name, std::string value);  // HTTP header

    // The value of the first variable that matches `name`, or null.
    const std::string* Find(std::string_view name) const;
    // As Find; when the value is a query parameter's or form field's found under exactly
    // this name, `exactName` also views its stored name (valid as long as this object),
    // otherwise it is left empty.
    const std::string* Find(std::string_view name, std::string_view& exactName) const;

    // True when the header name `header` answers the variable name `name`.
    static bool HeaderMatches(std::string_view header, std::string_view name);

private:
    struct Variable {
        std::string name;
        std::string value;
        bool isHeader;
    };
    // A deque never moves the variables it holds, so the views in m_exact stay valid.
    std::deque<Variable> m_variables;
    std::unordered_map<std::string_view, const std::string*> m_exact;  // first value per name
};

}  // namespace wsruntime
}  // namespace qv
