// The mDNS publisher: one DNS-SD service announced through the platform's Avahi wrapper
// (libqvAvahiClient.so.14), renamed with Avahi's alternative name on every collision and
// withdrawn by MdnsServiceStop.
//
// Threads: MdnsServiceStart and MdnsServiceStop run on one controlling thread; the two
// callbacks run on the wrapper's poll thread with the poll lock held. Entry-group calls off
// the poll thread are bracketed by the poll lock. The wrapper has one client per process, so
// one service is announced at a time.
//
// Failure: results are 0 or a negative publisher code (MdnsError.h); a failed start leaves
// nothing behind and the caller's pointer null.
#pragma once

#include <avahi-client/client.h>
#include <avahi-client/publish.h>
#include <avahi-common/strlst.h>

#include <atomic>
#include <cstdint>

namespace qv::variable::remoteconfig {

// The record of one announced service, owned by the publisher.
struct MdnsService {
    AvahiEntryGroup* group = nullptr;  // null until the first registration; cleared by the stop
    AvahiClient* client = nullptr;
    char* name = nullptr;  // avahi_strdup'ed; replaced by the alternative name on collisions
    char* type = nullptr;
    char* domain = nullptr;
    std::uint16_t port = 0;
    AvahiStringList* txt = nullptr;  // owned copy; may be null
    std::atomic<int> stopping{0};    // set first by the stop; callbacks then do nothing
};

// Adds the default MAC to *txt (TxtAddDefaultMac; its failure is returned at once), then
// makes the client, registers the service and starts the poll thread. On success *service
// holds the new record and the result is 0; otherwise *service is null. A null name, type,
// domain or service gives kMdnsInvalidArgument.
int MdnsServiceStart(const char* name, const char* type, const char* domain, std::uint16_t port,
                     AvahiStringList** txt, MdnsService** service);

// Withdraws the service, stops the poll thread and releases the record. Null is ignored.
void MdnsServiceStop(MdnsService* service);

// The registration loop: makes the group if there is none, returns 0 at once if the group
// already holds entries, else adds the service and commits, taking the alternative name and
// trying again after each collision. inPollThread is 1 when called from a callback. Returns
// 0 or a publisher code (every Avahi error is mapped here, exactly once).
int MdnsServiceRegister(MdnsService* service, int inPollThread);

// The client and entry-group callbacks, given the record as user data.
void MdnsClientCallback(AvahiClient* client, AvahiClientState state, void* userdata);
void MdnsGroupCallback(AvahiEntryGroup* group, AvahiEntryGroupState state, void* userdata);

}  // namespace qv::variable::remoteconfig
