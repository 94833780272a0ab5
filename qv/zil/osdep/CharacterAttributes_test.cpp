#include "qv/zil/osdep/CharacterAttributes.h"

#include <gtest/gtest.h>

#include <cstring>

#include "qv/zil/Exceptions.h"

namespace qv {
namespace zil {
namespace osdep {
namespace {

using exception::InvalidArgument;
using exception::InvalidArgument2;

uint32_t Upper(const CharacterAttributes& attributes, uint32_t codePoint) {
    return static_cast<uint32_t>(attributes.ToUpper(static_cast<wchar_t>(codePoint)));
}

TEST(CharacterAttributesTest, DefaultUpperCasesAsciiOnly) {
    const CharacterAttributes classic;
    EXPECT_EQ('A', classic.ToUpper('a'));
    EXPECT_EQ('Z', classic.ToUpper('z'));
    EXPECT_EQ('@', classic.ToUpper('@'));
    EXPECT_EQ('{', classic.ToUpper('{'));
    EXPECT_EQ('Q', classic.ToUpper('Q'));
    EXPECT_EQ('\xE9', classic.ToUpper('\xE9'));  // negative where char is signed
    EXPECT_EQ(static_cast<uint32_t>('A'), Upper(classic, 'a'));
    EXPECT_EQ(0xE9u, Upper(classic, 0xE9));
    // Values beyond Unicode, including those that are negative as a signed wchar_t.
    EXPECT_EQ(0x7FFFFFFFu, Upper(classic, 0x7FFFFFFF));
    EXPECT_EQ(0xFFFFFFFFu, Upper(classic, 0xFFFFFFFF));

    const CharacterAttributes copy = classic;
    EXPECT_EQ('B', copy.ToUpper('b'));
}

TEST(CharacterAttributesTest, NamedLocaleUpperCasesItsCharacters) {
    const CharacterAttributes c("C");
    EXPECT_EQ(0xE9u, Upper(c, 0xE9));
    CharacterAttributes* utf8 = nullptr;
    try {
        utf8 = new CharacterAttributes("C.UTF-8");
    } catch (const InvalidArgument&) {
        GTEST_SKIP() << "no C.UTF-8 locale here";
    }
    const std::unique_ptr<CharacterAttributes> owner(utf8);
    EXPECT_EQ(0xC9u, Upper(*utf8, 0xE9));
    EXPECT_EQ(0x178u, Upper(*utf8, 0xFF));   // y with diaeresis leaves Latin-1
    EXPECT_EQ(0x391u, Upper(*utf8, 0x3B1));  // Greek alpha
    EXPECT_EQ(0xDFu, Upper(*utf8, 0xDF));    // sharp s has no one-letter capital
    EXPECT_EQ(0x4E2Du, Upper(*utf8, 0x4E2D));
    EXPECT_EQ('A', utf8->ToUpper('a'));
    EXPECT_EQ('\xE9', utf8->ToUpper('\xE9')) << "a lone byte of UTF-8 is not a letter";
}

TEST(CharacterAttributesTest, RejectedLocaleNameThrowsInvalidArgument2WithTheReason) {
    try {
        CharacterAttributes attributes("xx_NOWHERE.UTF-8");
        ADD_FAILURE() << "no throw";
    } catch (const InvalidArgument2& e) {
        const char prefix[] = "Invalid argument(s): ";
        EXPECT_EQ(0, std::strncmp(prefix, e.what(), sizeof(prefix) - 1)) << e.what();
        EXPECT_GT(std::strlen(e.what()), sizeof(prefix) - 1) << "the library's reason follows";
        EXPECT_EQ(static_cast<int32_t>(0x8ABC700F), e.GetCode());
        EXPECT_STREQ("qv/zil/osdep/CharacterAttributes.cpp", e.file);
        EXPECT_GT(e.line, 0);
    }
    EXPECT_THROW(CharacterAttributes(static_cast<const char*>(nullptr)), InvalidArgument);
}

}  // namespace
}  // namespace osdep
}  // namespace zil
}  // namespace qv
