// Discoverer: lists the targets that announce "_qv-iovar._tcp", through the Avahi client
// library on a simple poll run by the calling thread. Browses, resolves every service found
// and ends once the daemon has reported all it knows and every resolution has finished.
// Single-threaded: use one object from one thread. Failure: Run returns false and Error()
// says why (no daemon, browse failure, time-out).
#pragma once

#include "tools/discover/TargetLine.h"

#include <avahi-client/client.h>
#include <avahi-client/lookup.h>
#include <avahi-common/simple-watch.h>

#include <set>
#include <string>
#include <vector>

namespace qv::tools::discover {

class Discoverer {
public:
    Discoverer() = default;
    ~Discoverer();
    Discoverer(const Discoverer&) = delete;
    Discoverer& operator=(const Discoverer&) = delete;

    // Browses type in domain for at most timeoutMs; the targets found, in order of arrival,
    // are in Targets() afterwards (also after a time-out).
    bool Run(const char* type, const char* domain, unsigned int timeoutMs);

    const std::vector<Target>& Targets() const { return m_targets; }
    const std::string& Error() const { return m_error; }

private:
    static void OnBrowse(AvahiServiceBrowser* browser, AvahiIfIndex interface,
                         AvahiProtocol protocol, AvahiBrowserEvent event, const char* name,
                         const char* type, const char* domain, AvahiLookupResultFlags flags,
                         void* self);
    static void OnResolved(AvahiServiceResolver* resolver, AvahiIfIndex interface,
                           AvahiProtocol protocol, AvahiResolverEvent event, const char* name,
                           const char* type, const char* domain, const char* host,
                           const AvahiAddress* address, uint16_t port, AvahiStringList* txt,
                           AvahiLookupResultFlags flags, void* self);
    static void OnTimeout(AvahiTimeout* timeout, void* self);

    void Fail(const std::string& why);
    void QuitWhenDone();

    AvahiSimplePoll* m_pPoll = nullptr;
    AvahiClient* m_pClient = nullptr;
    AvahiServiceBrowser* m_pBrowser = nullptr;
    int m_nPending = 0;  // resolutions not yet finished
    bool m_bAllForNow = false;
    bool m_bFailed = false;
    std::string m_error;
    std::vector<Target> m_targets;
    std::set<std::string> m_seen;  // name and address already listed
};

}  // namespace qv::tools::discover
