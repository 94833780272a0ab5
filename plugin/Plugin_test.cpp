// The request flow of Run, its HTTP mapping and exception answers, and the lifecycle.
#include "plugin/Plugin.h"

#include <atomic>
#include <map>
#include <memory>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "plugin/StatusCodes.h"
#include "plugin/testing/FakeContext.h"
#include "plugin/testing/FakeRuntime.h"

namespace qv {
namespace variable {
namespace remoteconfig {
namespace {

using ::testing::ElementsAre;
using testing::FakeContext;
using testing::FakeRequest;
using testing::FakeRuntime;
using Vars = std::map<std::string, std::string>;

// What the fake registry does with each Send.
struct SenderScript {
    enum class Mode { kEcho, kCode, kBadAlloc, kOther };
    Mode mode = Mode::kEcho;
    int32_t code = 0;
    std::atomic<int> sends{0};     // Sends with a non-negative code (registry contacted)
    std::atomic<int> inFlight{0};  // more than 1 would mean the sender lock failed
    std::atomic<int> overlapped{0};
    std::atomic<int> alive{0};  // senders made and not yet destroyed
    std::atomic<int> made{0};
};

class FakeSender : public IDataSender {
public:
    explicit FakeSender(SenderScript& script) : m_script(script) {
        ++m_script.alive;
        ++m_script.made;
    }
    ~FakeSender() override { --m_script.alive; }

    void Send(const ArgumentList& arguments, const zil::ByteString& operation,
              zil::ByteString& output, StatusRecord& status) override {
        if (status.IsError()) {
            return;
        }
        if (++m_script.inFlight > 1) {
            ++m_script.overlapped;
        }
        ++m_script.sends;
        struct Leave {
            std::atomic<int>& n;
            ~Leave() { --n; }
        } leave{m_script.inFlight};
        switch (m_script.mode) {
            case SenderScript::Mode::kBadAlloc:
                throw std::bad_alloc();
            case SenderScript::Mode::kOther:
                throw std::runtime_error("registry");
            case SenderScript::Mode::kCode:
                status.SetCode(m_script.code);
                output = "text";
                return;
            case SenderScript::Mode::kEcho:
                output = operation;
                for (const zil::ByteString& argument : arguments) {
                    output.append(zil::ByteString("\n"));
                    output.append(argument);
                }
                return;
        }
    }

private:
    SenderScript& m_script;
};

struct Fixture {
    SenderScript script;
    int starts = 0;
    int stops = 0;
    bool failMake = false;
    bool failStart = false;
    std::unique_ptr<Plugin> plugin;

