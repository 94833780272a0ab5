#include "qv/zil/osdep/Thread.h"

#include <gtest/gtest.h>

#include <pthread.h>
#include <sched.h>
#include <signal.h>
#include <sys/prctl.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <chrono>
#include <cstdio>
#include <cstring>
#include <functional>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "qv/zil/Exceptions.h"
#include "qv/zil/osdep/Event.h"
#include "qv/zil/osdep/PosixError.h"
#include "qv/zil/osdep/RealTimeKernel.h"
#include "qv/zil/osdep/testing/SchedulingProbe.h"

using qv::zil::osdep::Event;
using qv::zil::osdep::PosixError;
using qv::zil::osdep::Thread;

namespace {

// Runs a given body; joins before the base part goes, as derived classes must.
class BodyThread : public Thread {
public:
    explicit BodyThread(std::function<void()> body) : m_body(std::move(body)) {}
    ~BodyThread() override { Join(); }

private:
    void* Run() override {
        m_body();
        return nullptr;
    }
    std::function<void()> m_body;
};

std::string NameOfThreadStartedAs(const char* requested) {
    char name[17] = {};
    BodyThread thread([&] { prctl(PR_GET_NAME, name, 0, 0, 0); });
    thread.Start(requested);
    thread.Join();
    return name;
}

size_t StackSizeOfCurrentThread() {
    pthread_attr_t attributes;
    size_t size = 0;
    if (pthread_getattr_np(pthread_self(), &attributes) == 0) {
        pthread_attr_getstacksize(&attributes, &size);
        pthread_attr_destroy(&attributes);
    }
    return size;
}

// The stack a plain pthread gets with `stackSize` requested (0: the default), so that
// sanitizers' own adjustments cancel out.
size_t ReferenceStackSize(size_t stackSize) {
    pthread_attr_t attributes;
    pthread_attr_init(&attributes);
    if (stackSize != 0) {
        pthread_attr_setstacksize(&attributes, stackSize);
    }
    size_t reported = 0;
    pthread_t handle;
    pthread_create(
        &handle, &attributes,
        [](void* out) -> void* {
            *static_cast<size_t*>(out) = StackSizeOfCurrentThread();
            return nullptr;
        },
        &reported);
    pthread_join(handle, nullptr);
    pthread_attr_destroy(&attributes);
    return reported;
}

size_t StackSizeOfThreadStartedWith(uint32_t stackSize) {
    size_t size = 0;
    BodyThread thread([&] { size = StackSizeOfCurrentThread(); });
    thread.Start(stackSize);
    thread.Join();
    return size;
}

// Points the real-time check at a file holding `content` for a scope.
class FakeRealtimeFile {
public:
    explicit FakeRealtimeFile(const char* content) {
        std::snprintf(m_path, sizeof m_path, "/tmp/qv_realtime_XXXXXX");
        const int fd = mkstemp(m_path);
        EXPECT_GE(fd, 0);
        EXPECT_EQ(static_cast<ssize_t>(std::strlen(content)),
                  write(fd, content, std::strlen(content)));
        close(fd);
        qv::zil::osdep::internal::ResetRealTimeKernelCheck(m_path);
    }
    ~FakeRealtimeFile() {
        qv::zil::osdep::internal::ResetRealTimeKernelCheck();
        unlink(m_path);
    }

private:
    char m_path[32];
};

}  // namespace

TEST(Thread, NamesAreShortenedAndBlanksReplaced) {
    EXPECT_EQ("abcdef...klmnop", NameOfThreadStartedAs("abcdefghijklmnop"));
    EXPECT_EQ("abcdefghijklmno", NameOfThreadStartedAs("abcdefghijklmno"));
    EXPECT_EQ("timer_thread", NameOfThreadStartedAs("timer thread"));
    EXPECT_EQ("my_wor...er_one", NameOfThreadStartedAs("my worker thread number one"));
    EXPECT_EQ("_", NameOfThreadStartedAs(" "));
}

