#include "qv/zil/osdep/RealTimeKernel.h"

#include <gtest/gtest.h>

#include <pthread.h>
#include <signal.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <cstdio>
#include <cstring>
#include <future>
#include <string>
#include <thread>
#include <vector>

#include "qv/zil/osdep/MonotonicClock.h"
#include "qv/zil/osdep/testing/SchedulingProbe.h"

using qv::zil::osdep::IsRealTimeKernel;
using qv::zil::osdep::internal::ResetRealTimeKernelCheck;

namespace {

class RealTimeKernel : public ::testing::Test {
protected:
    void SetUp() override {
        std::snprintf(m_path, sizeof m_path, "/tmp/qv_realtime_XXXXXX");
        const int fd = mkstemp(m_path);
        ASSERT_GE(fd, 0);
        close(fd);
    }
    void TearDown() override {
        ResetRealTimeKernelCheck();
        unlink(m_path);
    }
    void Write(const std::string& content) {
        FILE* file = std::fopen(m_path, "w");
        ASSERT_NE(nullptr, file);
        std::fwrite(content.data(), 1, content.size(), file);
        std::fclose(file);
    }
    bool CheckFresh(const std::string& content) {
        Write(content);
        ResetRealTimeKernelCheck(m_path);
        return IsRealTimeKernel();
    }

    char m_path[32];
};

std::atomic<int> g_interruptions{0};
void CountInterruption(int) { g_interruptions += 1; }

}  // namespace

TEST_F(RealTimeKernel, FirstByteOneMarksARealTimeKernel) {
    EXPECT_TRUE(CheckFresh("1"));
    EXPECT_TRUE(CheckFresh("1\n"));
    EXPECT_TRUE(CheckFresh("10"));
    EXPECT_FALSE(CheckFresh(""));
    EXPECT_FALSE(CheckFresh("0\n"));
    EXPECT_FALSE(CheckFresh(" 1"));
    EXPECT_FALSE(CheckFresh(std::string(1, '\0') + "1"));
    ResetRealTimeKernelCheck("/nonexistent/qv/realtime");
    EXPECT_FALSE(IsRealTimeKernel());
    ResetRealTimeKernelCheck("/tmp");  // a directory: unreadable
    EXPECT_FALSE(IsRealTimeKernel());
}

TEST_F(RealTimeKernel, AnswerIsReadOncePerProcess) {
    EXPECT_TRUE(CheckFresh("1"));
    Write("0");
    EXPECT_TRUE(IsRealTimeKernel());
    unlink(m_path);
    EXPECT_TRUE(IsRealTimeKernel());
}

TEST_F(RealTimeKernel, ConcurrentFirstCallersAllGetTheAnswer) {
    for (const char* content : {"1", "0"}) {
        Write(content);
        ResetRealTimeKernelCheck(m_path);
        constexpr int kThreads = 8;
        std::atomic<int> ready{0};
        std::atomic<int> agreeing{0};
        std::vector<std::thread> threads;
        for (int t = 0; t < kThreads; ++t) {
            threads.emplace_back([&] {
                ready += 1;
                while (ready.load() < kThreads) {
                    std::this_thread::yield();
                }
                if (IsRealTimeKernel() == (content[0] == '1')) {
                    agreeing += 1;
                }
            });
        }
        for (auto& thread : threads) {
            thread.join();
        }
        EXPECT_EQ(kThreads, agreeing.load()) << content;
    }
}

TEST(RealTimeKernelSleep, SleepsItsWholeTimeThroughSignalHandlers) {
    const qv::zil::osdep::MonotonicClock clock;
    uint64_t start = clock.Now(1000000u);
    qv::zil::osdep::internal::SleepMilliseconds(0);
    qv::zil::osdep::internal::SleepMilliseconds(30);
    EXPECT_GE(clock.Now(1000000u) - start, 30u);

    struct sigaction action {};
    struct sigaction previous {};
    action.sa_handler = &CountInterruption;
    sigemptyset(&action.sa_mask);
    action.sa_flags = 0;  // no SA_RESTART: the sleep sees EINTR
    ASSERT_EQ(0, sigaction(SIGUSR1, &action, &previous));
    g_interruptions = 0;

    std::promise<pid_t> sleeping;
    std::atomic<uint64_t> slept{0};
    std::thread sleeper([&] {
        sleeping.set_value(qv::testing::CurrentTid());
        const uint64_t begin = clock.Now(1000000u);
        qv::zil::osdep::internal::SleepMilliseconds(300);
        slept = clock.Now(1000000u) - begin;
    });
    const pid_t tid = sleeping.get_future().get();
    for (int i = 0; i < 3 && slept.load() == 0; ++i) {
        if (qv::testing::WaitUntilSleeping(tid, std::chrono::milliseconds(1000)) &&
            slept.load() == 0) {
            pthread_kill(sleeper.native_handle(), SIGUSR1);
        }
    }
    sleeper.join();
    sigaction(SIGUSR1, &previous, nullptr);
    EXPECT_GE(slept.load(), 300u);
    EXPECT_LT(slept.load(), 3000u);
    EXPECT_GE(g_interruptions.load(), 1);
}
