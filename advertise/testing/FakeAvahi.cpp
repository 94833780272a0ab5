#include "advertise/testing/FakeAvahi.h"

#include "advertise/MdnsService.h"

#include "platform/avahi_client/qvAvahiClient.h"
#include "platform/targetcfg/targetcfg.h"

#include <avahi-common/alternative.h>
#include <avahi-common/error.h>
#include <avahi-common/malloc.h>

#include <cstdlib>
#include <cstring>
#include <memory>

namespace qv::variable::remoteconfig::testing {

namespace {

char g_clientHandle;
char g_groupHandle;
std::unique_ptr<FakeAvahi> g_fake = std::make_unique<FakeAvahi>();

int Next(std::deque<int>& queue, int fallback) {
    if (queue.empty()) {
        return fallback;
    }
    int value = queue.front();
    queue.pop_front();
    return value;
}

// An entry-group call: logged, and counted as a fault when made off the poll thread
// without the poll lock.
void GroupCall(const std::string& name) {
    FakeAvahi& f = Fake();
    std::lock_guard<std::recursive_mutex> lock(f.stateMutex);
    f.Log(name);
    if (f.callbackDepth.load() == 0 && f.lockDepth == 0) {
        ++f.unlockedGroupCalls;
    }
}

}  // namespace

FakeAvahi& Fake() { return *g_fake; }

void Reset() {
    if (g_fake->pollThread.joinable()) {
        g_fake->pollQuit = true;
        g_fake->pollThread.join();
    }
    g_fake = std::make_unique<FakeAvahi>();
}

AvahiClient* FakeClient() { return reinterpret_cast<AvahiClient*>(&g_clientHandle); }
AvahiEntryGroup* FakeGroup() { return reinterpret_cast<AvahiEntryGroup*>(&g_groupHandle); }

void FakeAvahi::Log(const std::string& call) {
    std::lock_guard<std::recursive_mutex> lock(stateMutex);
    calls.push_back(call);
}

std::size_t FakeAvahi::Mark() {
    std::lock_guard<std::recursive_mutex> lock(stateMutex);
    return calls.size();
}

std::vector<std::string> FakeAvahi::CallsSince(std::size_t mark) {
    std::lock_guard<std::recursive_mutex> lock(stateMutex);
    return std::vector<std::string>(calls.begin() + static_cast<std::ptrdiff_t>(mark), calls.end());
}

void FakeAvahi::FireClient(AvahiClientState state) {
    std::lock_guard<std::mutex> poll(pollMutex);
    ++callbackDepth;
    clientCallback(FakeClient(), state, clientUserdata);
    --callbackDepth;
}

void FakeAvahi::FireGroup(AvahiEntryGroupState state) {
    std::lock_guard<std::mutex> poll(pollMutex);
    ++callbackDepth;
    groupCallback(FakeGroup(), state, groupUserdata);
    --callbackDepth;
}

}  // namespace qv::variable::remoteconfig::testing

using qv::variable::remoteconfig::MdnsService;
using qv::variable::remoteconfig::testing::Fake;
using qv::variable::remoteconfig::testing::FakeAvahi;
using qv::variable::remoteconfig::testing::FakeClient;
using qv::variable::remoteconfig::testing::FakeGroup;
using qv::variable::remoteconfig::testing::GroupCall;
using qv::variable::remoteconfig::testing::Next;

// ---- libqvAvahiClient.so.14

extern "C" int AvahiClientNew(AvahiClientCallback callback, void* userdata, AvahiClient** client) {
    FakeAvahi& f = Fake();
    f.Log("ClientNew");
    if (f.clientNewResult != 0) {
        return f.clientNewResult;
    }
    f.clientCallback = callback;
    f.clientUserdata = userdata;
    f.clientAlive = true;
    *client = FakeClient();
    // Like Avahi, report the first state before returning.
    ++f.callbackDepth;
    callback(FakeClient(), AVAHI_CLIENT_S_RUNNING, userdata);
    --f.callbackDepth;
    return 0;
}

extern "C" int AvahiClientFree(void) {
    FakeAvahi& f = Fake();
    f.Log("ClientFree");
    f.clientAlive = false;
    return 0;
}

extern "C" int AvahiEntryGroupNew(AvahiClient* client, AvahiEntryGroupCallback callback,
                                  void* userdata, int inPollThread, AvahiEntryGroup** group) {
    FakeAvahi& f = Fake();
    std::lock_guard<std::recursive_mutex> lock(f.stateMutex);
    f.Log("GroupNew(" + std::to_string(inPollThread) + ")");
    int result = Next(f.groupNewResults, 0);
    if (result != 0 || client != FakeClient()) {
        return result != 0 ? result : AVAHI_ERR_INVALID_OBJECT;
    }
    f.groupCallback = callback;
    f.groupUserdata = userdata;
    f.groupAlive = true;
    *group = FakeGroup();
    return 0;
}

