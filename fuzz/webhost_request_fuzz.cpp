// Fuzz target: the development host's request-variable parsing. The input is one raw HTTP
// request; Beast parses it as the host's sessions do (same body limit), and the host's
// RequestDispatcher turns it into request variables (query, form body, headers) and calls
// a stand-in for the plug-in's Run, which reads variables through libws_runtime exactly as
// the plug-in does. No socket and no plug-in: the dispatcher takes the run entry as a
// function pointer. The same bytes also drive the pure helpers the dispatcher relies on:
// percent-decoding of an encoded copy, and the session number parser against from_chars.
#include <boost/beast/core/error.hpp>
#include <boost/beast/http/parser.hpp>
#include <boost/beast/http/string_body.hpp>

#include <cctype>
#include <charconv>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "platform/ws_runtime/RequestTable.h"
#include "platform/ws_runtime/WsRuntime.h"
#include "qv/zil/Exceptions.h"
#include "tools/webhost/FormDecoding.h"
#include "tools/webhost/HostRequestContext.h"
#include "tools/webhost/HttpSession.h"
#include "tools/webhost/RequestDispatcher.h"

namespace {

namespace http = boost::beast::http;
using qv::devtools::HostRequestContext;
using qv::devtools::HttpRequest;
using qv::devtools::HttpSession;
using qv::devtools::RequestDispatcher;

void Check(bool condition, const char* what) {
    if (!condition) {
        std::fprintf(stderr, "webhost_request_fuzz: %s\n", what);
        std::abort();
    }
}

// What the stand-in run entry sees of the request being dispatched.
const HttpRequest* g_request = nullptr;
std::string g_operation;  // the decoded last path segment
bool g_ran = false;

constexpr int32_t kRunStatus = 299;
const char kRunBody[] = "run\t";

// The full value of a variable through the runtime (null-buffer size query, then a copy),
// checked against a copy into a 4-byte buffer. False when the variable is absent.
bool ReadVariable(uint32_t handle, const std::string& name, std::string& value) {
    uint32_t size = 0;
    if (ReadRequestVariable_C_REST_QV_GXWS_(handle, name.c_str(), nullptr, &size) != 0) {
        Check(size == 0, "an absent variable reported a size");
        return false;
    }
    Check(size >= 1, "a present variable reported size 0");
    std::vector<char> buffer(size);
    uint32_t full = size;
    Check(ReadRequestVariable_C_REST_QV_GXWS_(handle, name.c_str(), buffer.data(), &full) == 0 &&
              full == size && buffer[size - 1] == '\0',
          "the full copy of a variable differs from its size");
    value.assign(buffer.data(), size - 1);

    char small[4] = {'x', 'x', 'x', 'x'};
    uint32_t smallSize = sizeof small;
    Check(ReadRequestVariable_C_REST_QV_GXWS_(handle, name.c_str(), small, &smallSize) == 0 &&
              smallSize == size,
          "a short copy reported another size");
    const size_t kept = value.size() < 3 ? value.size() : 3;
    Check(std::memcmp(small, value.data(), kept) == 0 && small[kept] == '\0',
          "a short copy is not the cut value with its NUL");
    return true;
}

// from_chars as the reference for HostRequestContext::ParseInt64: an optional '+' (which
// from_chars does not take) or '-', then decimal digits only, within the 64-bit range.
bool ReferenceInt64(const std::string& text, int64_t& value) {
    const char* begin = text.data();
    const char* end = begin + text.size();
    if (begin != end && *begin == '+') {
        ++begin;
        if (begin != end && *begin == '-') {
            return false;
        }
    }
    if (begin == end || (*begin == '-' && begin + 1 == end)) {
        return false;
    }
    const std::from_chars_result result = std::from_chars(begin, end, value);
    return result.ec == std::errc() && result.ptr == end;
}

void StandInRun(qv::wsruntime::IRequestContext* context, uint32_t handle) {
    g_ran = true;
    const qv::zil::WideString* operation = context->GetOperationName();
    Check(operation != nullptr, "no operation name");
    const qv::zil::ByteString narrow(*operation);
    Check(std::string(narrow.data(), narrow.size()) == g_operation,
          "the operation name differs from the decoded last path segment");

    // Every header answers under its own name ('-' and '_' alike), unless a query or form
    // variable of exactly that name comes first.
    for (const auto& field : *g_request) {
        std::string name(field.name_string());
        if (name.find('\0') != std::string::npos) {
            continue;
        }
        std::string value;
        Check(ReadVariable(handle, name, value), "a header is not a request variable");
        for (char& c : name) {
            c = c == '-' ? '_' : c;
        }
        Check(ReadVariable(handle, name, value), "a header does not answer with '_' for '-'");
    }
    std::string value;
    for (const char* name : {"X_QV_ACCEPT", "X_QV_TAG", "a", ""}) {
        ReadVariable(handle, name, value);
    }

    std::string text;
    const bool present = ReadVariable(handle, "session", text);
    int64_t number = 0;
    bool converted = true;
    try {
        context->GetInt64Value(qv::zil::WideString(L"session"), number);
    } catch (const qv::zil::exception::UnableToConvert&) {
        converted = false;
    }
    int64_t reference = 0;
    const bool expected = present && ReferenceInt64(text, reference);
    Check(converted == expected, "GetInt64Value disagrees with from_chars on accepting");
    Check(!converted || number == reference, "GetInt64Value disagrees with from_chars");

    SetHTTPResponseCode_QV_GXWS_(handle, kRunStatus);
    WriteOutput_C_REST_QV_GXWS_(handle, kRunBody, sizeof kRunBody - 1);
}

void FuzzDispatch(const uint8_t* data, size_t size) {
    http::request_parser<http::string_body> parser;
    parser.eager(true);
    parser.body_limit(HttpSession::kBodyLimit);
    boost::beast::error_code error;
    size_t used = 0;
    while (used < size && !parser.is_done()) {
        const size_t n = parser.put(boost::asio::buffer(data + used, size - used), error);
        used += n;
        if (error == http::error::need_more) {
            // As in Beast's own read loop, the parser sees its unused bytes again only
            // together with more input; there is none, so the input ends here.
            error = {};
            break;
        }
        if (error) {
            return;
        }
        if (n == 0) {
            break;
        }
    }
    if (!parser.is_done()) {
        if (!parser.got_some()) {
            return;  // Beast allows the end of input only after the start of a message
        }
        parser.put_eof(error);
        if (error || !parser.is_done()) {
            return;
        }
    }
    const HttpRequest& request = parser.get();

    std::string query;
    g_operation.clear();
    const bool targetDecodes =
        qv::devtools::SplitTarget(std::string(request.target()), g_operation, query);
    g_request = &request;
    g_ran = false;
    const RequestDispatcher dispatcher(&StandInRun);
    const qv::devtools::HttpResponse response = dispatcher.Dispatch(request);
    g_request = nullptr;

    Check(qv::wsruntime::RequestTable::OpenCount() == 0, "a request stayed open");
    Check(g_ran || response.result_int() == 400, "a request neither ran nor was refused with 400");
    Check(!g_ran || targetDecodes, "a request ran whose target does not decode");
    if (g_ran) {
        Check(response.result_int() == kRunStatus && response.body() == kRunBody,
              "the response is not what the run entry set");
    }
}

// Percent-encodes every byte of the input, some as %XX and some as themselves; decoding
// must give the input back, with '+' left alone unless it stands for a space.
void FuzzPercentDecode(const uint8_t* data, size_t size) {
    static const char kHex[] = "0123456789abcdef";
    std::string original(reinterpret_cast<const char*>(data), size);
    std::string encoded;
    for (size_t i = 0; i < size; ++i) {
        const unsigned char c = data[i];
        const bool literal = c != '%' && c != '+' && (i % 3 != 0);
        if (literal) {
            encoded += static_cast<char>(c);
        } else {
            encoded += '%';
            encoded += kHex[c >> 4];
            encoded += (i & 1) ? static_cast<char>(std::toupper(kHex[c & 15])) : kHex[c & 15];
        }
    }
    std::string decoded;
    Check(qv::devtools::PercentDecode(encoded, true, decoded) && decoded == original,
          "percent-decoding does not give the encoded bytes back");
    Check(qv::devtools::PercentDecode(encoded, false, decoded) && decoded == original,
          "percent-decoding without '+' as space does not give the encoded bytes back");
    // The raw input itself: either refused or no longer than it was.
    if (qv::devtools::PercentDecode(original, true, decoded)) {
        Check(decoded.size() <= original.size(), "percent-decoding made the text longer");
    }
}

void FuzzParseInt64(const uint8_t* data, size_t size) {
    const std::string text(reinterpret_cast<const char*>(data), size < 32 ? size : 32);
    int64_t value = 0;
    int64_t reference = 0;
    const bool accepted = HostRequestContext::ParseInt64(text, value);
    Check(accepted == ReferenceInt64(text, reference),
          "ParseInt64 disagrees with from_chars on accepting");
    Check(!accepted || value == reference, "ParseInt64 disagrees with from_chars");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    FuzzDispatch(data, size);
    FuzzPercentDecode(data, size);
    FuzzParseInt64(data, size);
    return 0;
}