    Fixture() {
        PluginServices services;
        services.makeSender = [this]() -> std::unique_ptr<IDataSender> {
            if (failMake) {
                throw std::bad_alloc();
            }
            return std::make_unique<FakeSender>(script);
        };
        services.startAdvertisement = [this]() {
            ++starts;
            if (failStart) {
                throw std::runtime_error("advertise");
            }
        };
        services.stopAdvertisement = [this]() { ++stops; };
        plugin = std::make_unique<Plugin>(services);
    }
};

struct Answer {
    std::vector<int32_t> statusCalls;
    std::vector<std::string> writes;
    std::vector<std::string> asked;
    std::string Body() const { return writes.size() == 1 ? writes[0] : "<not one write>"; }
};

Answer RunRequest(Plugin& plugin, FakeContext& context, Vars vars) {
    static std::atomic<uint32_t> nextHandle{5000};
    const uint32_t handle = ++nextHandle;
    FakeRequest& request = FakeRuntime::Open(handle, std::move(vars));
    plugin.Run(&context, handle);
    return Answer{request.statusCalls, request.writes, request.NamesAsked()};
}

Answer RunRequest(Plugin& plugin, const std::string& operation, Vars vars = {}) {
    FakeContext context(operation, 77);
    return RunRequest(plugin, context, std::move(vars));
}

const Vars kVersions = {{"X_QV_CLIENT_SIDE_VERSION", "1"}, {"X_QV_OLDEST_COMPATIBLE_VERSION", "2"}};

TEST(PluginRunTest, EveryHttpMappingRow) {
    Fixture f;
    f.plugin->Init();

    Answer ok = RunRequest(*f.plugin, "check_version_compatibility", kVersions);
    EXPECT_TRUE(ok.statusCalls.empty());
    EXPECT_EQ(ok.Body(), "0\tcheck_version_compatibility\n1\n2");

    Answer missing =
        RunRequest(*f.plugin, "check_version_compatibility", {{"X_QV_CLIENT_SIDE_VERSION", "1"}});
    EXPECT_THAT(missing.statusCalls, ElementsAre(400));
    EXPECT_EQ(missing.Body(), "-356006\t");
    EXPECT_EQ(f.script.sends, 1);  // the registry was not contacted

    Answer unknown = RunRequest(*f.plugin, "no_such_operation", kVersions);
    EXPECT_THAT(unknown.statusCalls, ElementsAre(501));
    EXPECT_EQ(unknown.Body(), "-2147467263\t");
    EXPECT_THAT(unknown.asked, ElementsAre("X_QV_ACCEPT"));

    FakeContext noSession("close_session");
    noSession.toThrow = FakeContext::Throw::kUnableToConvert;
    Answer session = RunRequest(*f.plugin, noSession, {});
    EXPECT_THAT(session.statusCalls, ElementsAre(500));
    EXPECT_EQ(session.Body(), "-356020\t");

    f.script.mode = SenderScript::Mode::kCode;
    for (int32_t code : {5, -314730, -356060, -1}) {
        f.script.code = code;
        Answer coded = RunRequest(*f.plugin, "resolve_class_and_url",
                                  {{"X_QV_TAG", "t"}, {"X_QV_CONFIGURED_CLASS", "c"}});
        EXPECT_THAT(coded.statusCalls, ElementsAre(500)) << code;
        EXPECT_EQ(coded.Body(), std::to_string(code) + "\ttext");
    }
    f.script.code = 0;
    Answer empty = RunRequest(*f.plugin, "check_version_compatibility", kVersions);
    EXPECT_TRUE(empty.statusCalls.empty());
    EXPECT_EQ(empty.Body(), "0\ttext");
    EXPECT_EQ(HttpStatusForCode(kAcceptsOnlyHtml), 406);
    EXPECT_EQ(HttpStatusForCode(kNotInitialised), 500);
    EXPECT_EQ(f.script.overlapped, 0);
}

TEST(PluginRunTest, AcceptHeaderAndOperationNames) {
    Fixture f;
    f.plugin->Init();
    for (const char* html : {"text/html", "TEXT/HTML", "Text/Html"}) {
        FakeContext context("close_session", 1);
        Vars vars = kVersions;
        vars["X_QV_ACCEPT"] = html;
        Answer refused = RunRequest(*f.plugin, context, vars);
        EXPECT_THAT(refused.statusCalls, ElementsAre(406));
        EXPECT_EQ(refused.Body(), "-356007\t");
        EXPECT_THAT(refused.asked, ElementsAre("X_QV_ACCEPT"));  // no handler ran
        EXPECT_EQ(context.sessionCalls, 0);
    }
    for (const char* other :
         {"text/html; charset=utf-8", "text/plain", "", "text/html,text/plain"}) {
        Vars vars = kVersions;
        vars["X_QV_ACCEPT"] = other;
        Answer served = RunRequest(*f.plugin, "check_version_compatibility", vars);
        EXPECT_TRUE(served.statusCalls.empty()) << other;
        EXPECT_EQ(served.Body(), "0\tcheck_version_compatibility\n1\n2") << other;
    }
    Vars close = {{"X_QV_LIBRARY_PATH_NAME", "l"},
                  {"X_QV_FUNC_NAME", "f"},
                  {"X_QV_CLASS_NAME", "c"},
                  {"X_QV_CALLING_CONVENTION", "cc"}};
    // The table finds any spelling; the registry gets the name as the request wrote it.
    Answer mixed = RunRequest(*f.plugin, "Close_Session", close);
    EXPECT_EQ(mixed.Body(), "0\tClose_Session\n77\nl\nf\nc\ncc");
    Answer upper = RunRequest(*f.plugin, "ACCESS_PROPERTY",
                              {{"ignoreErrors", "1"}, {"argc", "0"}, {"numberOfBatches", "0"}});
    EXPECT_EQ(upper.Body(), "0\tACCESS_PROPERTY\n77\n1\n0\n0");
    Answer prefix = RunRequest(*f.plugin, "close_sessio", close);
    EXPECT_THAT(prefix.statusCalls, ElementsAre(501));
    EXPECT_EQ(f.plugin->Table().size(), 7u);
}

TEST(PluginRunTest, ExceptionsAnswerFixedBodiesAndReleaseTheSenderLock) {
    Fixture f;
    f.plugin->Init();
    f.script.mode = SenderScript::Mode::kBadAlloc;
    Answer oom = RunRequest(*f.plugin, "check_version_compatibility", kVersions);
    EXPECT_THAT(oom.statusCalls, ElementsAre(500));
    EXPECT_THAT(oom.writes, ElementsAre("2"));

    f.script.mode = SenderScript::Mode::kOther;
    Answer other = RunRequest(*f.plugin, "check_version_compatibility", kVersions);
    EXPECT_THAT(other.statusCalls, ElementsAre(500));
    EXPECT_THAT(other.writes, ElementsAre("42"));

    // Exceptions from the host's own context: out of memory, and not even a std::exception.
    for (auto kind : {FakeContext::Throw::kBadAlloc, FakeContext::Throw::kOther}) {
        FakeContext context("invoke_method", 1);
        context.toThrow = kind;
        Answer thrown = RunRequest(*f.plugin, context, {});
        EXPECT_THAT(thrown.statusCalls, ElementsAre(500));
        EXPECT_THAT(thrown.writes, ElementsAre(kind == FakeContext::Throw::kBadAlloc ? "2" : "42"));
    }

    // Another thread gets the sender lock and is served normally.
    f.script.mode = SenderScript::Mode::kEcho;
    Answer next;
    std::thread([&] {
        next = RunRequest(*f.plugin, "check_version_compatibility", kVersions);
    }).join();
    EXPECT_TRUE(next.statusCalls.empty());
    EXPECT_EQ(next.Body(), "0\tcheck_version_compatibility\n1\n2");
}

TEST(PluginLifecycleTest, InitFinalizeInitAndRunWithoutSender) {
    Fixture f;
    Answer early = RunRequest(*f.plugin, "check_version_compatibility", kVersions);
    EXPECT_THAT(early.statusCalls, ElementsAre(500));
    EXPECT_EQ(early.Body(), "-314899\t");

    f.plugin->Init();
    f.plugin->Init();
    EXPECT_EQ(f.script.made, 1);
    EXPECT_EQ(f.starts, 1);
    EXPECT_EQ(RunRequest(*f.plugin, "check_version_compatibility", kVersions).Body(),
              "0\tcheck_version_compatibility\n1\n2");

    f.plugin->Finalize();
    EXPECT_EQ(f.script.alive, 0);
    EXPECT_EQ(f.stops, 1);
    EXPECT_EQ(f.plugin->Table().size(), 7u);
    Answer late = RunRequest(*f.plugin, "check_version_compatibility", kVersions);
    EXPECT_THAT(late.statusCalls, ElementsAre(500));
    EXPECT_EQ(late.Body(), "-314899\t");

    f.plugin->Init();
    EXPECT_EQ(f.script.made, 2);
    EXPECT_EQ(f.script.alive, 1);
    EXPECT_EQ(f.starts, 2);
    EXPECT_EQ(RunRequest(*f.plugin, "check_version_compatibility", kVersions).Body(),
              "0\tcheck_version_compatibility\n1\n2");
    EXPECT_EQ(f.plugin->Table().size(), 7u);
}

TEST(PluginLifecycleTest, FailedInitLeavesThePluginUninitialisedAndRetries) {
    Fixture f;
    f.failMake = true;
    f.plugin->Init();
    EXPECT_FALSE(f.plugin->IsInitialised());
    EXPECT_EQ(f.starts, 0);

    f.failMake = false;
    f.failStart = true;
    f.plugin->Init();
    EXPECT_FALSE(f.plugin->IsInitialised());
    EXPECT_EQ(f.stops, 1);  // the part-way start was undone
    EXPECT_EQ(f.script.alive, 0);
    EXPECT_EQ(RunRequest(*f.plugin, "check_version_compatibility", kVersions).Body(), "-314899\t");

    f.failStart = false;
    f.plugin->Init();
    EXPECT_TRUE(f.plugin->IsInitialised());
    EXPECT_EQ(f.script.alive, 1);
    EXPECT_EQ(RunRequest(*f.plugin, "check_version_compatibility", kVersions).Body(),
              "0\tcheck_version_compatibility\n1\n2");
}

TEST(PluginRunTest, ConcurrentRequestsGetTheirOwnAnswers) {
    Fixture f;
    f.plugin->Init();
    constexpr int kThreads = 8;
    constexpr int kRequests = 40;
    std::atomic<int> wrong{0};
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t) {
        threads.emplace_back([&, t] {
            for (int r = 0; r < kRequests; ++r) {
                const std::string a = std::to_string(t) + "-" + std::to_string(r);
                Answer answer = RunRequest(*f.plugin, "resolve_class_and_url",
                                           {{"X_QV_TAG", a}, {"X_QV_CONFIGURED_CLASS", "c" + a}});
                if (answer.Body() != "0\tresolve_class_and_url\n" + a + "\nc" + a ||
                    !answer.statusCalls.empty()) {
                    ++wrong;
                }
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(wrong, 0);
    EXPECT_EQ(f.script.sends, kThreads * kRequests);
    EXPECT_EQ(f.script.overlapped, 0);
}

}  // namespace
}  // namespace remoteconfig
}  // namespace variable
}  // namespace qv