extern "C" int AvahiEntryGroupFree(AvahiEntryGroup* group, int inPollThread) {
    FakeAvahi& f = Fake();
    {
        std::lock_guard<std::recursive_mutex> lock(f.stateMutex);
        f.Log("GroupFree(" + std::to_string(inPollThread) + ")");
        // The record (the group's user data) must no longer point at the group.
        auto* record = static_cast<const MdnsService*>(f.groupUserdata);
        f.groupClearedBeforeFree = group == FakeGroup() && record != nullptr &&
                                   record->group == nullptr && record->stopping.load() == 1;
        f.groupAlive = false;
    }
    // A state change that was already on its way arrives while the group goes.
    if (f.groupCallback != nullptr) {
        f.FireGroup(AVAHI_ENTRY_GROUP_COLLISION);
    }
    return 0;
}

extern "C" int AvahiThreadedPollStart(void) {
    FakeAvahi& f = Fake();
    f.Log("PollStart");
    if (f.pollStartResult != 0) {
        return f.pollStartResult;
    }
    if (f.pollThreadFiresRunning) {
        f.pollQuit = false;
        FakeAvahi* fake = &f;
        f.pollThread = std::thread([fake] {
            while (!fake->pollQuit.load()) {
                fake->FireClient(AVAHI_CLIENT_S_RUNNING);
                std::this_thread::yield();
            }
        });
    }
    return 0;
}

extern "C" int AvahiThreadedPollStop(void) {
    FakeAvahi& f = Fake();
    f.Log("PollStop");
    if (f.pollThread.joinable()) {
        f.pollQuit = true;
        f.pollThread.join();
    }
    return 0;
}

extern "C" int AvahiThreadedPollLock(int inPollThread) {
    FakeAvahi& f = Fake();
    f.Log("Lock(" + std::to_string(inPollThread) + ")");
    if (inPollThread == 0) {
        f.pollMutex.lock();
    }
    std::lock_guard<std::recursive_mutex> lock(f.stateMutex);
    ++f.lockDepth;
    return 0;
}

extern "C" int AvahiThreadedPollUnlock(int inPollThread) {
    FakeAvahi& f = Fake();
    f.Log("Unlock(" + std::to_string(inPollThread) + ")");
    {
        std::lock_guard<std::recursive_mutex> lock(f.stateMutex);
        --f.lockDepth;
    }
    if (inPollThread == 0) {
        f.pollMutex.unlock();
    }
    return 0;
}

// ---- libqvtargetcfg.so.1

extern "C" int targetcfgGetDefaultMACAddress(unsigned char* buffer, unsigned int length) {
    FakeAvahi& f = Fake();
    f.Log("GetMAC");
    if (f.macResult != 0 || length != 6) {
        return f.macResult != 0 ? f.macResult : -1;
    }
    std::memcpy(buffer, f.mac, 6);
    return 0;
}

// ---- libavahi-client / libavahi-common calls the publisher makes on its group and client

extern "C" int avahi_entry_group_is_empty(AvahiEntryGroup*) {
    GroupCall("is_empty");
    std::lock_guard<std::recursive_mutex> lock(Fake().stateMutex);
    return Next(Fake().isEmptyResults, Fake().isEmptyDefault);
}

extern "C" int avahi_entry_group_add_service_strlst(AvahiEntryGroup* group, AvahiIfIndex interface,
                                                    AvahiProtocol protocol, AvahiPublishFlags flags,
                                                    const char* name, const char* type,
                                                    const char* domain, const char* host,
                                                    uint16_t port, AvahiStringList* txt) {
    GroupCall("add");
    FakeAvahi& f = Fake();
    std::lock_guard<std::recursive_mutex> lock(f.stateMutex);
    f.addedNames.push_back(name);
    f.lastType = type;
    f.lastDomain = domain;
    f.lastPort = port;
    f.lastAddArgumentsAsExpected = group == FakeGroup() && interface == AVAHI_IF_UNSPEC &&
                                   protocol == AVAHI_PROTO_UNSPEC && flags == 0 && host == nullptr;
    f.lastTxt.clear();
    for (AvahiStringList* item = txt; item != nullptr; item = avahi_string_list_get_next(item)) {
        f.lastTxt.emplace_back(reinterpret_cast<const char*>(avahi_string_list_get_text(item)),
                               avahi_string_list_get_size(item));
    }
    return Next(f.addResults, 0);
}

extern "C" int avahi_entry_group_commit(AvahiEntryGroup*) {
    GroupCall("commit");
    return Fake().commitResult;
}

extern "C" int avahi_entry_group_reset(AvahiEntryGroup*) {
    GroupCall("reset");
    return 0;
}

extern "C" int avahi_client_errno(AvahiClient*) {
    FakeAvahi& f = Fake();
    std::lock_guard<std::recursive_mutex> lock(f.stateMutex);
    f.Log("client_errno");
    ++f.clientErrnoReads;
    return AVAHI_ERR_DISCONNECTED;
}

// Avahi's rule in short: "name" -> "name #2" -> "name #3" ...
extern "C" char* avahi_alternative_service_name(const char* name) {
    FakeAvahi& f = Fake();
    f.Log("alternative");
    if (f.alternativeFails) {
        return nullptr;
    }
    std::string text(name);
    std::size_t hash = text.rfind(" #");
    int next = 2;
    if (hash != std::string::npos) {
        next = std::atoi(text.c_str() + hash + 2) + 1;
        text.erase(hash);
    }
    return avahi_strdup((text + " #" + std::to_string(next)).c_str());
}
