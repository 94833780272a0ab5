// The choice of the default interface, kept apart from the system calls so that it can be
// tested on made-up route tables and interface lists. Pure functions: safe from any thread.
#pragma once

#include <array>
#include <cstdint>
#include <string>
#include <vector>

namespace qv::platform::targetcfg {

using MacAddress = std::array<std::uint8_t, 6>;

// One link-layer interface as the kernel lists it.
struct LinkInterface {
    std::string name;
    unsigned int flags = 0;  // IFF_* flags
    bool hasMac = false;     // the link-layer address is exactly six bytes long
    MacAddress mac{};
};

// The interface of the IPv4 default route in the text of /proc/net/route: an up route
// with destination and mask 0, the lowest metric winning, the earlier line on a tie.
// Returns an empty string when there is none or the text is not a route table.
std::string DefaultRouteInterface(const std::string& routeTable);

// Picks the default MAC address from the interfaces: that of defaultName when it has a
// six-byte address, else that of the first interface by name that is up, not loopback and
// has a non-zero six-byte address. Returns false (out untouched) when none fits.
bool ChooseDefaultMac(const std::string& defaultName, const std::vector<LinkInterface>& links,
                      MacAddress& out);

}  // namespace qv::platform::targetcfg
