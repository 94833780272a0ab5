#include "platform/targetcfg/targetcfg.h"

#include <gtest/gtest.h>

#include <array>

namespace {

TEST(TargetCfg, RefusesBadArgumentsAndAnswersConsistently) {
    std::array<unsigned char, 8> buffer;
    buffer.fill(0xEE);
    EXPECT_NE(0, targetcfgGetDefaultMACAddress(nullptr, 6));
    EXPECT_NE(0, targetcfgGetDefaultMACAddress(buffer.data(), 5));
    EXPECT_NE(0, targetcfgGetDefaultMACAddress(buffer.data(), 7));
    EXPECT_NE(0, targetcfgGetDefaultMACAddress(buffer.data(), 0));
    for (unsigned char byte : buffer) {
        EXPECT_EQ(0xEE, byte);
    }

    // The build machine may or may not have a suitable interface (the end-to-end test sets
    // a known one); either way two calls agree and a success writes exactly six bytes.
    std::array<unsigned char, 8> first, second;
    first.fill(0xEE);
    second.fill(0xEE);
    int r1 = targetcfgGetDefaultMACAddress(first.data(), 6);
    int r2 = targetcfgGetDefaultMACAddress(second.data(), 6);
    EXPECT_EQ(r1 == 0, r2 == 0);
    EXPECT_EQ(0xEE, first[6]);
    EXPECT_EQ(0xEE, first[7]);
    if (r1 == 0 && r2 == 0) {
        EXPECT_EQ(first, second);
    }
}

}  // namespace
