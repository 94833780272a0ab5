#include "advertise/MdnsService.h"

#include "advertise/TxtList.h"
#include "advertise/testing/FakeAvahi.h"

#include <avahi-common/error.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <vector>

namespace qv::variable::remoteconfig {
namespace {

using ::testing::ElementsAre;
using Calls = std::vector<std::string>;

class MdnsServiceTest : public ::testing::Test {
protected:
    void SetUp() override { testing::Reset(); }
    void TearDown() override {
        MdnsServiceStop(m_pService);
        TxtListFree(&m_pTxt);
        testing::Reset();
    }

    testing::FakeAvahi& Fake() { return testing::Fake(); }

    int Start(const char* name = "target-a qv_variable_iotolvane") {
        return MdnsServiceStart(name, "_qv-iovar._tcp", "local", 80, &m_pTxt, &m_pService);
    }

    MdnsService* m_pService = nullptr;
    AvahiStringList* m_pTxt = nullptr;
};

TEST_F(MdnsServiceTest, StartRegistersUnderTheLockBeforeThePollRunsAndStopUndoesInOrder) {
    const std::uint8_t yes[] = {'y', 'e', 's'};
    ASSERT_EQ(0, TxtListAddPair(&m_pTxt, "supportTolvane", 3, yes));
    ASSERT_EQ(0, Start());
    ASSERT_NE(nullptr, m_pService);
    EXPECT_THAT(Fake().calls, ElementsAre("GetMAC", "ClientNew", "GroupNew(0)", "Lock(0)",
                                          "is_empty", "Unlock(0)", "Lock(0)", "add", "Unlock(0)",
                                          "Lock(0)", "commit", "Unlock(0)", "PollStart"));
    EXPECT_EQ(0, Fake().unlockedGroupCalls);
    EXPECT_TRUE(Fake().lastAddArgumentsAsExpected);
    EXPECT_THAT(Fake().addedNames, ElementsAre("target-a qv_variable_iotolvane"));
    EXPECT_EQ("_qv-iovar._tcp", Fake().lastType);
    EXPECT_EQ("local", Fake().lastDomain);
    EXPECT_EQ(80, Fake().lastPort);
    EXPECT_THAT(Fake().lastTxt, ElementsAre("MAC=02:1A:2B:3C:4D:5E", "supportTolvane=yes"));
    // The caller's list got the MAC too; the record holds its own copy.
    EXPECT_EQ(1, TxtListHasKey(&m_pTxt, "MAC"));
    EXPECT_NE(m_pTxt, m_pService->txt);
    EXPECT_EQ(testing::FakeClient(), m_pService->client);
    EXPECT_EQ(testing::FakeGroup(), m_pService->group);

    std::size_t mark = Fake().Mark();
    MdnsServiceStop(m_pService);
    m_pService = nullptr;
    // The late collision that the fake fires while the group is freed is ignored.
    EXPECT_THAT(Fake().CallsSince(mark),
                ElementsAre("Lock(0)", "Unlock(0)", "GroupFree(0)", "PollStop", "ClientFree"));
    EXPECT_TRUE(Fake().groupClearedBeforeFree);
    EXPECT_THAT(Fake().addedNames, ElementsAre("target-a qv_variable_iotolvane"));

    mark = Fake().Mark();
    MdnsServiceStop(nullptr);
    EXPECT_TRUE(Fake().CallsSince(mark).empty());
}

TEST_F(MdnsServiceTest, EveryCollisionTakesTheAlternativeNameAndResetsTheGroup) {
    Fake().addResults = {AVAHI_ERR_COLLISION, AVAHI_ERR_COLLISION, AVAHI_ERR_COLLISION, 0};
    ASSERT_EQ(0, Start("lab rig 2 qv_variable_iotolvane"));
    EXPECT_THAT(
        Fake().addedNames,
        ElementsAre("lab rig 2 qv_variable_iotolvane", "lab rig 2 qv_variable_iotolvane #2",
                    "lab rig 2 qv_variable_iotolvane #3", "lab rig 2 qv_variable_iotolvane #4"));
    EXPECT_STREQ("lab rig 2 qv_variable_iotolvane #4", m_pService->name);
    int resets = 0, groups = 0;
    for (const std::string& call : Fake().calls) {
        resets += call == "reset";
        groups += call.rfind("GroupNew", 0) == 0;
    }
    EXPECT_EQ(3, resets);
    EXPECT_EQ(1, groups);  // one group, reset and reused
    EXPECT_EQ(0, Fake().unlockedGroupCalls);
}

TEST_F(MdnsServiceTest, AGroupThatAlreadyHoldsEntriesIsLeftAsItIs) {
    Fake().isEmptyResults = {0};
    ASSERT_EQ(0, Start());
    EXPECT_TRUE(Fake().addedNames.empty());
    for (const std::string& call : Fake().calls) {
        EXPECT_NE("commit", call);
    }
    // An error from is_empty is not "holds entries": the service is added.
    MdnsServiceStop(m_pService);
    m_pService = nullptr;
    testing::Reset();
    Fake().isEmptyResults = {AVAHI_ERR_DISCONNECTED};
    ASSERT_EQ(0, Start());
    EXPECT_EQ(1u, Fake().addedNames.size());
}

TEST_F(MdnsServiceTest, FailuresAreMappedOnceAndLeaveNothingBehind) {
    struct Case {
        const char* what;
        void (*script)(testing::FakeAvahi&);
        int expected;
        bool clientMade;
        bool pollStarted;
    };
    const Case cases[] = {
        {"no daemon at client creation",
         [](testing::FakeAvahi& f) { f.clientNewResult = AVAHI_ERR_NO_DAEMON; }, -8, false, false},
        {"access denied at client creation",
         [](testing::FakeAvahi& f) { f.clientNewResult = AVAHI_ERR_ACCESS_DENIED; }, -13, false,
         false},
        // -26 maps to -8 once; mapped again it would read as a collision (-11).
        {"group creation", [](testing::FakeAvahi& f) { f.groupNewResults = {AVAHI_ERR_NO_DAEMON}; },
         -8, true, false},
        {"invalid key", [](testing::FakeAvahi& f) { f.addResults = {AVAHI_ERR_INVALID_KEY}; }, -9,
         true, false},
        // -5 (no network) maps to -15; mapped again it would be -3.
        {"commit", [](testing::FakeAvahi& f) { f.commitResult = AVAHI_ERR_NO_NETWORK; }, -15, true,
         false},
        {"bad name", [](testing::FakeAvahi& f) { f.addResults = {AVAHI_ERR_INVALID_SERVICE_NAME}; },
         -3, true, false},
        {"poll start", [](testing::FakeAvahi& f) { f.pollStartResult = AVAHI_ERR_OS; }, -3, true,
         true},
        {"no alternative name",
         [](testing::FakeAvahi& f) {
             f.addResults = {AVAHI_ERR_COLLISION};
             f.alternativeFails = true;
         },
         -5, true, false},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.what);
        testing::Reset();
        c.script(Fake());
        m_pService = reinterpret_cast<MdnsService*>(&m_pTxt);  // must be overwritten with null
        EXPECT_EQ(c.expected, Start());
        EXPECT_EQ(nullptr, m_pService);
        const Calls& calls = Fake().calls;
        ASSERT_FALSE(calls.empty());
        if (c.clientMade) {
            // Released as the stop does: poll stopped before the client is freed, last.
            ASSERT_GE(calls.size(), 2u);
            EXPECT_EQ("PollStop", calls[calls.size() - 2]);
            EXPECT_EQ("ClientFree", calls.back());
        } else {
            EXPECT_EQ("ClientNew", calls.back());
        }
        EXPECT_EQ(c.pollStarted, std::count(calls.begin(), calls.end(), "PollStart") == 1);
        EXPECT_EQ(0, Fake().unlockedGroupCalls);
        TxtListFree(&m_pTxt);
    }
}

TEST_F(MdnsServiceTest, UnreadableMacAnnouncesNothing) {
    Fake().macResult = 1;
    m_pService = reinterpret_cast<MdnsService*>(&m_pTxt);
    EXPECT_EQ(-3, Start());
    EXPECT_EQ(nullptr, m_pService);
    EXPECT_THAT(Fake().calls, ElementsAre("GetMAC"));
    EXPECT_EQ(nullptr, m_pTxt);
    EXPECT_EQ(-6, MdnsServiceStart("n", "t", "d", 80, nullptr, nullptr));
    EXPECT_EQ(-6, MdnsServiceStart(nullptr, "t", "d", 80, nullptr, &m_pService));
}

TEST_F(MdnsServiceTest, CallbacksOnThePollThread) {
    ASSERT_EQ(0, Start("target-a qv_variable_iotolvane"));

    // A collision after establishment: renamed and registered with flag 1 everywhere.
    std::size_t mark = Fake().Mark();
    Fake().FireGroup(AVAHI_ENTRY_GROUP_COLLISION);
    EXPECT_THAT(Fake().CallsSince(mark),
                ElementsAre("alternative", "Lock(1)", "is_empty", "Unlock(1)", "Lock(1)", "add",
                            "Unlock(1)", "Lock(1)", "commit", "Unlock(1)"));
    EXPECT_STREQ("target-a qv_variable_iotolvane #2", m_pService->name);

    // A failed alternative keeps the old name and registers nothing.
    Fake().alternativeFails = true;
    mark = Fake().Mark();
    Fake().FireGroup(AVAHI_ENTRY_GROUP_COLLISION);
    EXPECT_THAT(Fake().CallsSince(mark), ElementsAre("alternative"));
    EXPECT_STREQ("target-a qv_variable_iotolvane #2", m_pService->name);

    mark = Fake().Mark();
    Fake().FireGroup(AVAHI_ENTRY_GROUP_FAILURE);
    Fake().FireGroup(AVAHI_ENTRY_GROUP_ESTABLISHED);
    EXPECT_TRUE(Fake().CallsSince(mark).empty());

    // The daemon's host name changes: withdrawn (no lock call), then announced again once
    // the client runs again.
    mark = Fake().Mark();
    Fake().FireClient(AVAHI_CLIENT_S_COLLISION);
    Fake().FireClient(AVAHI_CLIENT_S_REGISTERING);
    EXPECT_THAT(Fake().CallsSince(mark), ElementsAre("reset", "reset"));
    mark = Fake().Mark();
    Fake().FireClient(AVAHI_CLIENT_S_RUNNING);
    EXPECT_THAT(Fake().CallsSince(mark),
                ElementsAre("Lock(1)", "is_empty", "Unlock(1)", "Lock(1)", "add", "Unlock(1)",
                            "Lock(1)", "commit", "Unlock(1)"));
    // Still announced: running again adds nothing.
    Fake().isEmptyDefault = 0;
    mark = Fake().Mark();
    Fake().FireClient(AVAHI_CLIENT_S_RUNNING);
    EXPECT_THAT(Fake().CallsSince(mark), ElementsAre("Lock(1)", "is_empty", "Unlock(1)"));

    mark = Fake().Mark();
    Fake().FireClient(AVAHI_CLIENT_FAILURE);
    EXPECT_THAT(Fake().CallsSince(mark), ElementsAre("client_errno"));
    EXPECT_EQ(0, Fake().unlockedGroupCalls);

    // While stopping, both callbacks return at once.
    m_pService->stopping = 1;
    mark = Fake().Mark();
    Fake().FireClient(AVAHI_CLIENT_S_COLLISION);
    Fake().FireClient(AVAHI_CLIENT_S_RUNNING);
    Fake().FireGroup(AVAHI_ENTRY_GROUP_COLLISION);
    EXPECT_TRUE(Fake().CallsSince(mark).empty());
    m_pService->stopping = 0;
}

TEST_F(MdnsServiceTest, StopRacesAPollThreadThatKeepsCallingBack) {
    // The fake poll thread reports "running" in a loop, each time taking the poll lock and
    // reading the record; the stop must clear the group under that lock and join the thread
    // before releasing anything (ThreadSanitizer and AddressSanitizer check the rest).
    Fake().pollThreadFiresRunning = true;
    Fake().isEmptyDefault = 0;
    for (int round = 0; round < 20; ++round) {
        ASSERT_EQ(0, Start());
        MdnsServiceStop(m_pService);
        m_pService = nullptr;
        EXPECT_TRUE(Fake().groupClearedBeforeFree);
        testing::Reset();
        Fake().pollThreadFiresRunning = true;
        Fake().isEmptyDefault = 0;
    }
}

}  // namespace
}  // namespace qv::variable::remoteconfig
