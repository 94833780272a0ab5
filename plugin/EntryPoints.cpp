#include "plugin/EntryPoints.h"

#include <memory>

#include "advertise/Advertisement.h"
#include "plugin/Plugin.h"
#include "rpc/RemoteDataSender.h"

namespace {

using qv::variable::remoteconfig::IDataSender;
using qv::variable::remoteconfig::Plugin;
using qv::variable::remoteconfig::PluginServices;

PluginServices ShippedServices() {
    PluginServices services;
    services.makeSender = []() -> std::unique_ptr<IDataSender> {
        return std::make_unique<qv::variable::remoteconfig::RemoteDataSender>();
    };
    services.startAdvertisement = qv::variable::remoteconfig::StartAdvertisement;
    services.stopAdvertisement = qv::variable::remoteconfig::StopAdvertisement;
    return services;
}

// Made by static initialisation when the library is loaded, released at unload.
Plugin g_plugin(ShippedServices());

}  // namespace

void qv_variable_iotolvaneInit() { g_plugin.Init(); }

void qv_variable_iotolvaneRun(qv::wsruntime::IRequestContext* context, uint32_t handle) {
    g_plugin.Run(context, handle);
}

void qv_variable_iotolvanePause() {}

void qv_variable_iotolvaneResume() {}

void qv_variable_iotolvaneFinalize() { g_plugin.Finalize(); }
