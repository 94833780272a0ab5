// A web-service plug-in loaded with dlopen and its five entry points. Construction throws
// std::runtime_error (with dlerror's text) when the library or an entry point cannot be
// found. The entry points may be called from several threads as the plug-in allows; the
// library stays loaded until the process ends.
#pragma once

#include <string>

#include "plugin/EntryPoints.h"

namespace qv {
namespace devtools {

class PluginLibrary {
public:
    explicit PluginLibrary(const std::string& path);
    PluginLibrary(const PluginLibrary&) = delete;
    PluginLibrary& operator=(const PluginLibrary&) = delete;

    QvPluginVoidEntry init = nullptr;
    QvPluginRunEntry run = nullptr;
    QvPluginVoidEntry pause = nullptr;
    QvPluginVoidEntry resume = nullptr;
    QvPluginVoidEntry finalize = nullptr;

private:
    void* Symbol(const char* name);

    std::string m_path;
    void* m_pLibrary;
};

}  // namespace devtools
}  // namespace qv
