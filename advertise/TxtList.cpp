#include "advertise/TxtList.h"

#include "advertise/MdnsError.h"
#include "platform/targetcfg/targetcfg.h"

#include <cstdio>
#include <cstring>

namespace qv::variable::remoteconfig {

void TxtListNew(AvahiStringList** list) {
    if (list != nullptr) {
        *list = avahi_string_list_new(static_cast<const char*>(nullptr),
                                      static_cast<const char*>(nullptr));
    }
}

int TxtListAddPair(AvahiStringList** list, const char* key, int valueLength,
                   const std::uint8_t* value) {
    if (list == nullptr || key == nullptr || valueLength < 0 ||
        (value == nullptr && valueLength > 0)) {
        return kMdnsInvalidArgument;
    }
    AvahiStringList* grown = avahi_string_list_add_pair_arbitrary(
        *list, key, value, static_cast<std::size_t>(valueLength));
    if (grown == nullptr) {
        // Avahi keeps the old list on failure; release it rather than lose it.
        avahi_string_list_free(*list);
        *list = nullptr;
        return kMdnsNoMemory;
    }
    *list = grown;
    return kMdnsOk;
}

int TxtListHasKey(AvahiStringList** list, const char* key) {
    if (list == nullptr || *list == nullptr || key == nullptr) {
        return 0;
    }
    return avahi_string_list_find(*list, key) != nullptr ? 1 : 0;
}

void TxtListFree(AvahiStringList** list) {
    if (list != nullptr) {
        avahi_string_list_free(*list);
        *list = nullptr;
    }
}

int FormatDefaultMac(char* buffer) {
    unsigned char mac[6] = {};
    if (buffer == nullptr || targetcfgGetDefaultMACAddress(mac, sizeof mac) != 0) {
        return kMdnsFailure;
    }
    std::snprintf(buffer, kMacTextSize, "%.02X:%.02X:%.02X:%.02X:%.02X:%.02X", mac[0], mac[1],
                  mac[2], mac[3], mac[4], mac[5]);
    return kMdnsOk;
}

int TxtAddDefaultMac(AvahiStringList** list) {
    if (list == nullptr || TxtListHasKey(list, "MAC") != 0) {
        return kMdnsOk;
    }
    char text[kMacTextSize];
    if (FormatDefaultMac(text) != kMdnsOk) {
        return kMdnsFailure;
    }
    return TxtListAddPair(list, "MAC", static_cast<int>(std::strlen(text)),
                          reinterpret_cast<const std::uint8_t*>(text));
}

}  // namespace qv::variable::remoteconfig
