// A host of its own for the leak check: loads the shipped plug-in with dlopen, runs an
// in-process development registry on the plug-in's socket path and, through several
// Init/Finalize cycles, sends every operation and every error path through the plug-in's
// run entry: missing variables, text/html, unknown operation, bad session, every scripted
// registry fault (garbage, wrong frame length, kind, version and parameter count, a closed
// connection, an error status, a delay), the registry stopped and started again, and
// requests before Init and after Finalize. Meant to run under valgrind memcheck inside
// private namespaces (the socket path is the real one). Prints PASS/FAIL per check.
//
// Usage: leak_driver PLUGIN [CYCLES]   (default 3 cycles)
#include <dlfcn.h>

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "platform/ws_runtime/RequestTable.h"
#include "plugin/EntryPoints.h"
#include "rpc/IPCClient.h"
#include "tools/registry/RegistryReplies.h"
#include "tools/registry/RegistryServer.h"
#include "tools/webhost/HostRequestContext.h"

namespace {

using qv::devtools::HostRequestContext;
using qv::devtools::RegistryServer;
using qv::wsruntime::RequestTable;
using qv::wsruntime::RequestVariables;

int g_failures = 0;

void Check(bool ok, const std::string& what, const std::string& detail) {
    std::printf("%s: %s%s%s\n", ok ? "PASS" : "FAIL", what.c_str(), ok ? "" : ": ",
                ok ? "" : detail.c_str());
    g_failures += ok ? 0 : 1;
}

struct Entries {
    QvPluginVoidEntry init = nullptr;
    QvPluginRunEntry run = nullptr;
    QvPluginVoidEntry pause = nullptr;
    QvPluginVoidEntry resume = nullptr;
    QvPluginVoidEntry finalize = nullptr;
};

// One request: operation name, query variables and headers.
struct Request {
    std::string operation;
    std::vector<std::pair<std::string, std::string>> exact;
    std::vector<std::pair<std::string, std::string>> headers;
};

RequestTable::Response Send(const Entries& plugin, const Request& request) {
    RequestVariables variables;
    for (const auto& v : request.exact) {
        variables.AddExact(v.first, v.second);
    }
    for (const auto& v : request.headers) {
        variables.AddHeader(v.first, v.second);
    }
    HostRequestContext context(request.operation, variables);
    const uint32_t handle = RequestTable::Open(variables);
    plugin.run(&context, handle);
    return RequestTable::Close(handle);
}

std::string Describe(const RequestTable::Response& response) {
    std::string body = response.body;
    for (char& c : body) {
        c = (c == '\t' || c == '\n') ? '|' : c;
    }
    return std::to_string(response.status) + " '" + body + "'";
}

int32_t CodeOf(const RequestTable::Response& response) {
    return static_cast<int32_t>(std::strtol(response.body.c_str(), nullptr, 10));
}

bool IsTransportFailure(const RequestTable::Response& response) {
    const int32_t code = CodeOf(response);
    const bool hasTab = response.body.find('\t') != std::string::npos;
    return response.status == 500 && hasTab &&
           ((code >= -314899 && code <= -314700) || code == -356060);
}

bool IsSuccess(const RequestTable::Response& response, const std::string& operation) {
    return response.status == 0 && response.body.rfind("0\t" + operation, 0) == 0;
}

const std::vector<std::pair<std::string, std::string>> kCall = {
    {"X_QV_LIBRARY_PATH_NAME", "lib.so"},
    {"X_QV_FUNC_NAME", "f"},
    {"X_QV_CLASS_NAME", "Pump"},
    {"X_QV_CALLING_CONVENTION", "C"}};

std::vector<std::pair<std::string, std::string>> With(
    std::vector<std::pair<std::string, std::string>> base,
    const std::vector<std::pair<std::string, std::string>>& more) {
    base.insert(base.end(), more.begin(), more.end());
    return base;
}

// Every operation with all its variables.
std::vector<Request> EveryOperation() {
    return {
        {"check_version_compatibility",
         {{"X_QV_CLIENT_SIDE_VERSION", "1"}, {"X_QV_OLDEST_COMPATIBLE_VERSION", "1"}},
         {}},
        {"resolve_class_and_url", {{"X_QV_TAG", "t"}}, {{"X-Qv-Configured-Class", "C"}}},
        {"register_class_and_url",
         {{"X_QV_TAG", "t"},
          {"X_QV_CONFIGURED_CLASS", "C"},
          {"X_QV_CLASS_HIERARCHY_CRC", "9"},
          {"parentCount", "2"},
          {"childCount", "1"},
          {"parent0", "P0"},
          {"parent1", "P1"},
          {"child0", "K0"}},
         {}},
        {"io_object_proxied",
         With(kCall, {{"name", "n"},
                      {"leafClassName", "lc"},
                      {"resolvedTag", "rt"},
                      {"remoteSession", "rs"}}),
         {}},
        {"invoke_method",
         With(kCall, {{"code", "0"},
                      {"returnErrClustCode", "1"},
                      {"tdr", "t"},
                      {"struct", "s"},
                      {"numberOfPointers", "2"},
                      {"value0", "v0"},
                      {"value1", std::string(3000, 'x')}}),
         {{"session", "-9223372036854775808"}}},
        {"access_property",
         {{"ignoreErrors", "0"},
          {"argc", "2"},
          {"numberOfBatches", "1"},
          {"libraryPathName0", "P"},
          {"funcName0", "f"},
          {"className0", "c"},
          {"callingConvention0", "cc"},
          {"libraryPathName1", "p"},
          {"action0", "0"},
          {"id0", "i0"},
          {"flags0", "f0"},
          {"tdr0", "t0"},
          {"action1", "1"},
          {"id1", "i1"},
          {"flags1", "f1"},
          {"tdr1", "t1"},
          {"value1", "v1"}},
         {{"session", "5"}}},
        {"CLOSE_SESSION", With(kCall, {{"session", "0"}}), {}},
    };
}

// The error paths that end inside the plug-in, before the registry is asked.
void LocalErrors(const Entries& plugin) {
    const Request version = EveryOperation()[0];
    RequestTable::Response r = Send(plugin, {version.operation, {version.exact[0]}, {}});
    Check(r.status == 400 && r.body == "-356006\t", "missing variable -> 400", Describe(r));
    Request html = version;
    html.headers.push_back({"X-QV-Accept", "TEXT/HTML"});
    r = Send(plugin, html);
    Check(r.status == 406 && r.body == "-356007\t", "text/html -> 406", Describe(r));
    r = Send(plugin, {"no_such_operation", {}, {}});
    Check(r.status == 501 && r.body == "-2147467263\t", "unknown operation -> 501", Describe(r));
    r = Send(plugin, {"", {}, {}});
    Check(r.status == 501, "empty operation name -> 501", Describe(r));
    r = Send(plugin, {"close_session", kCall, {{"session", "12abc"}}});
    Check(r.status == 500 && r.body == "-356020\t", "bad session -> 500", Describe(r));
    r = Send(plugin, {"invoke_method", kCall, {}});
    Check(r.status == 500 && r.body == "-356020\t", "absent session -> 500", Describe(r));
    r = Send(plugin, {"access_property", {{"argc", "99999999999"}}, {{"session", "1"}}});
    Check(r.status == 400 && r.body == "-356006\t", "huge count, missing variables -> 400",
          Describe(r));
}

void EveryOperationServed(const Entries& plugin) {
    for (const Request& request : EveryOperation()) {
        const RequestTable::Response r = Send(plugin, request);
        Check(IsSuccess(r, request.operation), request.operation, Describe(r));
    }
}

// Every scripted fault: the request fails with a transport code (or the registry's own
// code), and the next request is served.
void RegistryFaults(const Entries& plugin, RegistryServer& registry) {
    const Request probe = EveryOperation()[1];
    struct Case {
        const char* name;
        RegistryServer::FaultKind kind;
        uint32_t value;
        std::string bytes;
    };
    const Case cases[] = {
        {"garbage frame", RegistryServer::FaultKind::kRawBytes, 0,
         std::string("\x10\x00\x00\x00garbage-garbage!", 20)},
        {"frameLength 0", RegistryServer::FaultKind::kFrameLength, 0, ""},
        {"frameLength 2 GiB", RegistryServer::FaultKind::kFrameLength, 0x80000000u, "xxxx"},
        {"frameLength 17 MiB", RegistryServer::FaultKind::kFrameLength, 17u << 20, "xxxx"},
        {"9 parameters", RegistryServer::FaultKind::kParameterCount, 9, ""},
        {"kind 7", RegistryServer::FaultKind::kKind, 7, ""},
        {"version 0x0101", RegistryServer::FaultKind::kVersion, 0x0101, ""},
        {"closed after reading", RegistryServer::FaultKind::kCloseAfterRead, 0, ""},
    };
    for (const Case& c : cases) {
        RegistryServer::Fault fault;
        fault.kind = c.kind;
        fault.value = c.value;
        fault.bytes = qv::zil::ByteString(c.bytes.data(), static_cast<uint32_t>(c.bytes.size()));
        registry.SetFault(fault);
        const RequestTable::Response failed = Send(plugin, probe);
        registry.SetFault(RegistryServer::Fault());
        Check(IsTransportFailure(failed), std::string("registry fault ") + c.name,
              Describe(failed));
        const RequestTable::Response next = Send(plugin, probe);
        Check(IsSuccess(next, probe.operation), std::string("served after ") + c.name,
              Describe(next));
    }

    RegistryServer::Fault status;
    status.kind = RegistryServer::FaultKind::kStatus;
    status.status.SetCode(-7);
    registry.SetFault(status);
    RequestTable::Response r = Send(plugin, probe);
    Check(r.status == 500 && r.body.rfind("-7\t", 0) == 0, "registry answers status -7",
          Describe(r));
    // A response with fewer parameters than the request is dropped without a code: the
    // output and status come back as they were sent (code 0, no text).
    RegistryServer::Fault fewer;
    fewer.kind = RegistryServer::FaultKind::kParameterCount;
    fewer.value = 3;
    registry.SetFault(fewer);
    r = Send(plugin, probe);
    registry.SetFault(RegistryServer::Fault());
    Check(r.status == 0 && r.body == "0\t", "3-parameter response dropped", Describe(r));
    r = Send(plugin, probe);
    Check(IsSuccess(r, probe.operation), "served after a dropped response", Describe(r));

    RegistryServer::Fault delay;
    delay.kind = RegistryServer::FaultKind::kDelay;
    delay.value = 50;
    registry.SetFault(delay);
    r = Send(plugin, probe);
    Check(IsSuccess(r, probe.operation), "registry answers after 50 ms", Describe(r));
    registry.SetFault(RegistryServer::Fault());
}

// The registry stopped (the plug-in's connection dies) and started again.
void RegistryDown(const Entries& plugin, RegistryServer& registry) {
    const Request probe = EveryOperation()[0];
    registry.Stop();
    RequestTable::Response r = Send(plugin, probe);
    Check(IsTransportFailure(r), "registry stopped", Describe(r));
    r = Send(plugin, probe);
    Check(IsTransportFailure(r), "registry still stopped", Describe(r));
    registry.Start();
    r = Send(plugin, probe);
    Check(IsSuccess(r, probe.operation), "registry started again", Describe(r));
}

}  // namespace

