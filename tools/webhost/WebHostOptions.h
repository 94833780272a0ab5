// The command line of qv-webhost. Parse never throws: it returns false with a message for
// an unknown argument or a bad value. Used by the main thread only.
#pragma once

#include <cstdint>
#include <string>

namespace qv {
namespace devtools {

struct WebHostOptions {
    std::string plugin;  // empty: the plug-in built beside the executable
    std::string address = "127.0.0.1";
    uint16_t port = 8080;
    unsigned threads = 4;
    bool embeddedRegistry = true;
    bool help = false;

    bool Parse(int argc, const char* const* argv, std::string& error);
    static const char* Usage();
};

}  // namespace devtools
}  // namespace qv
