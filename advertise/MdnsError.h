// The publisher's error codes and their mapping from Avahi error numbers. Pure: safe from
// any thread.
#pragma once

namespace qv::variable::remoteconfig {

// Results of the publisher; 0 is success.
enum MdnsError : int {
    kMdnsOk = 0,
    kMdnsFailure = -3,          // any other Avahi error, or an unreadable MAC address
    kMdnsNoMemory = -5,         // allocation, TXT list growth, AVAHI_ERR_NO_MEMORY
    kMdnsInvalidArgument = -6,  // AVAHI_ERR_INVALID_ARGUMENT
    kMdnsNoDaemon = -8,         // AVAHI_ERR_NO_DAEMON
    kMdnsInvalidKey = -9,       // AVAHI_ERR_INVALID_KEY
    kMdnsCollision = -11,       // AVAHI_ERR_COLLISION
    kMdnsInvalidFlags = -12,    // AVAHI_ERR_INVALID_FLAGS
    kMdnsAccessDenied = -13,    // AVAHI_ERR_ACCESS_DENIED
    kMdnsNotSupported = -14,    // AVAHI_ERR_NOT_SUPPORTED
    kMdnsNoNetwork = -15,       // AVAHI_ERR_NO_NETWORK
};

// Maps an Avahi error number (0 down to -51) to a publisher code through a 52-entry table;
// numbers outside that range give kMdnsFailure.
int MdnsErrorFromAvahi(int avahiError);

}  // namespace qv::variable::remoteconfig
