#include "plugin/Plugin.h"

#include <new>
#include <utility>

#include "platform/ws_runtime/WsRuntime.h"
#include "plugin/CatalogueOperations.h"
#include "plugin/SessionOperations.h"
#include "plugin/StatusCodes.h"
#include "plugin/VariableReader.h"
#include "qv/zil/osdep/IntegerToString.h"

namespace qv {
namespace variable {
namespace remoteconfig {

namespace {

struct Operation {
    const char* name;
    OperationHandler handler;
};

const Operation kOperations[] = {
    {"check_version_compatibility", CheckVersionCompatibility},
    {"register_class_and_url", RegisterClassAndUrl},
    {"resolve_class_and_url", ResolveClassAndUrl},
    {"io_object_proxied", IoObjectProxied},
    {"access_property", AccessProperty},
    {"invoke_method", InvokeMethod},
    {"close_session", CloseSession},
};

// Room for the argument list of nearly every request, made once: growing the list step by
// step copies every string read so far at each step.
constexpr size_t kArgumentsReserved = 128;

// The fixed answer after an exception: HTTP 500 and a body without TAB or code.
void AnswerException(uint32_t handle, const char* body, uint32_t length) noexcept {
    SetHTTPResponseCode_QV_GXWS_(handle, 500);
    WriteOutput_C_REST_QV_GXWS_(handle, body, length);
}

}  // namespace

Plugin::Plugin(PluginServices services) : m_services(std::move(services)) {}

Plugin::~Plugin() = default;

bool Plugin::IsInitialised() {
    zil::osdep::Mutex::ScopedLock lock(m_senderLock);
    return m_pSender != nullptr;
}

void Plugin::Init() noexcept {
    try {
        zil::osdep::Mutex::ScopedLock lock(m_initLock);
        InitLocked();
    } catch (...) {
        // Nothing to report to the host: the plug-in stays uninitialised.
    }
}

void Plugin::InitLocked() {
    if (IsInitialised()) {
        return;
    }
    std::unique_ptr<IDataSender> sender = m_services.makeSender();
    for (const Operation& operation : kOperations) {
        m_table[zil::ByteString(operation.name)] = operation.handler;
    }
    try {
        m_services.startAdvertisement();
    } catch (...) {
        // Undo a start that got part of the way, then fail the whole Init.
        try {
            m_services.stopAdvertisement();
        } catch (...) {
        }
        throw;
    }
    zil::osdep::Mutex::ScopedLock lock(m_senderLock);
    m_pSender = std::move(sender);
    m_bInitialised = true;
}

void Plugin::Finalize() noexcept {
    zil::osdep::Mutex::ScopedLock initLock(m_initLock);
    try {
        m_services.stopAdvertisement();
    } catch (...) {
    }
    std::unique_ptr<IDataSender> sender;
    {
        zil::osdep::Mutex::ScopedLock lock(m_senderLock);
        sender.swap(m_pSender);
        m_bInitialised = false;
    }
}

void Plugin::Run(IRequestContext* context, uint32_t handle) noexcept {
    try {
        Answer(context, handle);
    } catch (const std::bad_alloc&) {
        AnswerException(handle, "2", 1);
    } catch (...) {
        // Every std::exception, and whatever the host's own context throws.
        AnswerException(handle, "42", 2);
    }
}

void Plugin::Answer(IRequestContext* context, uint32_t handle) {
    StatusRecord status;
    zil::ByteString output;
    if (m_bInitialised) {
        Dispatch(context, handle, output, status);
    } else {
        status.SetCode(kNotInitialised);
    }

    // The body is the code, a tab and the output text: put in front of the text in its
    // own block, which then grows by a few bytes at most instead of being copied.
    zil::ByteString prefix(zil::osdep::IntegerToString(status.code), "");
    prefix.append(1, '\t');
    zil::ByteString& body = output;
    body.replace(0, 0, prefix);
    const int32_t httpStatus = HttpStatusForCode(status.code);
    if (httpStatus != 0) {
        SetHTTPResponseCode_QV_GXWS_(handle, httpStatus);
    }
    WriteOutput_C_REST_QV_GXWS_(handle, body.data(), body.size());
}

void Plugin::Dispatch(IRequestContext* context, uint32_t handle, zil::ByteString& output,
                      StatusRecord& status) {
    zil::ByteString accept;
    ReadVariableInto(handle, accept, "X_QV_ACCEPT", status);
    if (status.code == kVariableAbsent) {
        status.Clear();
    } else if (accept.IsEqual("text/html", zil::CompareMode::IgnoreCase)) {
        status.SetCode(kAcceptsOnlyHtml);
        return;
    } else if (status.IsError()) {
        return;
    }

    const zil::WideString* wideName = context == nullptr ? nullptr : context->GetOperationName();
    const zil::ByteString operation =
        wideName == nullptr ? zil::ByteString() : zil::ByteString(*wideName, "");
    const auto found = m_table.find(operation);
    if (found == m_table.end()) {
        status.SetCode(kUnknownOperation);
        return;
    }
    ArgumentList arguments;
    arguments.reserve(kArgumentsReserved);
    found->second(context, handle, arguments, status);
    SendUnderLock(arguments, operation, output, status);
}

void Plugin::SendUnderLock(const ArgumentList& arguments, const zil::ByteString& operation,
                           zil::ByteString& output, StatusRecord& status) {
    zil::osdep::Mutex::ScopedLock lock(m_senderLock);
    if (m_pSender != nullptr) {
        m_pSender->Send(arguments, operation, output, status);
    } else if (!status.IsError()) {
        status.SetCode(kNotInitialised);  // finalised while this request was running
    }
}

}  // namespace remoteconfig
}  // namespace variable
}  // namespace qv
