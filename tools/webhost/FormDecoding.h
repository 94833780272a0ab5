// Decoding of the parts of a request URL and of a form body: percent-decoding, the
// name=value pairs of a query string or an application/x-www-form-urlencoded body, and the
// operation name, which is the last segment of the path. Pure functions; any thread.
// Malformed input (a '%' not followed by two hex digits) makes them return false.
#pragma once

#include <string>

#include "platform/ws_runtime/RequestVariables.h"

namespace qv {
namespace devtools {

// Decodes %XX escapes, and '+' as a space when `plusIsSpace`.
bool PercentDecode(const std::string& text, bool plusIsSpace, std::string& decoded);

// Adds every name=value pair of `text` ('&'-separated; a pair without '=' has an empty
// value; empty pairs are skipped) to `variables` as exact-name variables, in order.
bool AddFormPairs(const std::string& text, wsruntime::RequestVariables& variables);

// Splits an origin-form request target "/a/b/op?query" into the decoded last path segment
// and the raw query. False for a target that does not start with '/' or does not decode.
bool SplitTarget(const std::string& target, std::string& operation, std::string& query);

}  // namespace devtools
}  // namespace qv
