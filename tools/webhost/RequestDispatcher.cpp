#include "tools/webhost/RequestDispatcher.h"

#include <boost/beast/http/field.hpp>

#include "platform/ws_runtime/RequestTable.h"
#include "qv/zil/Exception.h"
#include "tools/webhost/FormDecoding.h"
#include "tools/webhost/HostRequestContext.h"

namespace qv {
namespace devtools {

namespace http = boost::beast::http;

namespace {

bool IsFormBody(const HttpRequest& request) {
    const auto found = request.find(http::field::content_type);
    if (found == request.end()) {
        return false;
    }
    std::string type(found->value());
    type = type.substr(0, type.find(';'));
    while (!type.empty() && (type.back() == ' ' || type.back() == '\t')) {
        type.pop_back();
    }
    static const char kForm[] = "application/x-www-form-urlencoded";
    if (type.size() != sizeof kForm - 1) {
        return false;
    }
    for (std::string::size_type i = 0; i < type.size(); ++i) {
        const char c = type[i];
        const char lower = (c >= 'A' && c <= 'Z') ? static_cast<char>(c - 'A' + 'a') : c;
        if (lower != kForm[i]) {
            return false;
        }
    }
    return true;
}

}  // namespace

HttpResponse RequestDispatcher::MakeResponse(unsigned status, std::string body, unsigned version,
                                             bool keepAlive) {
    HttpResponse response(static_cast<http::status>(status), version);
    response.set(http::field::content_type, "text/plain; charset=utf-8");
    response.body() = std::move(body);
    response.keep_alive(keepAlive);
    response.prepare_payload();
    return response;
}

HttpResponse RequestDispatcher::Dispatch(const HttpRequest& request) const {
    const unsigned version = request.version();
    const bool keepAlive = request.keep_alive();
    std::string operation;
    std::string query;
    wsruntime::RequestVariables variables;
    if (!SplitTarget(std::string(request.target()), operation, query) ||
        !AddFormPairs(query, variables) ||
        (IsFormBody(request) && !AddFormPairs(request.body(), variables))) {
        return MakeResponse(400, "malformed request target or form body\n", version, false);
    }
    for (const auto& field : request) {
        variables.AddHeader(std::string(field.name_string()), std::string(field.value()));
    }

    try {
        HostRequestContext context(operation, variables);
        const uint32_t handle = wsruntime::RequestTable::Open(variables);
        m_run(&context, handle);
        wsruntime::RequestTable::Response answer = wsruntime::RequestTable::Close(handle);
        return MakeResponse(answer.status == 0 ? 200 : static_cast<unsigned>(answer.status),
                            std::move(answer.body), version, keepAlive);
    } catch (const zil::exception::Exception&) {
        // An operation name that is not UTF-8.
        return MakeResponse(400, "malformed operation name\n", version, false);
    }
}

}  // namespace devtools
}  // namespace qv
