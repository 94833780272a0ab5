#include "tools/discover/Discoverer.h"

#include <avahi-common/error.h>
#include <avahi-common/timeval.h>

#include <sys/time.h>

namespace qv::tools::discover {

Discoverer::~Discoverer() {
    // Freeing the client frees its browser and resolvers.
    if (m_pClient != nullptr) {
        avahi_client_free(m_pClient);
    }
    if (m_pPoll != nullptr) {
        avahi_simple_poll_free(m_pPoll);
    }
}

void Discoverer::Fail(const std::string& why) {
    if (!m_bFailed) {
        m_bFailed = true;
        m_error = why;
    }
    avahi_simple_poll_quit(m_pPoll);
}

void Discoverer::QuitWhenDone() {
    if (m_bAllForNow && m_nPending == 0) {
        avahi_simple_poll_quit(m_pPoll);
    }
}

bool Discoverer::Run(const char* type, const char* domain, unsigned int timeoutMs) {
    m_pPoll = avahi_simple_poll_new();
    if (m_pPoll == nullptr) {
        m_error = "out of memory";
        return false;
    }
    int error = 0;
    m_pClient = avahi_client_new(avahi_simple_poll_get(m_pPoll), AvahiClientFlags(0), nullptr,
                                 nullptr, &error);
    if (m_pClient == nullptr) {
        m_error = std::string("cannot reach the Avahi daemon: ") + avahi_strerror(error);
        return false;
    }
    m_pBrowser =
        avahi_service_browser_new(m_pClient, AVAHI_IF_UNSPEC, AVAHI_PROTO_UNSPEC, type, domain,
                                  AvahiLookupFlags(0), &Discoverer::OnBrowse, this);
    if (m_pBrowser == nullptr) {
        m_error = std::string("cannot browse: ") + avahi_strerror(avahi_client_errno(m_pClient));
        return false;
    }
    struct timeval deadline;
    avahi_elapse_time(&deadline, timeoutMs, 0);
    const AvahiPoll* api = avahi_simple_poll_get(m_pPoll);
    AvahiTimeout* timeout = api->timeout_new(api, &deadline, &Discoverer::OnTimeout, this);
    if (timeout == nullptr) {
        m_error = "out of memory";
        return false;
    }
    int rc = avahi_simple_poll_loop(m_pPoll);
    api->timeout_free(timeout);
    if (rc < 0 && !m_bFailed) {
        m_error = "the event loop failed";
        return false;
    }
    return !m_bFailed;
}

void Discoverer::OnTimeout(AvahiTimeout*, void* self) {
    static_cast<Discoverer*>(self)->Fail("timed out before the browse was complete");
}

void Discoverer::OnBrowse(AvahiServiceBrowser*, AvahiIfIndex interface, AvahiProtocol protocol,
                          AvahiBrowserEvent event, const char* name, const char* type,
                          const char* domain, AvahiLookupResultFlags, void* self) {
    auto* d = static_cast<Discoverer*>(self);
    switch (event) {
        case AVAHI_BROWSER_NEW:
            if (avahi_service_resolver_new(d->m_pClient, interface, protocol, name, type, domain,
                                           AVAHI_PROTO_UNSPEC, AvahiLookupFlags(0),
                                           &Discoverer::OnResolved, d) != nullptr) {
                ++d->m_nPending;
            }
            break;
        case AVAHI_BROWSER_ALL_FOR_NOW:
            d->m_bAllForNow = true;
            d->QuitWhenDone();
            break;
        case AVAHI_BROWSER_FAILURE:
            d->Fail(std::string("browse failed: ") +
                    avahi_strerror(avahi_client_errno(d->m_pClient)));
            break;
        default:  // REMOVE, CACHE_EXHAUSTED
            break;
    }
}

void Discoverer::OnResolved(AvahiServiceResolver* resolver, AvahiIfIndex, AvahiProtocol,
                            AvahiResolverEvent event, const char* name, const char*, const char*,
                            const char* host, const AvahiAddress* address, uint16_t port,
                            AvahiStringList* txt, AvahiLookupResultFlags, void* self) {
    auto* d = static_cast<Discoverer*>(self);
    if (event == AVAHI_RESOLVER_FOUND && address != nullptr) {
        char text[AVAHI_ADDRESS_STR_MAX];
        avahi_address_snprint(text, sizeof text, address);
        Target target;
        target.name = name;
        target.host = host != nullptr ? host : "-";
        target.address = text;
        target.port = port;
        target.mac = TxtValue(txt, "MAC");
        target.supportTolvane = TxtValue(txt, "supportTolvane");
        if (d->m_seen.insert(target.name + '\n' + target.address).second) {
            d->m_targets.push_back(target);
        }
    }
    avahi_service_resolver_free(resolver);
    --d->m_nPending;
    d->QuitWhenDone();
}

}  // namespace qv::tools::discover
