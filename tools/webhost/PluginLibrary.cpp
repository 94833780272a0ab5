#include "tools/webhost/PluginLibrary.h"

#include <dlfcn.h>

#include <stdexcept>

namespace qv {
namespace devtools {

PluginLibrary::PluginLibrary(const std::string& path)
    : m_path(path), m_pLibrary(dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL)) {
    if (m_pLibrary == nullptr) {
        throw std::runtime_error(dlerror());
    }
    init = reinterpret_cast<QvPluginVoidEntry>(Symbol("qv_variable_iotolvaneInit"));
    run = reinterpret_cast<QvPluginRunEntry>(Symbol("qv_variable_iotolvaneRun"));
    pause = reinterpret_cast<QvPluginVoidEntry>(Symbol("qv_variable_iotolvanePause"));
    resume = reinterpret_cast<QvPluginVoidEntry>(Symbol("qv_variable_iotolvaneResume"));
    finalize = reinterpret_cast<QvPluginVoidEntry>(Symbol("qv_variable_iotolvaneFinalize"));
}

void* PluginLibrary::Symbol(const char* name) {
    void* symbol = dlsym(m_pLibrary, name);
    if (symbol == nullptr) {
        throw std::runtime_error(m_path + ": no entry point " + name);
    }
    return symbol;
}

}  // namespace devtools
}  // namespace qv
