// Runs against whatever Avahi daemon the process can reach. Without one, the daemon tests
// skip, unless QV_REQUIRE_AVAHI_DAEMON is set (the end-to-end script sets it inside its
// namespace, where it has started a daemon).
#include "platform/avahi_client/qvAvahiClient.h"

#include <avahi-common/error.h>
#include <gtest/gtest.h>

#include <chrono>
#include <condition_variable>
#include <cstdlib>
#include <mutex>
#include <thread>

namespace {

constexpr auto kDeadline = std::chrono::seconds(20);

struct Observed {
    std::mutex mutex;
    std::condition_variable changed;
    int clientCalls = 0;
    bool slotFilledBeforeCallback = false;
    AvahiClient** clientSlot = nullptr;
    AvahiEntryGroup** groupSlot = nullptr;
    bool groupSlotFilled = false;
    int groupCalls = 0;
    bool sawEstablished = false;
    std::thread::id groupThread;
    // Work done from inside a group callback on the poll thread.
    int lockResult = 1;
    int unlockResult = 1;
    int nestedGroupResult = 1;
    AvahiEntryGroup* nestedGroup = nullptr;
};

void OnClient(AvahiClient* client, AvahiClientState, void* userdata) {
    auto* o = static_cast<Observed*>(userdata);
    std::lock_guard<std::mutex> lock(o->mutex);
    ++o->clientCalls;
    if (o->clientCalls == 1) {
        o->slotFilledBeforeCallback = *o->clientSlot == client;
    }
}

void OnGroup(AvahiEntryGroup* group, AvahiEntryGroupState state, void* userdata) {
    auto* o = static_cast<Observed*>(userdata);
    std::lock_guard<std::mutex> lock(o->mutex);
    ++o->groupCalls;
    o->groupSlotFilled = o->groupSlot == nullptr || *o->groupSlot == group;
    if (state == AVAHI_ENTRY_GROUP_ESTABLISHED && !o->sawEstablished) {
        o->sawEstablished = true;
        o->groupThread = std::this_thread::get_id();
        // Avahi's own lock would abort or deadlock here; ours must do neither.
        o->lockResult = AvahiThreadedPollLock(1);
        o->nestedGroupResult = AvahiEntryGroupNew(avahi_entry_group_get_client(group), nullptr,
                                                  nullptr, 1, &o->nestedGroup);
        o->unlockResult = AvahiThreadedPollUnlock(1);
    }
    o->changed.notify_all();
}

bool DaemonRequired() { return std::getenv("QV_REQUIRE_AVAHI_DAEMON") != nullptr; }

TEST(AvahiClientWrapper, CallsWithoutAClientFailCleanly) {
    EXPECT_EQ(AVAHI_ERR_BAD_STATE, AvahiClientFree());
    EXPECT_EQ(AVAHI_ERR_BAD_STATE, AvahiThreadedPollStart());
    EXPECT_EQ(AVAHI_ERR_BAD_STATE, AvahiThreadedPollStop());
    EXPECT_EQ(AVAHI_ERR_BAD_STATE, AvahiThreadedPollLock(0));
    EXPECT_EQ(AVAHI_ERR_BAD_STATE, AvahiThreadedPollUnlock(0));
    EXPECT_EQ(0, AvahiThreadedPollLock(1));
    EXPECT_EQ(0, AvahiThreadedPollUnlock(1));
    AvahiEntryGroup* group = nullptr;
    EXPECT_EQ(AVAHI_ERR_INVALID_ARGUMENT, AvahiEntryGroupNew(nullptr, nullptr, nullptr, 0, &group));
    EXPECT_EQ(AVAHI_ERR_INVALID_ARGUMENT, AvahiEntryGroupFree(nullptr, 0));
    EXPECT_EQ(AVAHI_ERR_INVALID_ARGUMENT, AvahiClientNew(nullptr, nullptr, nullptr));
}

TEST(AvahiClientWrapper, OneClientAThreadedPollAndCallbacksOnIt) {
    Observed o;
    AvahiClient* client = nullptr;
    o.clientSlot = &client;
    int rc = AvahiClientNew(&OnClient, &o, &client);
    if (rc != 0) {
        ASSERT_FALSE(DaemonRequired()) << avahi_strerror(rc);
        EXPECT_EQ(nullptr, client);
        // Nothing was left behind: the next attempt fails the same way, not as "bad state".
        EXPECT_EQ(rc, AvahiClientNew(&OnClient, &o, &client));
        EXPECT_EQ(AVAHI_ERR_BAD_STATE, AvahiThreadedPollStart());
        GTEST_SKIP() << "no Avahi daemon reachable: " << avahi_strerror(rc);
    }
    ASSERT_NE(nullptr, client);
    {
        std::lock_guard<std::mutex> lock(o.mutex);
        EXPECT_GE(o.clientCalls, 1);  // the first state arrives inside avahi_client_new
        EXPECT_TRUE(o.slotFilledBeforeCallback);
    }
    AvahiClient* second = nullptr;
    EXPECT_EQ(AVAHI_ERR_BAD_STATE, AvahiClientNew(&OnClient, &o, &second));
    EXPECT_EQ(nullptr, second);

    AvahiEntryGroup* group = nullptr;
    o.groupSlot = &group;
    ASSERT_EQ(0, AvahiEntryGroupNew(client, &OnGroup, &o, 0, &group));
    ASSERT_NE(nullptr, group);
    ASSERT_EQ(0, AvahiThreadedPollLock(0));
    int added = avahi_entry_group_add_service(
        group, AVAHI_IF_UNSPEC, AVAHI_PROTO_UNSPEC, AvahiPublishFlags(0), "wrapper test service",
        "_qv-wrapper-test._tcp", nullptr, nullptr, 4242, nullptr);
    int committed = added == 0 ? avahi_entry_group_commit(group) : added;
    ASSERT_EQ(0, AvahiThreadedPollUnlock(0));
    ASSERT_EQ(0, added) << avahi_strerror(added);
    ASSERT_EQ(0, committed) << avahi_strerror(committed);

    ASSERT_EQ(0, AvahiThreadedPollStart());
    EXPECT_EQ(AVAHI_ERR_BAD_STATE, AvahiThreadedPollStart());
    {
        std::unique_lock<std::mutex> lock(o.mutex);
        ASSERT_TRUE(o.changed.wait_for(lock, kDeadline, [&] { return o.sawEstablished; }));
        EXPECT_NE(std::this_thread::get_id(), o.groupThread);
        EXPECT_TRUE(o.groupSlotFilled);
        EXPECT_EQ(0, o.lockResult);
        EXPECT_EQ(0, o.unlockResult);
        EXPECT_EQ(0, o.nestedGroupResult);
        EXPECT_NE(nullptr, o.nestedGroup);
    }
    // The controlling thread can still take the lock once the callback is done.
    ASSERT_EQ(0, AvahiThreadedPollLock(0));
    EXPECT_EQ(0, avahi_entry_group_is_empty(o.nestedGroup) >= 0 ? 0 : 1);
    ASSERT_EQ(0, AvahiThreadedPollUnlock(0));
    EXPECT_EQ(0, AvahiEntryGroupFree(o.nestedGroup, 0));
    EXPECT_EQ(AVAHI_ERR_INVALID_OBJECT, AvahiEntryGroupFree(o.nestedGroup, 0));

    ASSERT_EQ(0, AvahiThreadedPollStop());
    int callsAtStop;
    {
        std::lock_guard<std::mutex> lock(o.mutex);
        callsAtStop = o.groupCalls + o.clientCalls;
    }
    // With the poll stopped, withdrawing the group reports nothing through a callback.
    EXPECT_EQ(0, AvahiEntryGroupFree(group, 0));
    EXPECT_EQ(0, AvahiClientFree());
    {
        std::lock_guard<std::mutex> lock(o.mutex);
        EXPECT_EQ(callsAtStop, o.groupCalls + o.clientCalls);
    }
    EXPECT_EQ(AVAHI_ERR_BAD_STATE, AvahiClientFree());

    // A new client after the old one is gone, freed while its poll still runs.
    Observed again;
    AvahiClient* next = nullptr;
    again.clientSlot = &next;
    ASSERT_EQ(0, AvahiClientNew(&OnClient, &again, &next));
    ASSERT_EQ(0, AvahiThreadedPollStart());
    EXPECT_EQ(0, AvahiClientFree());
    EXPECT_EQ(AVAHI_ERR_BAD_STATE, AvahiThreadedPollStop());
}

}  // namespace
