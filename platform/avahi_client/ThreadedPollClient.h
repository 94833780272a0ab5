// The state behind libqvAvahiClient.so.14: the process's threaded poll, its client and the
// callback contexts of the client and of each entry group. See qvAvahiClient.h for the
// thread rules. Its own mutex guards the handles and the group table; it is never held
// while Avahi runs a callback or while the poll thread is joined. Results are 0 or negative
// Avahi error numbers; std::bad_alloc may escape (the C entry points turn it into
// AVAHI_ERR_NO_MEMORY).
#pragma once

#include <avahi-client/client.h>
#include <avahi-client/publish.h>
#include <avahi-common/thread-watch.h>

#include <atomic>
#include <map>
#include <memory>
#include <mutex>

namespace qv::platform::avahi {

class ThreadedPollClient {
public:
    // The process-wide instance, never destroyed.
    static ThreadedPollClient& Instance();

    ThreadedPollClient(const ThreadedPollClient&) = delete;
    ThreadedPollClient& operator=(const ThreadedPollClient&) = delete;

    int NewClient(AvahiClientCallback callback, void* userdata, AvahiClient** client);
    int FreeClient();
    int NewGroup(AvahiClient* client, AvahiEntryGroupCallback callback, void* userdata,
                 bool inPollThread, AvahiEntryGroup** group);
    int FreeGroup(AvahiEntryGroup* group, bool inPollThread);
    int Start();
    int Stop();
    int Lock(bool inPollThread);
    int Unlock(bool inPollThread);

private:
    // What a callback needs: the caller's callback and the slot that receives the handle
    // while the handle's constructor still runs.
    template <typename Callback, typename Handle>
    struct Context {
        Callback callback = nullptr;
        void* userdata = nullptr;
        Handle** slot = nullptr;
        std::atomic<bool> creating{false};
    };
    using ClientContext = Context<AvahiClientCallback, AvahiClient>;
    using GroupContext = Context<AvahiEntryGroupCallback, AvahiEntryGroup>;

    ThreadedPollClient() = default;

    static void OnClientState(AvahiClient* client, AvahiClientState state, void* context);
    static void OnGroupState(AvahiEntryGroup* group, AvahiEntryGroupState state, void* context);

    AvahiThreadedPoll* CurrentPoll();

    std::mutex m_mutex;
    AvahiThreadedPoll* m_pPoll = nullptr;
    AvahiClient* m_pClient = nullptr;
    bool m_bRunning = false;
    ClientContext m_clientContext;
    std::map<AvahiEntryGroup*, std::unique_ptr<GroupContext>> m_groups;
};

}  // namespace qv::platform::avahi
