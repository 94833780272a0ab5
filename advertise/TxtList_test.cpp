#include "advertise/TxtList.h"

#include "advertise/testing/FakeAvahi.h"

#include <avahi-common/malloc.h>
#include <gtest/gtest.h>

#include <atomic>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

namespace qv::variable::remoteconfig {
namespace {

std::vector<std::string> Strings(AvahiStringList* list) {
    std::vector<std::string> out;
    for (; list != nullptr; list = avahi_string_list_get_next(list)) {
        out.emplace_back(reinterpret_cast<const char*>(avahi_string_list_get_text(list)),
                         avahi_string_list_get_size(list));
    }
    return out;
}

const std::uint8_t* Bytes(const char* text) { return reinterpret_cast<const std::uint8_t*>(text); }

class TxtListTest : public ::testing::Test {
protected:
    void SetUp() override { testing::Reset(); }
    void TearDown() override { testing::Reset(); }
};

TEST_F(TxtListTest, PairsAreAddedWithTheirLengthAndFoundByKey) {
    AvahiStringList* list = reinterpret_cast<AvahiStringList*>(&list);  // garbage before New
    TxtListNew(&list);
    EXPECT_EQ(nullptr, list);
    EXPECT_EQ(0, TxtListHasKey(&list, "supportTolvane"));
    EXPECT_EQ(0, TxtListHasKey(nullptr, "MAC"));

    EXPECT_EQ(0, TxtListAddPair(&list, "supportTolvane", 3, Bytes("yes-and-more")));
    EXPECT_EQ(0, TxtListAddPair(&list, "bin", 3, Bytes("a\0b")));
    EXPECT_EQ(0, TxtListAddPair(&list, "empty", 0, Bytes("")));
    // Avahi puts each new pair at the head.
    EXPECT_EQ(
        (std::vector<std::string>{"empty=", std::string("bin=a\0b", 7), "supportTolvane=yes"}),
        Strings(list));
    EXPECT_EQ(1, TxtListHasKey(&list, "supportTolvane"));
    EXPECT_EQ(1, TxtListHasKey(&list, "bin"));
    EXPECT_EQ(0, TxtListHasKey(&list, "support"));

    // Refused without change.
    EXPECT_EQ(-6, TxtListAddPair(&list, "neg", -1, Bytes("x")));
    EXPECT_EQ(-6, TxtListAddPair(&list, nullptr, 1, Bytes("x")));
    EXPECT_EQ(-6, TxtListAddPair(nullptr, "k", 1, Bytes("x")));
    EXPECT_EQ(3u, Strings(list).size());

    TxtListFree(&list);
    EXPECT_EQ(nullptr, list);
    TxtListFree(&list);  // freeing an empty list is harmless
    TxtListFree(nullptr);
}

// An allocator that fails every request once armed.
std::atomic<bool> g_failAllocations{false};
void* FailingMalloc(size_t size) { return g_failAllocations ? nullptr : std::malloc(size); }
void* FailingRealloc(void* p, size_t size) {
    return g_failAllocations ? nullptr : std::realloc(p, size);
}
void* FailingCalloc(size_t n, size_t size) {
    return g_failAllocations ? nullptr : std::calloc(n, size);
}

TEST_F(TxtListTest, AListThatCannotGrowIsReleasedAndLeftEmpty) {
    static const AvahiAllocator failing = {FailingMalloc, std::free, FailingRealloc, FailingCalloc};
    avahi_set_allocator(&failing);
    AvahiStringList* list = nullptr;
    ASSERT_EQ(0, TxtListAddPair(&list, "supportTolvane", 3, Bytes("yes")));
    g_failAllocations = true;
    EXPECT_EQ(-5, TxtListAddPair(&list, "MAC", 3, Bytes("abc")));
    g_failAllocations = false;
    EXPECT_EQ(nullptr, list);  // the earlier pair is released, not leaked (checked by ASan)
    avahi_set_allocator(nullptr);
}

TEST_F(TxtListTest, DefaultMacIsUpperCaseHexAndAddedOnlyOnce) {
    testing::Fake().mac[0] = 0x0a;
    testing::Fake().mac[5] = 0xf0;
    char text[kMacTextSize + 2];
    std::memset(text, '#', sizeof text);
    ASSERT_EQ(0, FormatDefaultMac(text));
    EXPECT_STREQ("0A:1A:2B:3C:4D:F0", text);
    EXPECT_EQ('#', text[kMacTextSize]);

    AvahiStringList* list = nullptr;
    ASSERT_EQ(0, TxtListAddPair(&list, "supportTolvane", 3, Bytes("yes")));
    ASSERT_EQ(0, TxtAddDefaultMac(&list));
    EXPECT_EQ((std::vector<std::string>{"MAC=0A:1A:2B:3C:4D:F0", "supportTolvane=yes"}),
              Strings(list));
    // A list that has a MAC keeps it: no second pair, the library is not even asked.
    std::size_t mark = testing::Fake().Mark();
    testing::Fake().mac[0] = 0x77;
    ASSERT_EQ(0, TxtAddDefaultMac(&list));
    EXPECT_EQ(2u, Strings(list).size());
    EXPECT_EQ(1, TxtListHasKey(&list, "MAC"));
    EXPECT_EQ("MAC=0A:1A:2B:3C:4D:F0", Strings(list)[0]);
    EXPECT_TRUE(testing::Fake().CallsSince(mark).empty());
    TxtListFree(&list);

    // A null address changes nothing; an empty list gets the MAC alone.
    EXPECT_EQ(0, TxtAddDefaultMac(nullptr));
    ASSERT_EQ(0, TxtAddDefaultMac(&list));
    EXPECT_EQ(std::vector<std::string>{"MAC=77:1A:2B:3C:4D:F0"}, Strings(list));
    TxtListFree(&list);
}

TEST_F(TxtListTest, UnreadableMacLeavesBufferAndListUntouched) {
    testing::Fake().macResult = 5;
    char text[kMacTextSize] = "untouched";
    EXPECT_EQ(-3, FormatDefaultMac(text));
    EXPECT_STREQ("untouched", text);
    AvahiStringList* list = nullptr;
    ASSERT_EQ(0, TxtListAddPair(&list, "supportTolvane", 3, Bytes("yes")));
    EXPECT_EQ(-3, TxtAddDefaultMac(&list));
    EXPECT_EQ(std::vector<std::string>{"supportTolvane=yes"}, Strings(list));
    TxtListFree(&list);
}

}  // namespace
}  // namespace qv::variable::remoteconfig
