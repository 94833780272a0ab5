// The plug-in's process-wide state and the work of its entry points: the operation table,
// the init lock, the sender lock and the data sender, with Init, Run and Finalize.
//
// Threads: Run may be called by several host threads at once; all request state lives in
// the call and only Send runs under the sender lock, one request at a time. Init and
// Finalize run under the init lock. Failure: nothing is thrown out of any member. A
// request that fails is answered through the host runtime (status code, TAB, registry text
// with the HTTP status of its code; "2" or "42" with HTTP 500 after an exception); an
// Init that fails part-way leaves the plug-in uninitialised, so a later Init tries again;
// Run without a data sender answers -314899 with HTTP 500.
#pragma once

#include <atomic>
#include <cstdint>
#include <functional>
#include <memory>

#include "plugin/OperationHandler.h"
#include "qv/zil/osdep/Mutex.h"
#include "rpc/IDataSender.h"

namespace qv {
namespace variable {
namespace remoteconfig {

// What the plug-in makes and starts outside itself; tests replace them.
struct PluginServices {
    std::function<std::unique_ptr<IDataSender>()> makeSender;
    std::function<void()> startAdvertisement;
    std::function<void()> stopAdvertisement;
};

class Plugin {
public:
    explicit Plugin(PluginServices services);
    ~Plugin();
    Plugin(const Plugin&) = delete;
    Plugin& operator=(const Plugin&) = delete;

    // Creates the data sender, enters the seven operations and starts the advertisement;
    // does nothing while initialised.
    void Init() noexcept;
    // Answers one request.
    void Run(IRequestContext* context, uint32_t handle) noexcept;
    // Stops the advertisement and destroys the data sender; the table stays filled.
    void Finalize() noexcept;

    bool IsInitialised();
    const OperationTable& Table() const { return m_table; }

private:
    void Answer(IRequestContext* context, uint32_t handle);
    void Dispatch(IRequestContext* context, uint32_t handle, zil::ByteString& output,
                  StatusRecord& status);
    void SendUnderLock(const ArgumentList& arguments, const zil::ByteString& operation,
                       zil::ByteString& output, StatusRecord& status);
    void InitLocked();

    PluginServices m_services;
    OperationTable m_table;
    zil::osdep::Mutex m_initLock;
    zil::osdep::Mutex m_senderLock;          // guards m_pSender and every Send
    std::unique_ptr<IDataSender> m_pSender;  // null while not initialised
    // Whether m_pSender is set, written under the sender lock: Run looks at it without
    // taking that lock, so a request does not wait for another's Send before reading its
    // variables (SendUnderLock still finds a Finalize that came in between).
    std::atomic<bool> m_bInitialised{false};
};

}  // namespace remoteconfig
}  // namespace variable
}  // namespace qv
