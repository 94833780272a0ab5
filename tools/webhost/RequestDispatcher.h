// Turns one parsed HTTP request into the plug-in's answer: the operation name from the
// last path segment, request variables from the query, a form body and the headers, one
// call of the plug-in's Run through libws_runtime's request table, and the response (200
// unless the plug-in set a status; text/plain; charset=utf-8). A target or form body that
// does not decode is answered 400 without calling the plug-in.
//
// Dispatch may be called from several threads at once; it throws only std::bad_alloc.
#pragma once

#include <boost/beast/http/message.hpp>
#include <boost/beast/http/string_body.hpp>

#include "plugin/EntryPoints.h"

namespace qv {
namespace devtools {

using HttpRequest = boost::beast::http::request<boost::beast::http::string_body>;
using HttpResponse = boost::beast::http::response<boost::beast::http::string_body>;

class RequestDispatcher {
public:
    explicit RequestDispatcher(QvPluginRunEntry run) : m_run(run) {}

    HttpResponse Dispatch(const HttpRequest& request) const;

    // A plain-text response with the given status and body.
    static HttpResponse MakeResponse(unsigned status, std::string body, unsigned version,
                                     bool keepAlive);

private:
    QvPluginRunEntry m_run;
};

}  // namespace devtools
}  // namespace qv
