#include "advertise/MdnsService.h"

#include "advertise/MdnsError.h"
#include "advertise/TxtList.h"
#include "platform/avahi_client/qvAvahiClient.h"

#include <avahi-common/alternative.h>
#include <avahi-common/error.h>
#include <avahi-common/malloc.h>

#include <new>

namespace qv::variable::remoteconfig {

namespace {

// Replaces the record's name by Avahi's alternative; false (name kept) when out of memory.
bool TakeAlternativeName(MdnsService* service) {
    char* alternative = avahi_alternative_service_name(service->name);
    if (alternative == nullptr) {
        return false;
    }
    avahi_free(service->name);
    service->name = alternative;
    return true;
}

// One Avahi call under the poll lock, unlocked on the way out.
template <typename Call>
int Locked(int inPollThread, Call call) {
    AvahiThreadedPollLock(inPollThread);
    int result = call();
    AvahiThreadedPollUnlock(inPollThread);
    return result;
}

void ReleaseRecord(MdnsService* service) {
    avahi_free(service->name);
    avahi_free(service->type);
    avahi_free(service->domain);
    avahi_string_list_free(service->txt);
    delete service;
}

}  // namespace

int MdnsServiceRegister(MdnsService* service, int inPollThread) {
    for (;;) {
        if (service->group == nullptr) {
            int made = AvahiEntryGroupNew(service->client, &MdnsGroupCallback, service,
                                          inPollThread, &service->group);
            if (made != AVAHI_OK) {
                return MdnsErrorFromAvahi(made);
            }
        }
        int empty =
            Locked(inPollThread, [&] { return avahi_entry_group_is_empty(service->group); });
        if (empty == 0) {
            return kMdnsOk;  // already announced
        }
        int added = Locked(inPollThread, [&] {
            return avahi_entry_group_add_service_strlst(
                service->group, AVAHI_IF_UNSPEC, AVAHI_PROTO_UNSPEC, AvahiPublishFlags(0),
                service->name, service->type, service->domain, nullptr, service->port,
                service->txt);
        });
        if (added == AVAHI_OK) {
            int committed =
                Locked(inPollThread, [&] { return avahi_entry_group_commit(service->group); });
            return MdnsErrorFromAvahi(committed);
        }
        if (added != AVAHI_ERR_COLLISION) {
            return MdnsErrorFromAvahi(added);
        }
        if (!TakeAlternativeName(service)) {
            return kMdnsNoMemory;
        }
        Locked(inPollThread, [&] { return avahi_entry_group_reset(service->group); });
    }
}

void MdnsClientCallback(AvahiClient* client, AvahiClientState state, void* userdata) {
    auto* service = static_cast<MdnsService*>(userdata);
    if (service == nullptr || service->stopping.load() != 0) {
        return;
    }
    switch (state) {
        case AVAHI_CLIENT_S_REGISTERING:
        case AVAHI_CLIENT_S_COLLISION:
            // The daemon's host name is changing: withdraw until it runs again.
            if (service->group != nullptr) {
                avahi_entry_group_reset(service->group);
            }
            break;
        case AVAHI_CLIENT_S_RUNNING:
            // Back to running: announce again what the reset withdrew (nothing happens when
            // the group still holds the service, or before the first registration).
            if (service->group != nullptr) {
                MdnsServiceRegister(service, 1);
            }
            break;
        case AVAHI_CLIENT_FAILURE:
            (void)avahi_client_errno(client);  // the daemon is gone; nothing to do until restart
            break;
        default:
            break;
    }
}

void MdnsGroupCallback(AvahiEntryGroup*, AvahiEntryGroupState state, void* userdata) {
    auto* service = static_cast<MdnsService*>(userdata);
    if (service == nullptr || service->stopping.load() != 0) {
        return;
    }
    if (state == AVAHI_ENTRY_GROUP_COLLISION) {
        // Another host took the name after it was established: rename and register again.
        if (TakeAlternativeName(service)) {
            MdnsServiceRegister(service, 1);
        }
    }
    // AVAHI_ENTRY_GROUP_FAILURE and the other states need nothing.
}

void MdnsServiceStop(MdnsService* service) {
    if (service == nullptr) {
        return;
    }
    service->stopping.store(1);
    AvahiThreadedPollLock(0);
    AvahiEntryGroup* group = service->group;
    service->group = nullptr;
    AvahiThreadedPollUnlock(0);
    if (group != nullptr) {
        AvahiEntryGroupFree(group, 0);
    }
    AvahiThreadedPollStop();
    AvahiClientFree();
    ReleaseRecord(service);
}

int MdnsServiceStart(const char* name, const char* type, const char* domain, std::uint16_t port,
                     AvahiStringList** txt, MdnsService** service) {
    if (service == nullptr || name == nullptr || type == nullptr || domain == nullptr) {
        return kMdnsInvalidArgument;
    }
    *service = nullptr;
    int mac = TxtAddDefaultMac(txt);
    if (mac != kMdnsOk) {
        return mac;
    }

    auto* record = new (std::nothrow) MdnsService();
    if (record == nullptr) {
        return kMdnsNoMemory;
    }
    record->name = avahi_strdup(name);
    record->type = avahi_strdup(type);
    record->domain = avahi_strdup(domain);
    record->port = port;
    if (txt != nullptr && *txt != nullptr) {
        record->txt = avahi_string_list_copy(*txt);
    }
    if (record->name == nullptr || record->type == nullptr || record->domain == nullptr ||
        (txt != nullptr && *txt != nullptr && record->txt == nullptr)) {
        ReleaseRecord(record);
        return kMdnsNoMemory;
    }

    int made = AvahiClientNew(&MdnsClientCallback, record, &record->client);
    if (made != AVAHI_OK) {
        ReleaseRecord(record);
        return MdnsErrorFromAvahi(made);
    }
    // Registered on this thread before the poll thread starts.
    int registered = MdnsServiceRegister(record, 0);
    if (registered != kMdnsOk) {
        MdnsServiceStop(record);
        return registered;
    }
    int started = AvahiThreadedPollStart();
    if (started != AVAHI_OK) {
        MdnsServiceStop(record);
        return MdnsErrorFromAvahi(started);
    }
    *service = record;
    return kMdnsOk;
}

}  // namespace qv::variable::remoteconfig
