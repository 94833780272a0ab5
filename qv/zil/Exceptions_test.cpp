#include "qv/zil/Exceptions.h"

#include <gtest/gtest.h>

#include <cstring>
#include <new>

#include "qv/zil/SafeInteger.h"
#include "qv/zil/StringBase.h"

using namespace qv::zil;
using namespace qv::zil::exception;

namespace {
template <typename Catch, typename Throw>
bool CaughtAs(const Throw& thrown) {
    try {
        throw thrown;
    } catch (const Catch&) {
        return true;
    } catch (...) {
        return false;
    }
}
}  // namespace

TEST(Exceptions, FixedTextsAndCodes) {
    const Exception base;
    EXPECT_STREQ("unspecified exception", base.what());
    EXPECT_EQ(-1, base.GetCode());
    EXPECT_EQ(0, base.line);
    EXPECT_EQ(nullptr, base.file);

    EXPECT_STREQ("Out of range", OutOfRange().what());
    EXPECT_STREQ("A request was made that would exceed the bounds", BoundExceeded().what());
    EXPECT_STREQ("Invalid UTF8 encoding sequence", InvalidSequence().what());
    EXPECT_STREQ("Invalid argument(s)", InvalidArgument().what());
    EXPECT_STREQ("Invalid locale", InvalidLocale().what());
    EXPECT_STREQ("Not implemented", NotImplemented().what());
    EXPECT_STREQ("Unable to convert.", UnableToConvert().what());
    EXPECT_STREQ("Buffer overflowed", BufferOverflow().what());
    EXPECT_STREQ("Failed to deserialize", DeserializationError().what());

    // OutOfRange and BoundExceeded share one code.
    EXPECT_EQ(static_cast<int32_t>(0x8ABC7007), OutOfRange().GetCode());
    EXPECT_EQ(static_cast<int32_t>(0x8ABC7007), BoundExceeded().GetCode());
    EXPECT_EQ(static_cast<int32_t>(0x8ABC7030), InvalidSequence().GetCode());
    EXPECT_EQ(static_cast<int32_t>(0x8ABC700F), InvalidArgument().GetCode());
    EXPECT_EQ(static_cast<int32_t>(0x8ABC7024), InvalidLocale().GetCode());
    EXPECT_EQ(static_cast<int32_t>(0x80004001), NotImplemented().GetCode());
    EXPECT_EQ(static_cast<int32_t>(0x8ABC7034), UnableToConvert().GetCode());
    EXPECT_EQ(static_cast<int32_t>(0x8ABC7017), BufferOverflow().GetCode());
    EXPECT_EQ(static_cast<int32_t>(0x8ABC7014), DeserializationError().GetCode());
}

TEST(Exceptions, ComposedMessagesKeepTheirPrefixAndSurviveCopies) {
    EXPECT_STREQ("Out of range: String offset out of range",
                 OutOfRange2(ByteString("String offset out of range")).what());
    EXPECT_STREQ("Out of range: ", OutOfRange2(ByteString()).what());
    EXPECT_STREQ("A request was made that would exceed the bounds: Resulting string too large",
                 BoundExceeded2(ByteString("Resulting string too large")).what());
    EXPECT_STREQ("Invalid argument(s): x", InvalidArgument2(ByteString("x")).what());
    EXPECT_EQ(static_cast<int32_t>(0x8ABC7007), OutOfRange2(ByteString("d")).GetCode());
    EXPECT_EQ(static_cast<int32_t>(0x8ABC700F), InvalidArgument2(ByteString("d")).GetCode());

    // A copy owns its own message: it stays valid after the original is gone.
    OutOfRange2* original = new OutOfRange2(ByteString("detail"));
    const OutOfRange2 copy(*original);
    const char* originalText = original->what();
    EXPECT_NE(originalText, copy.what());
    delete original;
    EXPECT_STREQ("Out of range: detail", copy.what());
}

TEST(Exceptions, CatchClausesFollowTheHierarchy) {
    EXPECT_TRUE((CaughtAs<OutOfRange>(OutOfRange2(ByteString("d")))));
    EXPECT_TRUE((CaughtAs<BoundExceeded>(BoundExceeded2(ByteString("d")))));
    EXPECT_TRUE((CaughtAs<InvalidArgument>(InvalidArgument2(ByteString("d")))));
    EXPECT_TRUE((CaughtAs<Exception>(BufferOverflow())));
    EXPECT_TRUE((CaughtAs<std::exception>(InvalidLocale())));
    EXPECT_FALSE((CaughtAs<Exception>(std::bad_alloc())));
    EXPECT_FALSE((CaughtAs<OutOfRange>(BoundExceeded())));
}

TEST(Exceptions, ThrowRecordsTheSourceFileRelativeToTheRepository) {
    try {
        SafeInteger::Add(0xFFFFFFFFu, 1);
        FAIL() << "no exception";
    } catch (const OutOfRange& e) {
        ASSERT_NE(nullptr, e.file);
        EXPECT_STREQ("qv/zil/SafeInteger.cpp", e.file);
        EXPECT_GT(e.line, 0);
        EXPECT_EQ(nullptr, std::strstr(e.what(), "SafeInteger"));  // what() has no location
    }
}
