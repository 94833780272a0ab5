#include <string>

#include <gtest/gtest.h>

#include "platform/ws_runtime/RequestVariables.h"
#include "platform/ws_runtime/WsRuntime.h"
#include "qv/zil/Exceptions.h"
#include "tools/webhost/FormDecoding.h"
#include "tools/webhost/HostRequestContext.h"
#include "tools/webhost/RequestDispatcher.h"
#include "tools/webhost/WebHostOptions.h"

namespace qv {
namespace devtools {
namespace {

namespace http = boost::beast::http;

TEST(FormDecodingTest, TargetsQueriesAndMalformedEscapes) {
    std::string operation;
    std::string query;
    ASSERT_TRUE(SplitTarget("/qv_variable_iotolvane/check%5Fversion?a=1&b", operation, query));
    EXPECT_EQ(operation, "check_version");
    EXPECT_EQ(query, "a=1&b");
    ASSERT_TRUE(SplitTarget("/close_session", operation, query));
    EXPECT_EQ(operation, "close_session");
    EXPECT_EQ(query, "");
    ASSERT_TRUE(SplitTarget("/x/", operation, query));
    EXPECT_EQ(operation, "");
    EXPECT_FALSE(SplitTarget("http://host/x", operation, query));
    EXPECT_FALSE(SplitTarget("/x/%zz", operation, query));

    wsruntime::RequestVariables variables;
    ASSERT_TRUE(AddFormPairs("a=1+2%2B3&&empty=&flag&a=second&x%3Dy=%26", variables));
    EXPECT_EQ(*variables.Find("a"), "1 2+3");  // first match wins
    EXPECT_EQ(*variables.Find("empty"), "");
    EXPECT_EQ(*variables.Find("flag"), "");
    EXPECT_EQ(*variables.Find("x=y"), "&");
    std::string decoded;
    EXPECT_FALSE(PercentDecode("abc%4", false, decoded));
    EXPECT_FALSE(PercentDecode("%", false, decoded));
    EXPECT_TRUE(PercentDecode("a+b", false, decoded));
    EXPECT_EQ(decoded, "a+b");
    EXPECT_FALSE(AddFormPairs("ok=1&bad=%G0", variables));
}

TEST(HostRequestContextTest, SessionIsAWholeSigned64BitDecimal) {
    int64_t value = 0;
    EXPECT_TRUE(HostRequestContext::ParseInt64("-5", value));
    EXPECT_EQ(value, -5);
    EXPECT_TRUE(HostRequestContext::ParseInt64("9223372036854775807", value));
    EXPECT_EQ(value, INT64_MAX);
    EXPECT_TRUE(HostRequestContext::ParseInt64("-9223372036854775808", value));
    EXPECT_EQ(value, INT64_MIN);
    EXPECT_TRUE(HostRequestContext::ParseInt64("+0", value));
    EXPECT_EQ(value, 0);
    for (const char* bad : {"", "-", "9223372036854775808", "-9223372036854775809", " 1", "1x",
                            "0x10", "99999999999999999999"}) {
        EXPECT_FALSE(HostRequestContext::ParseInt64(bad, value)) << bad;
    }

    wsruntime::RequestVariables variables;
    variables.AddHeader("Session", "12");
    HostRequestContext context("close_session", variables);
    EXPECT_EQ(zil::ByteString(*context.GetOperationName()), zil::ByteString("close_session"));
    value = 0;
    context.GetInt64Value(zil::WideString(L"session"), value);
    EXPECT_EQ(value, 12);
    EXPECT_THROW(context.GetInt64Value(zil::WideString(L"other"), value),
                 zil::exception::UnableToConvert);
}

TEST(WebHostOptionsTest, DefaultsValuesAndRefusals) {
    WebHostOptions defaults;
    std::string error;
    const char* none[] = {"qv-webhost"};
    ASSERT_TRUE(defaults.Parse(1, none, error));
    EXPECT_EQ(defaults.address, "127.0.0.1");
    EXPECT_EQ(defaults.port, 8080);
    EXPECT_EQ(defaults.threads, 4u);
    EXPECT_TRUE(defaults.embeddedRegistry);

    WebHostOptions set;
    const char* some[] = {"qv-webhost", "--listen", "0.0.0.0:0", "--threads=16",
                          "--registry", "external", "--plugin",  "/p.so"};
    ASSERT_TRUE(set.Parse(8, some, error)) << error;
    EXPECT_EQ(set.address, "0.0.0.0");
    EXPECT_EQ(set.port, 0);
    EXPECT_EQ(set.threads, 16u);
    EXPECT_FALSE(set.embeddedRegistry);
    EXPECT_EQ(set.plugin, "/p.so");

    for (const char* bad : {"--listen=8080", "--listen=a:65536", "--threads=0", "--threads=x",
                            "--registry=both", "--bogus=1"}) {
        WebHostOptions options;
        const char* argv[] = {"qv-webhost", bad};
        EXPECT_FALSE(options.Parse(2, argv, error)) << bad;
    }
    WebHostOptions missing;
    const char* dangling[] = {"qv-webhost", "--threads"};
    EXPECT_FALSE(missing.Parse(2, dangling, error));
}

// A run entry that echoes X_QV_TAG and the operation name, and sets 406 when asked to.
void EchoRun(wsruntime::IRequestContext* context, uint32_t handle) {
    uint32_t size = 0;
    ReadRequestVariable_C_REST_QV_GXWS_(handle, "X_QV_TAG", nullptr, &size);
    std::string tag(size == 0 ? 0 : size - 1, '\0');
    if (size != 0) {
        ReadRequestVariable_C_REST_QV_GXWS_(handle, "X_QV_TAG", &tag[0], &size);
    }
    const zil::ByteString name(*context->GetOperationName());
    const std::string body = std::string(name.c_str()) + "|" + tag;
    if (tag == "refuse") {
        SetHTTPResponseCode_QV_GXWS_(handle, 406);
    }
    WriteOutput_C_REST_QV_GXWS_(handle, body.data(), static_cast<uint32_t>(body.size()));
}

TEST(RequestDispatcherTest, VariablesFromQueryFormAndHeadersInThatOrder) {
    RequestDispatcher dispatcher(EchoRun);
    HttpRequest request(http::verb::post, "/qv/resolve_class_and_url?X_QV_TAG=q", 11);
    request.set(http::field::content_type, "Application/X-WWW-Form-Urlencoded; charset=utf-8");
    request.set("X-QV-Tag", "header");
    request.body() = "X_QV_TAG=form";
    HttpResponse fromQuery = dispatcher.Dispatch(request);
    EXPECT_EQ(fromQuery.result_int(), 200u);
    EXPECT_EQ(fromQuery.body(), "resolve_class_and_url|q");
    EXPECT_EQ(fromQuery[http::field::content_type], "text/plain; charset=utf-8");

    request.target("/a/b/op");
    EXPECT_EQ(dispatcher.Dispatch(request).body(), "op|form");
    request.body() = "";
    EXPECT_EQ(dispatcher.Dispatch(request).body(), "op|header");
    request.set(http::field::content_type, "text/plain");
    request.body() = "X_QV_TAG=ignored";
    EXPECT_EQ(dispatcher.Dispatch(request).body(), "op|header");

    request.target("/op?X_QV_TAG=refuse");
    EXPECT_EQ(dispatcher.Dispatch(request).result_int(), 406u);
    request.target("/op?X_QV_TAG=%zz");
    EXPECT_EQ(dispatcher.Dispatch(request).result_int(), 400u);
    request.target("/op%FF");  // not UTF-8
    EXPECT_EQ(dispatcher.Dispatch(request).result_int(), 400u);
}

}  // namespace
}  // namespace devtools
}  // namespace qv
