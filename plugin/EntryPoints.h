// The five C entry points of libqv_variable_iotolvane.so, the only symbols it exports. The
// host runtime calls Init once before the first Run, Run once per request (from several
// threads at once), Finalize after the last Run; Pause and Resume at any time. No
// exception leaves any of them; see plugin/Plugin.h for what happens on failure.
#pragma once

#include <cstdint>

#include "platform/ws_runtime/IRequestContext.h"

#define QV_PLUGIN_API extern "C" __attribute__((visibility("default")))

QV_PLUGIN_API void qv_variable_iotolvaneInit();
QV_PLUGIN_API void qv_variable_iotolvaneRun(qv::wsruntime::IRequestContext* context,
                                            uint32_t handle);
QV_PLUGIN_API void qv_variable_iotolvanePause();
QV_PLUGIN_API void qv_variable_iotolvaneResume();
QV_PLUGIN_API void qv_variable_iotolvaneFinalize();

// The entry points' types, for hosts that look them up with dlsym.
using QvPluginVoidEntry = void (*)();
using QvPluginRunEntry = void (*)(qv::wsruntime::IRequestContext*, uint32_t);
