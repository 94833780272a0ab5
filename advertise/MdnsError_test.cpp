#include "advertise/MdnsError.h"

#include <avahi-common/error.h>
#include <gtest/gtest.h>

#include <climits>
#include <initializer_list>
#include <map>

namespace qv::variable::remoteconfig {
namespace {

TEST(MdnsErrorFromAvahi, MapsEveryNumberFromZeroToMinus51AndNothingElse) {
    const std::map<int, int> named = {
        {AVAHI_OK, 0},
        {AVAHI_ERR_NO_MEMORY, -5},
        {AVAHI_ERR_INVALID_ARGUMENT, -6},
        {AVAHI_ERR_NO_DAEMON, -8},
        {AVAHI_ERR_INVALID_KEY, -9},
        {AVAHI_ERR_COLLISION, -11},
        {AVAHI_ERR_INVALID_FLAGS, -12},
        {AVAHI_ERR_ACCESS_DENIED, -13},
        {AVAHI_ERR_NOT_SUPPORTED, -14},
        {AVAHI_ERR_NO_NETWORK, -15},
    };
    for (int avahi = 0; avahi >= -51; --avahi) {
        auto it = named.find(avahi);
        int expected = it == named.end() ? -3 : it->second;
        EXPECT_EQ(expected, MdnsErrorFromAvahi(avahi)) << "Avahi error " << avahi;
    }
    // Not permitted is not access denied.
    EXPECT_EQ(-3, MdnsErrorFromAvahi(AVAHI_ERR_NOT_PERMITTED));
    // Outside the table, including Avahi's newer numbers.
    const int outsideNumbers[] = {
        1, 100, AVAHI_ERR_IS_EMPTY, AVAHI_ERR_NO_CHANGE, AVAHI_ERR_MAX, INT_MIN, INT_MAX};
    for (int outside : outsideNumbers) {
        EXPECT_EQ(-3, MdnsErrorFromAvahi(outside)) << outside;
    }
}

}  // namespace
}  // namespace qv::variable::remoteconfig
