// The host calls the context by slot position: GetInt64Value must be slot 0 and
// GetOperationName slot 3, with nothing virtual before them.
#include <gtest/gtest.h>

#include "plugin/testing/FakeContext.h"

namespace qv {
namespace variable {
namespace remoteconfig {
namespace {

TEST(RequestContextLayoutTest, SlotsZeroAndThreeByPosition) {
    testing::FakeContext context("close_session", 123);
    wsruntime::IRequestContext* base = &context;
    void** table = *reinterpret_cast<void***>(base);

    using GetInt64 = int32_t (*)(wsruntime::IRequestContext*, const zil::WideString&, int64_t&);
    using GetName = const zil::WideString* (*)(wsruntime::IRequestContext*);
    int64_t value = 0;
    reinterpret_cast<GetInt64>(table[0])(base, zil::WideString(L"session"), value);
    EXPECT_EQ(value, 123);
    EXPECT_EQ(context.sessionCalls, 1);
    EXPECT_EQ(reinterpret_cast<GetName>(table[3])(base), context.GetOperationName());
}

}  // namespace
}  // namespace remoteconfig
}  // namespace variable
}  // namespace qv
