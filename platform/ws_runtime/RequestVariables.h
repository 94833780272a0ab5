// The variables of one HTTP request as the host runtime offers them to the plug-in, in the
// order they are searched: query parameters and form fields match their name exactly;
// header names match ignoring ASCII case with '-' and '_' equivalent (X-QV-Accept answers
// X_QV_ACCEPT). The first match wins.
//
// Filled by one thread, then only read (Find is const and may run on several threads).
// Nothing fails except memory exhaustion (std::bad_alloc) while adding.
#pragma once

#include <string>
#include <vector>

#include "platform/ws_runtime/WsRuntime.h"

namespace qv {
namespace wsruntime {

class QV_WS_RUNTIME_API RequestVariables {
public:
    void AddExact(std::string name, std::string value);   // query parameter or form field
    void AddHeader(std::string name, std::string value);  // HTTP header

    // The value of the first variable that matches `name`, or null.
    const std::string* Find(const std::string& name) const;

    // True when the header name `header` answers the variable name `name`.
    static bool HeaderMatches(const std::string& header, const std::string& name);

private:
    struct Variable {
        std::string name;
        std::string value;
        bool isHeader;
    };
    std::vector<Variable> m_variables;
};

}  // namespace wsruntime
}  // namespace qv
