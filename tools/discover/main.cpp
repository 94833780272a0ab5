// qv-discover: lists the targets on the local network that announce remote configuration
// ("_qv-iovar._tcp"), one line per target, and ends once the browse is complete.
#include "tools/discover/Discoverer.h"

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <iostream>
#include <string>

namespace {

const char kUsage[] =
    "Usage: qv-discover [--timeout SECONDS] [--domain DOMAIN]\n"
    "\n"
    "Browses for targets announcing _qv-iovar._tcp through the Avahi daemon, resolves each\n"
    "and prints one line per target and address, fields separated by TABs:\n"
    "  <instance name> <host> <address> <port> MAC=<mac> supportTolvane=<value>\n"
    "(\"-\" stands for a missing TXT value). It ends once the daemon has reported every\n"
    "service it knows of, or after --timeout seconds (default 10).\n"
    "Exit status: 0 when the browse completed (even with no target), 1 when the Avahi daemon\n"
    "cannot be reached or the browse fails or times out, 2 on a usage error.\n";

bool ParseSeconds(const char* text, unsigned int& seconds) {
    char* end = nullptr;
    unsigned long value = std::strtoul(text, &end, 10);
    if (end == text || *end != '\0' || value == 0 || value > 3600 || text[0] == '-') {
        return false;
    }
    seconds = static_cast<unsigned int>(value);
    return true;
}

}  // namespace

int main(int argc, char** argv) {
    unsigned int seconds = 10;
    const char* domain = "local";
    for (int i = 1; i < argc; ++i) {
        std::string arg = argv[i];
        if (arg == "-h" || arg == "--help") {
            std::fputs(kUsage, stdout);
            return 0;
        }
        if (arg == "--timeout" && i + 1 < argc && ParseSeconds(argv[i + 1], seconds)) {
            ++i;
        } else if (arg == "--domain" && i + 1 < argc && argv[i + 1][0] != '\0') {
            domain = argv[++i];
        } else {
            std::fprintf(stderr, "qv-discover: bad argument '%s' (see --help)\n", argv[i]);
            return 2;
        }
    }

    qv::tools::discover::Discoverer discoverer;
    bool ok = discoverer.Run("_qv-iovar._tcp", domain, seconds * 1000u);
    for (const auto& target : discoverer.Targets()) {
        std::cout << qv::tools::discover::FormatTarget(target) << '\n';
    }
    std::cout.flush();
    if (!ok) {
        std::fprintf(stderr, "qv-discover: %s\n", discoverer.Error().c_str());
        return 1;
    }
    return 0;
}
