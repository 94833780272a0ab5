#include "plugin/VariableReader.h"

#include <climits>
#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "plugin/StatusCodes.h"
#include "plugin/testing/FakeRuntime.h"

namespace qv {
namespace variable {
namespace remoteconfig {
namespace {

using ::testing::ElementsAre;
using testing::FakeRequest;
using testing::FakeRuntime;

std::vector<std::string> Strings(const ArgumentList& list) {
    std::vector<std::string> out;
    for (const zil::ByteString& value : list) {
        out.emplace_back(value.data(), value.size());
    }
    return out;
}

TEST(VariableReaderTest, TwoCallsFirstWithNullBufferAndExactSize) {
    const std::string longValue(300, 'v');
    FakeRequest& request = FakeRuntime::Open(1, {{"long", longValue}, {"empty", ""}});
    ArgumentList list;
    StatusRecord status;
    ReadVariable(1, list, "long", status);
    ReadVariable(1, list, "empty", status);
    ASSERT_EQ(status.code, 0);
    ASSERT_EQ(list.size(), 2u);
    EXPECT_EQ(list[0].size(), 300u);
    EXPECT_EQ(std::string(list[0].c_str()), longValue);
    EXPECT_TRUE(list[1].empty());
    ASSERT_EQ(request.reads.size(), 4u);
    EXPECT_TRUE(request.reads[0].nullBuffer);
    EXPECT_EQ(request.reads[0].sizeOnEntry, 0u);
    EXPECT_FALSE(request.reads[1].nullBuffer);
    EXPECT_EQ(request.reads[1].sizeOnEntry, 301u);
    EXPECT_EQ(request.reads[3].sizeOnEntry, 1u);
}

TEST(VariableReaderTest, AbsentVariableStopsEveryLaterRead) {
    FakeRequest& request = FakeRuntime::Open(2, {{"a", "1"}, {"c", "3"}});
    ArgumentList list;
    StatusRecord status;
    status.text.reset(new zil::WideString(L"stale"));
    ReadVariable(2, list, "a", status);
    ReadVariable(2, list, "b", status);
    ReadVariable(2, list, "c", status);
    ReadNumberedVariable(2, list, "c", 0, status);
    EXPECT_EQ(status.code, kVariableAbsent);
    EXPECT_EQ(status.text, nullptr);
    EXPECT_THAT(Strings(list), ElementsAre("1"));
    EXPECT_THAT(request.NamesAsked(), ElementsAre("a", "b"));

    zil::ByteString destination("kept");
    StatusRecord fresh;
    ReadVariableInto(2, destination, "absent", fresh);
    EXPECT_EQ(fresh.code, kVariableAbsent);
    EXPECT_STREQ(destination.c_str(), "kept");

    // A null name is refused before the runtime is asked.
    const size_t calls = request.reads.size();
    StatusRecord noName;
    ReadVariable(2, list, nullptr, noName);
    EXPECT_EQ(noName.code, kVariableWithoutName);
    ReadNumberedVariable(2, list, nullptr, 1, noName);
    EXPECT_EQ(request.reads.size(), calls);
}

TEST(VariableReaderTest, NumberedNamesAndCounts) {
    FakeRequest& request = FakeRuntime::Open(
        3, {{"child7", "x"}, {"parent0", "p"}, {"callingConvention2147483647", "c"}});
    ArgumentList list;
    StatusRecord status;
    ReadNumberedVariable(3, list, "child", 7, status);
    ReadNumberedVariable(3, list, "parent", 0, status);
    ReadNumberedVariable(3, list, "callingConvention", 2147483647, status);
    EXPECT_EQ(status.code, 0);
    EXPECT_THAT(Strings(list), ElementsAre("x", "p", "c"));
    EXPECT_THAT(request.NamesAsked(),
                ElementsAre("child7", "parent0", "callingConvention2147483647"));

    // Negative indices keep their sign, as "%s%ld" writes them; a base name too long for
    // the 36-byte buffer is formatted whole, never cut.
    const std::string longBase(40, 'n');
    FakeRequest& more = FakeRuntime::Open(
        5, {{"value-5", "m"}, {"id-2147483648", "i"}, {longBase + "12", "l"}, {"a0", "z"}});
    ArgumentList other;
    ReadNumberedVariable(5, other, "value", -5, status);
    ReadNumberedVariable(5, other, "id", INT32_MIN, status);
    ReadNumberedVariable(5, other, longBase.c_str(), 12, status);
    ReadNumberedVariable(5, other, "a", 0, status);
    EXPECT_EQ(status.code, 0);
    EXPECT_THAT(Strings(other), ElementsAre("m", "i", "l", "z"));
    EXPECT_THAT(more.NamesAsked(), ElementsAre("value-5", "id-2147483648", longBase + "12", "a0"));

    auto count = [](const char* text) { return CountOfLast(ArgumentList{text}); };
    EXPECT_EQ(count(" 3abc"), 3u);
    EXPECT_EQ(count("abc"), 0u);
    EXPECT_EQ(count("-1"), 4294967295u);
    EXPECT_EQ(count("+2"), 2u);
    EXPECT_EQ(count("99999999999"), 2147483647u);  // clamped as on the 32-bit target
    EXPECT_EQ(count("-99999999999"), 2147483648u);
    EXPECT_EQ(CountOfLast(ArgumentList{}), 0u);
    EXPECT_EQ(CountOfLast(ArgumentList{"9", "4"}), 4u);  // the last value counts
}

TEST(VariableReaderTest, NegativeCodeCallsNothing) {
    FakeRequest& request = FakeRuntime::Open(4, {{"a", "1"}});
    ArgumentList list;
    zil::ByteString destination;
    StatusRecord status;
    status.code = -1;
    ReadVariable(4, list, "a", status);
    ReadVariableInto(4, destination, "a", status);
    ReadNumberedVariable(4, list, "a", 0, status);
    ReadVariable(4, list, nullptr, status);
    EXPECT_EQ(status.code, -1);
    EXPECT_TRUE(list.empty());
    EXPECT_TRUE(request.reads.empty());

    // A positive code stops nothing.
    status.code = 5;
    ReadVariable(4, list, "a", status);
    EXPECT_EQ(list.size(), 1u);
}

}  // namespace
}  // namespace remoteconfig
}  // namespace variable
}  // namespace qv
