// The target-configuration library (libqvtargetcfg.so.1): facts about the target that
// other components announce or report. Safe to call from several threads at once.
#pragma once

#ifdef __cplusplus
extern "C" {
#endif

// Copies the six bytes of the default MAC address, first byte first, into buffer.
// The default interface is the one that carries the IPv4 default route (the route with
// the lowest metric when there are several); when it has no six-byte address, or there
// is no default route, it is the first interface by name that is up, is not loopback
// and has a non-zero six-byte address. Returns 0 on success. Returns non-zero and
// leaves buffer untouched when buffer is null, length is not 6, or no interface fits.
int targetcfgGetDefaultMACAddress(unsigned char* buffer, unsigned int length);

#ifdef __cplusplus
}
#endif
