// A scripted stand-in for libqvAvahiClient.so.14, libqvtargetcfg.so.1 and the entry-group
// calls of libavahi-client, linked into the publisher's unit tests in their place. It logs
// every call in order, checks that entry-group calls off the poll thread are made under the
// poll lock, and can run a poll thread of its own that the stop must join.
// Safe from the test thread and the fake poll thread.
#pragma once

#include <avahi-client/client.h>
#include <avahi-client/publish.h>

#include <atomic>
#include <cstdint>
#include <deque>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

namespace qv::variable::remoteconfig::testing {

struct FakeAvahi {
    // Script: results handed out in order; when a queue is empty the default applies.
    int clientNewResult = 0;
    std::deque<int> groupNewResults;
    std::deque<int> isEmptyResults;  // default 1 (empty)
    int isEmptyDefault = 1;
    std::deque<int> addResults;  // default 0
    int commitResult = 0;
    int pollStartResult = 0;
    bool alternativeFails = false;
    int macResult = 0;
    std::uint8_t mac[6] = {0x02, 0x1A, 0x2B, 0x3C, 0x4D, 0x5E};
    bool pollThreadFiresRunning = false;  // the poll thread reports S_RUNNING over and over

    // Observations.
    std::vector<std::string> calls;  // "ClientNew", "GroupNew(0)", "Lock(0)", "add", ...
    std::vector<std::string> addedNames;
    std::vector<std::string> lastTxt;  // the TXT strings of the last add, list order
    std::string lastType, lastDomain;
    std::uint16_t lastPort = 0;
    bool lastAddArgumentsAsExpected = false;  // any interface/protocol, flags 0, no host
    int unlockedGroupCalls = 0;  // entry-group calls off the poll thread without the lock
    bool groupClearedBeforeFree = false;
    int clientErrnoReads = 0;

    // The callbacks the publisher registered, to be fired by the tests.
    AvahiClientCallback clientCallback = nullptr;
    void* clientUserdata = nullptr;
    AvahiEntryGroupCallback groupCallback = nullptr;
    void* groupUserdata = nullptr;

    // Fires a callback as the poll thread would: with the poll lock held.
    void FireClient(AvahiClientState state);
    void FireGroup(AvahiEntryGroupState state);

    // Calls since the mark, for checking one step at a time.
    std::vector<std::string> CallsSince(std::size_t mark);
    std::size_t Mark();

    // Internals shared with the fake functions.
    void Log(const std::string& call);
    std::recursive_mutex stateMutex;
    std::mutex pollMutex;  // the fake poll lock
    std::thread pollThread;
    std::atomic<bool> pollQuit{false};
    std::atomic<int> callbackDepth{0};  // > 0 while a fake callback runs
    int lockDepth = 0;
    bool clientAlive = false;
    bool groupAlive = false;
};

// The one fake of the process, reset to its defaults by Reset().
FakeAvahi& Fake();
void Reset();

// The handles the fake hands out.
AvahiClient* FakeClient();
AvahiEntryGroup* FakeGroup();

}  // namespace qv::variable::remoteconfig::testing
