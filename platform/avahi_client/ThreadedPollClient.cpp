#include "platform/avahi_client/ThreadedPollClient.h"

#include <avahi-common/error.h>

namespace qv::platform::avahi {

ThreadedPollClient& ThreadedPollClient::Instance() {
    static ThreadedPollClient* instance = new ThreadedPollClient;
    return *instance;
}

void ThreadedPollClient::OnClientState(AvahiClient* client, AvahiClientState state, void* context) {
    auto* ctx = static_cast<ClientContext*>(context);
    // avahi_client_new reports its first state before it returns: hand over the handle now.
    if (ctx->creating.load() && *ctx->slot == nullptr) {
        *ctx->slot = client;
    }
    if (ctx->callback != nullptr) {
        ctx->callback(client, state, ctx->userdata);
    }
}

void ThreadedPollClient::OnGroupState(AvahiEntryGroup* group, AvahiEntryGroupState state,
                                      void* context) {
    auto* ctx = static_cast<GroupContext*>(context);
    if (ctx->creating.load() && *ctx->slot == nullptr) {
        *ctx->slot = group;
    }
    if (ctx->callback != nullptr) {
        ctx->callback(group, state, ctx->userdata);
    }
}

AvahiThreadedPoll* ThreadedPollClient::CurrentPoll() {
    std::lock_guard<std::mutex> lock(m_mutex);
    return m_pPoll;
}

int ThreadedPollClient::NewClient(AvahiClientCallback callback, void* userdata,
                                  AvahiClient** client) {
    if (client == nullptr) {
        return AVAHI_ERR_INVALID_ARGUMENT;
    }
    AvahiThreadedPoll* poll = nullptr;
    {
        std::lock_guard<std::mutex> lock(m_mutex);
        if (m_pClient != nullptr || m_pPoll != nullptr) {
            return AVAHI_ERR_BAD_STATE;  // one client per process
        }
        poll = avahi_threaded_poll_new();
        if (poll == nullptr) {
            return AVAHI_ERR_NO_MEMORY;
        }
        m_pPoll = poll;
        m_clientContext.callback = callback;
        m_clientContext.userdata = userdata;
        m_clientContext.slot = client;
        m_clientContext.creating = true;
    }
    // The poll thread is not running yet, so nothing else touches the poll here.
    *client = nullptr;
    int error = AVAHI_OK;
    AvahiClient* made =
        avahi_client_new(avahi_threaded_poll_get(poll), AvahiClientFlags(0),
                         &ThreadedPollClient::OnClientState, &m_clientContext, &error);
    std::lock_guard<std::mutex> lock(m_mutex);
    m_clientContext.creating = false;
    if (made == nullptr) {
        avahi_threaded_poll_free(poll);
        m_pPoll = nullptr;
        *client = nullptr;
        return error < 0 ? error : AVAHI_ERR_FAILURE;
    }
    m_pClient = made;
    *client = made;
    return AVAHI_OK;
}

int ThreadedPollClient::FreeClient() {
    AvahiThreadedPoll* poll = nullptr;
    AvahiClient* client = nullptr;
    bool running = false;
    {
        std::lock_guard<std::mutex> lock(m_mutex);
        if (m_pClient == nullptr) {
            return AVAHI_ERR_BAD_STATE;
        }
        poll = m_pPoll;
        client = m_pClient;
        running = m_bRunning;
    }
    if (running) {
        avahi_threaded_poll_stop(poll);
    }
    avahi_client_free(client);  // also frees the groups still open
    std::map<AvahiEntryGroup*, std::unique_ptr<GroupContext>> groups;
    {
        std::lock_guard<std::mutex> lock(m_mutex);
        m_pClient = nullptr;
        m_pPoll = nullptr;
        m_bRunning = false;
        groups.swap(m_groups);
    }
    avahi_threaded_poll_free(poll);
    return AVAHI_OK;
}

int ThreadedPollClient::NewGroup(AvahiClient* client, AvahiEntryGroupCallback callback,
                                 void* userdata, bool inPollThread, AvahiEntryGroup** group) {
    if (client == nullptr || group == nullptr) {
        return AVAHI_ERR_INVALID_ARGUMENT;
    }
    auto context = std::make_unique<GroupContext>();
    context->callback = callback;
    context->userdata = userdata;
    context->slot = group;
    context->creating = true;

    int rc = Lock(inPollThread);
    if (rc != AVAHI_OK) {
        return rc;
    }
    AvahiEntryGroup* made =
        avahi_entry_group_new(client, &ThreadedPollClient::OnGroupState, context.get());
    int error = made == nullptr ? avahi_client_errno(client) : AVAHI_OK;
    context->creating = false;
    if (made != nullptr) {
        *group = made;
    }
    Unlock(inPollThread);
    if (made == nullptr) {
        return error < 0 ? error : AVAHI_ERR_FAILURE;
    }
    try {
        std::lock_guard<std::mutex> lock(m_mutex);
        m_groups.emplace(made, std::move(context));
    } catch (...) {
        Lock(inPollThread);
        avahi_entry_group_free(made);
        Unlock(inPollThread);
        *group = nullptr;
        return AVAHI_ERR_NO_MEMORY;
    }
    return AVAHI_OK;
}

int ThreadedPollClient::FreeGroup(AvahiEntryGroup* group, bool inPollThread) {
    if (group == nullptr) {
        return AVAHI_ERR_INVALID_ARGUMENT;
    }
    std::unique_ptr<GroupContext> context;
    {
        std::lock_guard<std::mutex> lock(m_mutex);
        auto it = m_groups.find(group);
        if (it == m_groups.end()) {
            return AVAHI_ERR_INVALID_OBJECT;
        }
        context = std::move(it->second);
        m_groups.erase(it);
    }
    int rc = Lock(inPollThread);
    if (rc != AVAHI_OK) {
        return rc;
    }
    avahi_entry_group_free(group);
    Unlock(inPollThread);
    return AVAHI_OK;  // the context goes only now that no callback can use it
}

int ThreadedPollClient::Start() {
    std::lock_guard<std::mutex> lock(m_mutex);
    if (m_pPoll == nullptr || m_pClient == nullptr || m_bRunning) {
        return AVAHI_ERR_BAD_STATE;
    }
    if (avahi_threaded_poll_start(m_pPoll) < 0) {
        return AVAHI_ERR_OS;
    }
    m_bRunning = true;
    return AVAHI_OK;
}

int ThreadedPollClient::Stop() {
    AvahiThreadedPoll* poll = nullptr;
    {
        std::lock_guard<std::mutex> lock(m_mutex);
        if (m_pPoll == nullptr || !m_bRunning) {
            return AVAHI_ERR_BAD_STATE;
        }
        poll = m_pPoll;
    }
    // Joined without our mutex: a callback still running may call into us.
    avahi_threaded_poll_stop(poll);
    std::lock_guard<std::mutex> lock(m_mutex);
    m_bRunning = false;
    return AVAHI_OK;
}

int ThreadedPollClient::Lock(bool inPollThread) {
    if (inPollThread) {
        return AVAHI_OK;  // the poll thread holds the lock around every callback
    }
    AvahiThreadedPoll* poll = CurrentPoll();
    if (poll == nullptr) {
        return AVAHI_ERR_BAD_STATE;
    }
    avahi_threaded_poll_lock(poll);
    return AVAHI_OK;
}

int ThreadedPollClient::Unlock(bool inPollThread) {
    if (inPollThread) {
        return AVAHI_OK;
    }
    AvahiThreadedPoll* poll = CurrentPoll();
    if (poll == nullptr) {
        return AVAHI_ERR_BAD_STATE;
    }
    avahi_threaded_poll_unlock(poll);
    return AVAHI_OK;
}

}  // namespace qv::platform::avahi
