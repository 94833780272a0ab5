#include "advertise/MdnsError.h"

#include <avahi-common/error.h>

namespace qv::variable::remoteconfig {

namespace {

constexpr int kLowest = AVAHI_ERR_INVALID_ARGUMENT;  // -51
constexpr int kEntries = 1 - kLowest;                // 0 .. -51

struct Table {
    int code[kEntries];
    constexpr Table() : code() {
        for (int i = 0; i < kEntries; ++i) {
            code[i] = kMdnsFailure;
        }
        Set(AVAHI_OK, kMdnsOk);
        Set(AVAHI_ERR_NO_MEMORY, kMdnsNoMemory);
        Set(AVAHI_ERR_INVALID_ARGUMENT, kMdnsInvalidArgument);
        Set(AVAHI_ERR_NO_DAEMON, kMdnsNoDaemon);
        Set(AVAHI_ERR_INVALID_KEY, kMdnsInvalidKey);
        Set(AVAHI_ERR_COLLISION, kMdnsCollision);
        Set(AVAHI_ERR_INVALID_FLAGS, kMdnsInvalidFlags);
        Set(AVAHI_ERR_ACCESS_DENIED, kMdnsAccessDenied);
        Set(AVAHI_ERR_NOT_SUPPORTED, kMdnsNotSupported);
        Set(AVAHI_ERR_NO_NETWORK, kMdnsNoNetwork);
        // AVAHI_ERR_NOT_PERMITTED stays a general failure, distinct from access denied.
    }
    constexpr void Set(int avahiError, int publisherCode) {
        code[avahiError - kLowest] = publisherCode;
    }
};

constexpr Table kTable;
static_assert(kEntries == 52, "one entry per Avahi error number from 0 to -51");

}  // namespace

int MdnsErrorFromAvahi(int avahiError) {
    if (avahiError > AVAHI_OK || avahiError < kLowest) {
        return kMdnsFailure;
    }
    return kTable.code[avahiError - kLowest];
}

}  // namespace qv::variable::remoteconfig
