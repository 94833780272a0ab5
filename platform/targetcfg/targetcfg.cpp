// The exported entry of libqvtargetcfg.so.1: reads the route table and the link-layer
// interface list of the running system and hands them to the choice in DefaultInterface.
#include "platform/targetcfg/targetcfg.h"

#include "platform/targetcfg/DefaultInterface.h"

#include <ifaddrs.h>
#include <linux/if_packet.h>
#include <sys/socket.h>

#include <cstring>
#include <fstream>
#include <iterator>

namespace qv::platform::targetcfg {
namespace {

std::string ReadRouteTable() {
    std::ifstream file("/proc/net/route");
    return std::string(std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>());
}

// The AF_PACKET entries of getifaddrs; an empty list when it fails.
std::vector<LinkInterface> ListLinks() {
    std::vector<LinkInterface> links;
    ifaddrs* list = nullptr;
    if (getifaddrs(&list) != 0) {
        return links;
    }
    for (const ifaddrs* entry = list; entry != nullptr; entry = entry->ifa_next) {
        if (entry->ifa_addr == nullptr || entry->ifa_addr->sa_family != AF_PACKET ||
            entry->ifa_name == nullptr) {
            continue;
        }
        sockaddr_ll link;
        std::memcpy(&link, entry->ifa_addr, sizeof link);
        LinkInterface item;
        item.name = entry->ifa_name;
        item.flags = entry->ifa_flags;
        item.hasMac = link.sll_halen == item.mac.size();
        if (item.hasMac) {
            std::memcpy(item.mac.data(), link.sll_addr, item.mac.size());
        }
        links.push_back(item);
    }
    freeifaddrs(list);
    return links;
}

}  // namespace
}  // namespace qv::platform::targetcfg

extern "C" __attribute__((visibility("default"))) int targetcfgGetDefaultMACAddress(
    unsigned char* buffer, unsigned int length) {
    using namespace qv::platform::targetcfg;
    if (buffer == nullptr || length != 6) {
        return -1;
    }
    try {
        MacAddress mac;
        if (!ChooseDefaultMac(DefaultRouteInterface(ReadRouteTable()), ListLinks(), mac)) {
            return -1;
        }
        std::memcpy(buffer, mac.data(), mac.size());
        return 0;
    } catch (...) {  // nothing may cross the C boundary; memory exhaustion is a failure
        return -1;
    }
}
