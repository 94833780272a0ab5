// One discovered target as qv-discover prints it. Pure functions: safe from any thread.
#pragma once

#include <avahi-common/strlst.h>

#include <cstdint>
#include <string>

namespace qv::tools::discover {

// A resolved announcement.
struct Target {
    std::string name;
    std::string host;
    std::string address;
    std::uint16_t port = 0;
    std::string mac;             // "-" when the TXT record has no MAC
    std::string supportTolvane;  // "-" when absent
};

// The value of key in txt, or "-" when the key is absent ("" for a key without a value).
std::string TxtValue(AvahiStringList* txt, const char* key);

// "name<TAB>host<TAB>address<TAB>port<TAB>MAC=<mac><TAB>supportTolvane=<value>".
std::string FormatTarget(const Target& target);

}  // namespace qv::tools::discover
