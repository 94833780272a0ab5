// Helpers over Avahi string lists for the TXT record, and the default MAC address as text.
// Each call works on the caller's list only: safe from several threads on different lists.
// Results are 0 or a negative publisher code (MdnsError.h) unless said otherwise.
#pragma once

#include <avahi-common/strlst.h>

#include <cstddef>
#include <cstdint>

namespace qv::variable::remoteconfig {

// "XX:XX:XX:XX:XX:XX" and its terminating NUL.
constexpr std::size_t kMacTextSize = 18;

// Sets *list to Avahi's empty list (a null list).
void TxtListNew(AvahiStringList** list);

// Adds key=value (valueLength bytes, not NUL-terminated) at the head of *list. When the list
// cannot grow the pairs already in it are released, *list becomes empty and the result is
// kMdnsNoMemory; a null list address, a null key or a negative length give
// kMdnsInvalidArgument and change nothing.
int TxtListAddPair(AvahiStringList** list, const char* key, int valueLength,
                   const std::uint8_t* value);

// 1 when *list holds key, else 0 (also for a null address).
int TxtListHasKey(AvahiStringList** list, const char* key);

// Releases *list and sets it to null. A null address is ignored.
void TxtListFree(AvahiStringList** list);

// Writes the default MAC address from the target-configuration library into buffer (at
// least kMacTextSize bytes) as upper-case "XX:XX:XX:XX:XX:XX". kMdnsFailure, buffer
// untouched, when the address cannot be read.
int FormatDefaultMac(char* buffer);

// Adds "MAC"=<default MAC> unless *list already has a "MAC" key or list is null (both 0).
// kMdnsFailure with the list unchanged when the MAC cannot be read.
int TxtAddDefaultMac(AvahiStringList** list);

}  // namespace qv::variable::remoteconfig
