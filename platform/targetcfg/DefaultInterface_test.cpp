#include "platform/targetcfg/DefaultInterface.h"

#include <gtest/gtest.h>
#include <net/if.h>

namespace qv::platform::targetcfg {
namespace {

const char kHeader[] =
    "Iface\tDestination\tGateway \tFlags\tRefCnt\tUse\tMetric\tMask\t\tMTU\tWindow\tIRTT\n";

LinkInterface Link(const std::string& name, unsigned int flags, MacAddress mac,
                   bool hasMac = true) {
    LinkInterface link;
    link.name = name;
    link.flags = flags;
    link.hasMac = hasMac;
    link.mac = mac;
    return link;
}

TEST(DefaultRouteInterface, PicksTheUpDefaultRouteWithTheLowestMetric) {
    // Subnet routes, a down default route and a worse metric all lose.
    std::string table = std::string(kHeader) +
                        "eth0\t000200C0\t00000000\t0001\t0\t0\t0\t00FFFFFF\t0\t0\t0\n"
                        "wlan0\t00000000\t010200C0\t0002\t0\t0\t0\t00000000\t0\t0\t0\n"
                        "eth1\t00000000\t010200C0\t0003\t0\t0\t600\t00000000\t0\t0\t0\n"
                        "eth2\t00000000\t010200C0\t0003\t0\t0\t100\t00000000\t0\t0\t0\n"
                        "eth3\t00000000\t010200C0\t0003\t0\t0\t100\t00000000\t0\t0\t0\n";
    EXPECT_EQ("eth2", DefaultRouteInterface(table));

    // A default route must have both destination and mask zero.
    std::string noDefault =
        std::string(kHeader) + "eth0\t00000000\t010200C0\t0003\t0\t0\t0\t000000FF\t0\t0\t0\n";
    EXPECT_EQ("", DefaultRouteInterface(noDefault));

    // The header line alone, nothing, or garbage give no interface.
    EXPECT_EQ("", DefaultRouteInterface(kHeader));
    EXPECT_EQ("", DefaultRouteInterface(""));
    EXPECT_EQ("", DefaultRouteInterface(std::string(kHeader) + "eth0 zz 0 0003 0 0 0 0\nshort\n"));
    // A default route on the first line is not taken for a header.
    EXPECT_EQ("", DefaultRouteInterface("eth0\t00000000\t0\t0003\t0\t0\t0\t00000000\n"));
}

TEST(ChooseDefaultMac, PrefersTheDefaultRouteThenTheFirstSuitableByName) {
    const MacAddress a{0x02, 0x1A, 0x2B, 0x3C, 0x4D, 0x5E};
    const MacAddress b{0x02, 0x00, 0x00, 0x00, 0x00, 0x0B};
    const MacAddress c{0x02, 0x00, 0x00, 0x00, 0x00, 0x0C};
    const MacAddress zero{};
    const unsigned int up = IFF_UP;
    std::vector<LinkInterface> links = {
        Link("lo", up | IFF_LOOPBACK, b),  // loopback never counts
        Link("eth1", up, b),
        Link("eth0", up, c),
        Link("wlan0", up, a),
    };

    MacAddress out{};
    ASSERT_TRUE(ChooseDefaultMac("wlan0", links, out));
    EXPECT_EQ(a, out);

    // No default route: the first by name, not the first listed.
    ASSERT_TRUE(ChooseDefaultMac("", links, out));
    EXPECT_EQ(c, out);

    // A default route over an interface without a six-byte address (a tunnel) falls back.
    links.push_back(Link("tun0", up, zero, false));
    ASSERT_TRUE(ChooseDefaultMac("tun0", links, out));
    EXPECT_EQ(c, out);

    // Down, loopback, zero-address and address-less interfaces are skipped in the fallback.
    std::vector<LinkInterface> unsuitable = {
        Link("a0", 0, a),     Link("b0", up | IFF_LOOPBACK, a),
        Link("c0", up, zero), Link("d0", up, a, false),
        Link("e0", up, b),
    };
    ASSERT_TRUE(ChooseDefaultMac("", unsuitable, out));
    EXPECT_EQ(b, out);

    unsuitable.pop_back();
    MacAddress untouched = a;
    EXPECT_FALSE(ChooseDefaultMac("", unsuitable, untouched));
    EXPECT_EQ(a, untouched);
    EXPECT_FALSE(ChooseDefaultMac("eth0", {}, untouched));
}

}  // namespace
}  // namespace qv::platform::targetcfg