TEST(Thread, RunsWithEverySignalBlockedAndKnowsItself) {
    sigset_t mask;
    sigemptyset(&mask);
    bool isCurrent = false;
    BodyThread thread([&] {
        pthread_sigmask(SIG_BLOCK, nullptr, &mask);
        isCurrent = thread.IsCurrentThread();
    });
    EXPECT_FALSE(thread.IsCurrentThread());
    thread.Start();
    EXPECT_FALSE(thread.IsCurrentThread());
    thread.Join();
    EXPECT_TRUE(isCurrent);
    for (int signal = 1; signal < 32; ++signal) {
        if (signal != SIGKILL && signal != SIGSTOP) {
            EXPECT_EQ(1, sigismember(&mask, signal)) << "signal " << signal;
        }
    }
}

TEST(Thread, StackSizeFollowsTheRealTimeKernelAndTheRequest) {
    const size_t defaultStack = ReferenceStackSize(0);
    const size_t realTimeStack = ReferenceStackSize(Thread::kRealTimeStackSize);
    ASSERT_NE(defaultStack, realTimeStack);
    {
        FakeRealtimeFile realtime("1\n");
        EXPECT_EQ(realTimeStack, StackSizeOfThreadStartedWith(0));
    }
    for (const char* content : {"", "0", "2", " 1"}) {
        FakeRealtimeFile other(content);
        EXPECT_EQ(defaultStack, StackSizeOfThreadStartedWith(0)) << '"' << content << '"';
    }
    qv::zil::osdep::internal::ResetRealTimeKernelCheck("/nonexistent/realtime");
    EXPECT_EQ(defaultStack, StackSizeOfThreadStartedWith(0));
    qv::zil::osdep::internal::ResetRealTimeKernelCheck();

    EXPECT_GE(StackSizeOfThreadStartedWith(1 << 20), static_cast<size_t>(1 << 20));
}

TEST(Thread, RefusedStackSizeThrowsAndLeavesTheObjectUsable) {
    std::atomic<int> runs{0};
    BodyThread thread([&] { runs += 1; });
    try {
        thread.Start("tiny", 1);
        FAIL() << "a 1-byte stack was accepted";
    } catch (const PosixError& error) {
        EXPECT_EQ(EINVAL, error.GetNativeError());
        EXPECT_STREQ(std::strerror(EINVAL), error.what());
        ASSERT_NE(nullptr, error.file);
        EXPECT_NE(nullptr, std::strstr(error.file, "qv/zil/osdep/Thread"));
        EXPECT_GT(error.line, 0);
    }
    EXPECT_EQ(0, runs.load());
    thread.Start();  // the run lock was released
    thread.Join();
    EXPECT_EQ(1, runs.load());
}

TEST(Thread, EscapingExceptionEndsOnlyThatThread) {
    int runs = 0;
    BodyThread thrower([&] {
        ++runs;
        if (runs == 1) {
            throw std::runtime_error("run failed");
        }
        throw 42;
    });
    thrower.Start("thrower");
    thrower.Join();
    thrower.Start();
    thrower.Join();
    EXPECT_EQ(2, runs);
}

TEST(Thread, JoinOnceNeverFromItselfAndRestartAfterJoin) {
    std::atomic<int> runs{0};
    const pid_t joinerTid = qv::testing::CurrentTid();
    BodyThread thread([&] {
        // From the thread itself, while the test thread waits in Join: returns at once.
        qv::testing::WaitUntilSleeping(joinerTid, std::chrono::milliseconds(2000));
        thread.Join();
        runs += 1;
    });
    thread.Join();  // never started: nothing to wait for
    thread.Start();
    thread.Join();
    thread.Join();
    EXPECT_EQ(1, runs.load());

    thread.Start();
    std::thread first([&] { thread.Join(); });
    std::thread second([&] { thread.Join(); });
    first.join();
    second.join();
    EXPECT_EQ(2, runs.load());
}

