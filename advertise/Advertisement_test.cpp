#include "advertise/Advertisement.h"

#include "advertise/testing/FakeAvahi.h"
#include "config/ConfigManager_qvini.h"

#include <avahi-common/error.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <unistd.h>
#include <cstdlib>
#include <fstream>
#include <string>

namespace qv::variable::remoteconfig {
namespace {

using ::testing::ElementsAre;

class AdvertisementTest : public ::testing::Test {
protected:
    void SetUp() override {
        testing::Reset();
        char pattern[] = "/tmp/qv-advertise-test.XXXXXX";
        ASSERT_NE(nullptr, mkdtemp(pattern));
        m_dir = pattern;
        m_path = m_dir + "/qv-rt.ini";
    }
    void TearDown() override {
        StopAdvertisement();
        testing::Reset();
        std::remove(m_path.c_str());
        rmdir(m_dir.c_str());
    }

    void WriteConfig(const std::string& text) { std::ofstream(m_path) << text; }

    std::string m_dir, m_path;
};

TEST_F(AdvertisementTest, AnnouncesTheHostNameWithTheTwoTxtPairs) {
    WriteConfig("[SYSTEMSETTINGS]\nHost_Name = \"lab rig 2\"\n");
    ph_fwk::ConfigManager_qvini config(m_path);
    EXPECT_EQ(0, StartAdvertisementFrom(config));
    ASSERT_NE(nullptr, CurrentAdvertisement());
    EXPECT_THAT(testing::Fake().addedNames, ElementsAre("lab rig 2 qv_variable_iotolvane"));
    EXPECT_EQ("_qv-iovar._tcp", testing::Fake().lastType);
    EXPECT_EQ("local", testing::Fake().lastDomain);
    EXPECT_EQ(80, testing::Fake().lastPort);
    EXPECT_THAT(testing::Fake().lastTxt,
                ElementsAre("MAC=02:1A:2B:3C:4D:5E", "supportTolvane=yes"));

    // A second start while announcing keeps the running record (one client per process).
    MdnsService* running = CurrentAdvertisement();
    std::size_t mark = testing::Fake().Mark();
    EXPECT_EQ(0, StartAdvertisementFrom(config));
    EXPECT_EQ(running, CurrentAdvertisement());
    EXPECT_TRUE(testing::Fake().CallsSince(mark).empty());

    // Finalize twice: released once.
    StopAdvertisement();
    EXPECT_EQ(nullptr, CurrentAdvertisement());
    mark = testing::Fake().Mark();
    StopAdvertisement();
    EXPECT_TRUE(testing::Fake().CallsSince(mark).empty());
    int frees = 0;
    for (const std::string& call : testing::Fake().calls) {
        frees += call == "ClientFree";
    }
    EXPECT_EQ(1, frees);
}

TEST_F(AdvertisementTest, EmptyOrMissingHostNameIsUnknownAndFailuresLeaveNoRecord) {
    EXPECT_EQ("unknown qv_variable_iotolvane", AdvertisedInstanceName(""));
    EXPECT_EQ("  qv_variable_iotolvane", AdvertisedInstanceName(" "));  // used as stored

    {
        ph_fwk::ConfigManager_qvini missing(m_path);  // no file at all
        EXPECT_EQ(0, StartAdvertisementFrom(missing));
        EXPECT_THAT(testing::Fake().addedNames, ElementsAre("unknown qv_variable_iotolvane"));
        StopAdvertisement();
    }
    testing::Reset();
    WriteConfig("[SYSTEMSETTINGS]\nHost_Name =\n");
    {
        ph_fwk::ConfigManager_qvini empty(m_path);
        EXPECT_EQ(0, StartAdvertisementFrom(empty));
        EXPECT_THAT(testing::Fake().addedNames, ElementsAre("unknown qv_variable_iotolvane"));
        StopAdvertisement();
    }

    // No daemon: a mapped code, nothing announced, and a later start tries again.
    testing::Reset();
    testing::Fake().clientNewResult = AVAHI_ERR_NO_DAEMON;
    ph_fwk::ConfigManager_qvini config(m_path);
    EXPECT_EQ(-8, StartAdvertisementFrom(config));
    EXPECT_EQ(nullptr, CurrentAdvertisement());
    testing::Fake().clientNewResult = 0;
    EXPECT_EQ(0, StartAdvertisementFrom(config));
    EXPECT_NE(nullptr, CurrentAdvertisement());
}

TEST_F(AdvertisementTest, FinalizeWithoutStartDoesNothing) {
    StopAdvertisement();
    EXPECT_TRUE(testing::Fake().calls.empty());
    EXPECT_EQ(nullptr, CurrentAdvertisement());
}

}  // namespace
}  // namespace qv::variable::remoteconfig
