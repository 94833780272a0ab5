// The shipped plug-in loaded with dlopen by a separate executable that plays the host: its
// entry points, the request flow through libws_runtime.so.13, and an UnableToConvert
// thrown by this executable's context and caught inside the plug-in.
#include <dlfcn.h>

#include <string>

#include <gtest/gtest.h>

#include "platform/ws_runtime/RequestTable.h"
#include "plugin/EntryPoints.h"
#include "qv/zil/Exceptions.h"

namespace {

using qv::wsruntime::RequestTable;
using qv::wsruntime::RequestVariables;

class HostContext : public qv::wsruntime::IRequestContext {
public:
    explicit HostContext(const char* operation) : m_operation(qv::zil::ByteString(operation)) {}
    int32_t GetInt64Value(const qv::zil::WideString&, int64_t& value) override {
        if (!hasSession) {
            throw qv::zil::exception::UnableToConvert();
        }
        value = -5;
        return 0;
    }
    int32_t ReservedSlot1() override { return 0; }
    int32_t ReservedSlot2() override { return 0; }
    const qv::zil::WideString* GetOperationName() override { return &m_operation; }

    bool hasSession = false;

private:
    qv::zil::WideString m_operation;
};

class LoadedPlugin : public ::testing::Test {
protected:
    void SetUp() override {
        m_library = dlopen(QV_PLUGIN_PATH, RTLD_NOW | RTLD_LOCAL);
        ASSERT_NE(m_library, nullptr) << dlerror();
        init = Entry<QvPluginVoidEntry>("qv_variable_iotolvaneInit");
        run = Entry<QvPluginRunEntry>("qv_variable_iotolvaneRun");
        pause = Entry<QvPluginVoidEntry>("qv_variable_iotolvanePause");
        resume = Entry<QvPluginVoidEntry>("qv_variable_iotolvaneResume");
        finalize = Entry<QvPluginVoidEntry>("qv_variable_iotolvaneFinalize");
    }
    // The library stays loaded, as in a host: its static state lives until the process ends.

    template <typename T>
    T Entry(const char* name) {
        void* symbol = dlsym(m_library, name);
        EXPECT_NE(symbol, nullptr) << name;
        return reinterpret_cast<T>(symbol);
    }

    RequestTable::Response Request(HostContext& context, const RequestVariables& variables) {
        const uint32_t handle = RequestTable::Open(variables);
        run(&context, handle);
        return RequestTable::Close(handle);
    }

    QvPluginVoidEntry init = nullptr;
    QvPluginRunEntry run = nullptr;
    QvPluginVoidEntry pause = nullptr;
    QvPluginVoidEntry resume = nullptr;
    QvPluginVoidEntry finalize = nullptr;

private:
    void* m_library = nullptr;
};

TEST_F(LoadedPlugin, EntryPointsAndRequestsAcrossTheLibraryBoundary) {
    RequestVariables none;
    HostContext unknown("no_such_operation");
    RequestTable::Response early = Request(unknown, none);
    EXPECT_EQ(early.status, 500);
    EXPECT_EQ(early.body, "-314899\t");

    pause();
    init();
    resume();
    RequestTable::Response notFound = Request(unknown, none);
    EXPECT_EQ(notFound.status, 501);
    EXPECT_EQ(notFound.body, "-2147467263\t");

    // The host's exception type is caught by its exact type inside the plug-in.
    HostContext close("CLOSE_SESSION");
    RequestTable::Response noSession = Request(close, none);
    EXPECT_EQ(noSession.status, 500);
    EXPECT_EQ(noSession.body, "-356020\t");

    close.hasSession = true;
    RequestTable::Response missing = Request(close, none);
    EXPECT_EQ(missing.status, 400);
    EXPECT_EQ(missing.body, "-356006\t");

    RequestVariables html;
    html.AddHeader("X-Qv-Accept", "Text/HTML");
    RequestTable::Response refused = Request(close, html);
    EXPECT_EQ(refused.status, 406);
    EXPECT_EQ(refused.body, "-356007\t");

    pause();
    finalize();
    RequestTable::Response late = Request(unknown, none);
    EXPECT_EQ(late.status, 500);
    EXPECT_EQ(late.body, "-314899\t");

    init();
    EXPECT_EQ(Request(unknown, none).status, 501);
    finalize();
    EXPECT_EQ(RequestTable::OpenCount(), 0u);
}

}  // namespace