TEST(Thread, ManyThreadsStartAndJoinConcurrently) {
    constexpr int kStarters = 6;
    constexpr int kRounds = 40;
    std::atomic<int> runs{0};
    std::vector<std::thread> starters;
    for (int s = 0; s < kStarters; ++s) {
        starters.emplace_back([&] {
            BodyThread worker([&] { runs += 1; });
            for (int round = 0; round < kRounds; ++round) {
                worker.Start("worker");
                worker.Join();
            }
        });
    }
    for (auto& starter : starters) {
        starter.join();
    }
    EXPECT_EQ(kStarters * kRounds, runs.load());
}

TEST(Thread, PriorityOfAnOrdinaryThreadAndInvalidLevels) {
    Event stop(true);
    BodyThread thread([&] { stop.Wait(); });
    EXPECT_THROW(thread.GetPriority(), PosixError);  // not started
    thread.Start();
    EXPECT_EQ(4u, thread.GetPriority());
    EXPECT_THROW(thread.SetPriority(9u), qv::zil::exception::InvalidArgument);
    EXPECT_THROW(thread.SetPriority(0xFFFFFFFFu), qv::zil::exception::InvalidArgument);
    thread.SetPriority(2u);  // levels 0 to 4 are SCHED_OTHER 0
    EXPECT_EQ(4u, thread.GetPriority());
    stop.Set();
    thread.Join();
    EXPECT_THROW(thread.GetPriority(), PosixError);
}

TEST(Thread, RealTimeLevelsMapToPoliciesAndBack) {
    Event started(true);
    Event stop(true);
    std::atomic<pid_t> tid{0};
    BodyThread thread([&] {
        tid = qv::testing::CurrentTid();
        started.Set();
        stop.Wait();
    });
    thread.Start("rt levels");
    started.Wait();
    try {
        thread.SetPriority(8u);
    } catch (const PosixError& error) {
        stop.Set();
        thread.Join();
        if (error.GetNativeError() == EPERM) {
            GTEST_SKIP() << "SCHED_FIFO is not permitted here";
        }
        FAIL() << error.what();
    }
    int policy = -1;
    sched_param parameters{};
    ASSERT_EQ(0, pthread_getschedparam(pthread_self(), &policy, &parameters));
    EXPECT_EQ(SCHED_OTHER, policy);  // the caller is untouched

    struct {
        uint32_t level;
        int policy;
        int priority;
    } const levels[] = {{8, SCHED_FIFO, 99}, {7, SCHED_FIFO, 95}, {6, SCHED_RR, 20},
                        {5, SCHED_RR, 10},   {4, SCHED_OTHER, 0}, {0, SCHED_OTHER, 0}};
    for (const auto& level : levels) {
        thread.SetPriority(level.level);
        EXPECT_EQ(level.policy, sched_getscheduler(tid)) << "level " << level.level;
        ASSERT_EQ(0, sched_getparam(tid, &parameters));
        EXPECT_EQ(level.priority, parameters.sched_priority) << "level " << level.level;
        EXPECT_EQ(level.level == 0 ? 4u : level.level, thread.GetPriority());
    }

    thread.SetPriority(Thread::Scheduling{(SCHED_RR << 16) | 15});
    EXPECT_EQ(6u, thread.GetPriority());
    thread.SetPriority(Thread::Scheduling{(SCHED_FIFO << 16) | 1});
    EXPECT_EQ(5u, thread.GetPriority());
    for (int priority = 1; priority <= 99; ++priority) {
        thread.SetPriority(Thread::Scheduling{(SCHED_RR << 16) | static_cast<uint32_t>(priority)});
        const uint32_t expected = priority <= 10 ? 5 : priority <= 20 ? 6 : priority <= 95 ? 7 : 8;
        EXPECT_EQ(expected, thread.GetPriority()) << "SCHED_RR " << priority;
    }
    EXPECT_THROW(thread.SetPriority(Thread::Scheduling{(SCHED_FIFO << 16) | 100}), PosixError);
    thread.SetPriority(4u);
    EXPECT_EQ(4u, thread.GetPriority());
    stop.Set();
    thread.Join();
}