int main(int argc, char** argv) {
    if (argc < 2 || std::strcmp(argv[1], "--help") == 0 || std::strcmp(argv[1], "-h") == 0) {
        std::printf(
            "Usage: leak_driver PLUGIN [CYCLES]\n"
            "Loads the plug-in, serves its registry socket in-process and drives every\n"
            "operation and error path through CYCLES (default 3) Init/Finalize cycles.\n");
        return argc < 2 ? 2 : 0;
    }
    const int cycles = argc > 2 ? std::atoi(argv[2]) : 3;
    std::setvbuf(stdout, nullptr, _IOLBF, 0);

    void* library = dlopen(argv[1], RTLD_NOW | RTLD_LOCAL);
    if (library == nullptr) {
        std::printf("FAIL: dlopen: %s\n", dlerror());
        return 1;
    }
    Entries plugin;
    plugin.init = reinterpret_cast<QvPluginVoidEntry>(dlsym(library, "qv_variable_iotolvaneInit"));
    plugin.run = reinterpret_cast<QvPluginRunEntry>(dlsym(library, "qv_variable_iotolvaneRun"));
    plugin.pause =
        reinterpret_cast<QvPluginVoidEntry>(dlsym(library, "qv_variable_iotolvanePause"));
    plugin.resume =
        reinterpret_cast<QvPluginVoidEntry>(dlsym(library, "qv_variable_iotolvaneResume"));
    plugin.finalize =
        reinterpret_cast<QvPluginVoidEntry>(dlsym(library, "qv_variable_iotolvaneFinalize"));
    if (!plugin.init || !plugin.run || !plugin.pause || !plugin.resume || !plugin.finalize) {
        std::printf("FAIL: an entry point is missing\n");
        return 1;
    }

    const Request probe = EveryOperation()[0];
    RequestTable::Response r = Send(plugin, probe);
    Check(r.status == 500 && r.body == "-314899\t", "request before Init", Describe(r));

    RegistryServer registry(qv::portableRegistry::rpc::IPCClient::kDefaultSocketPath,
                            qv::devtools::RegistryReplies::Echo);
    // The first Init finds no registry: the first request fails, the next connects.
    plugin.init();
    r = Send(plugin, probe);
    Check(IsTransportFailure(r), "no registry yet", Describe(r));
    registry.Start();
    for (int cycle = 1; cycle <= cycles; ++cycle) {
        std::printf("-- cycle %d\n", cycle);
        if (cycle > 1) {
            plugin.init();
        }
        plugin.pause();
        plugin.resume();
        EveryOperationServed(plugin);
        LocalErrors(plugin);
        RegistryFaults(plugin, registry);
        RegistryDown(plugin, registry);
        plugin.finalize();
        r = Send(plugin, probe);
        Check(r.status == 500 && r.body == "-314899\t", "request after Finalize", Describe(r));
    }
    // Init twice and Finalize twice in a row.
    plugin.init();
    plugin.init();
    r = Send(plugin, probe);
    Check(IsSuccess(r, probe.operation), "served after a second Init", Describe(r));
    plugin.finalize();
    plugin.finalize();
    registry.Stop();
    Check(RequestTable::OpenCount() == 0, "no request left open",
          std::to_string(RequestTable::OpenCount()));
    std::printf("%s: leak driver, %d cycles, %d failures\n", g_failures == 0 ? "PASS" : "FAIL",
                cycles, g_failures);
    return g_failures == 0 ? 0 : 1;
}
