#include "platform/targetcfg/DefaultInterface.h"

#include <net/if.h>
#include <net/route.h>

#include <algorithm>
#include <climits>
#include <sstream>

namespace qv::platform::targetcfg {

namespace {

bool ParseHex(const std::string& text, unsigned long& value) {
    if (text.empty() || text.size() > 8) {
        return false;
    }
    value = 0;
    for (char c : text) {
        int digit;
        if (c >= '0' && c <= '9') {
            digit = c - '0';
        } else if (c >= 'A' && c <= 'F') {
            digit = c - 'A' + 10;
        } else if (c >= 'a' && c <= 'f') {
            digit = c - 'a' + 10;
        } else {
            return false;
        }
        value = value * 16 + static_cast<unsigned long>(digit);
    }
    return true;
}

bool IsZero(const MacAddress& mac) {
    return std::all_of(mac.begin(), mac.end(), [](std::uint8_t b) { return b == 0; });
}

}  // namespace

std::string DefaultRouteInterface(const std::string& routeTable) {
    std::istringstream in(routeTable);
    std::string line;
    std::string best;
    unsigned long bestMetric = ULONG_MAX;
    bool found = false;
    bool header = true;
    while (std::getline(in, line)) {
        if (header) {  // "Iface Destination Gateway Flags RefCnt Use Metric Mask ..."
            header = false;
            continue;
        }
        std::istringstream fields(line);
        std::string iface, destination, gateway, flags, refCnt, use, metric, mask;
        if (!(fields >> iface >> destination >> gateway >> flags >> refCnt >> use >> metric >>
              mask)) {
            continue;
        }
        unsigned long dest = 0, msk = 0, flg = 0, met = 0;
        if (!ParseHex(destination, dest) || !ParseHex(mask, msk) || !ParseHex(flags, flg)) {
            continue;
        }
        std::istringstream metricText(metric);
        if (!(metricText >> met)) {
            continue;
        }
        if (dest != 0 || msk != 0 || (flg & RTF_UP) == 0) {
            continue;
        }
        if (!found || met < bestMetric) {
            best = iface;
            bestMetric = met;
            found = true;
        }
    }
    return best;
}

bool ChooseDefaultMac(const std::string& defaultName, const std::vector<LinkInterface>& links,
                      MacAddress& out) {
    if (!defaultName.empty()) {
        for (const LinkInterface& link : links) {
            if (link.name == defaultName && link.hasMac) {
                out = link.mac;
                return true;
            }
        }
    }
    const LinkInterface* first = nullptr;
    for (const LinkInterface& link : links) {
        if (!link.hasMac || IsZero(link.mac) || (link.flags & IFF_UP) == 0 ||
            (link.flags & IFF_LOOPBACK) != 0) {
            continue;
        }
        if (first == nullptr || link.name < first->name) {
            first = &link;
        }
    }
    if (first == nullptr) {
        return false;
    }
    out = first->mac;
    return true;
}

}  // namespace qv::platform::targetcfg
