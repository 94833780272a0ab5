// The C entry points of libqvAvahiClient.so.14; no exception crosses them.
#include "platform/avahi_client/qvAvahiClient.h"

#include "platform/avahi_client/ThreadedPollClient.h"

#include <avahi-common/error.h>

#include <new>

#define QV_AVAHI_EXPORT extern "C" __attribute__((visibility("default")))

namespace {

using qv::platform::avahi::ThreadedPollClient;

template <typename Call>
int Guarded(Call call) {
    try {
        return call(ThreadedPollClient::Instance());
    } catch (const std::bad_alloc&) {
        return AVAHI_ERR_NO_MEMORY;
    } catch (...) {
        return AVAHI_ERR_FAILURE;
    }
}

}  // namespace

QV_AVAHI_EXPORT int AvahiClientNew(AvahiClientCallback callback, void* userdata,
                                   AvahiClient** client) {
    return Guarded([&](ThreadedPollClient& w) { return w.NewClient(callback, userdata, client); });
}

QV_AVAHI_EXPORT int AvahiClientFree(void) {
    return Guarded([](ThreadedPollClient& w) { return w.FreeClient(); });
}

QV_AVAHI_EXPORT int AvahiEntryGroupNew(AvahiClient* client, AvahiEntryGroupCallback callback,
                                       void* userdata, int inPollThread, AvahiEntryGroup** group) {
    return Guarded([&](ThreadedPollClient& w) {
        return w.NewGroup(client, callback, userdata, inPollThread != 0, group);
    });
}

QV_AVAHI_EXPORT int AvahiEntryGroupFree(AvahiEntryGroup* group, int inPollThread) {
    return Guarded([&](ThreadedPollClient& w) { return w.FreeGroup(group, inPollThread != 0); });
}

QV_AVAHI_EXPORT int AvahiThreadedPollStart(void) {
    return Guarded([](ThreadedPollClient& w) { return w.Start(); });
}

QV_AVAHI_EXPORT int AvahiThreadedPollStop(void) {
    return Guarded([](ThreadedPollClient& w) { return w.Stop(); });
}

QV_AVAHI_EXPORT int AvahiThreadedPollLock(int inPollThread) {
    return Guarded([&](ThreadedPollClient& w) { return w.Lock(inPollThread != 0); });
}

QV_AVAHI_EXPORT int AvahiThreadedPollUnlock(int inPollThread) {
    return Guarded([&](ThreadedPollClient& w) { return w.Unlock(inPollThread != 0); });
}
