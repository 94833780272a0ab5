#include "tools/webhost/WebHostOptions.h"

#include <cstdlib>
#include <cstring>

namespace qv {
namespace devtools {

namespace {

bool ParseNumber(const std::string& text, unsigned long max, unsigned long& value) {
    if (text.empty() || text.find_first_not_of("0123456789") != std::string::npos ||
        text.size() > 9) {
        return false;
    }
    value = std::strtoul(text.c_str(), nullptr, 10);
    return value <= max;
}

}  // namespace

const char* WebHostOptions::Usage() {
    return "Usage: qv-webhost [--plugin PATH] [--listen ADDR:PORT] [--threads N]\n"
           "                  [--registry embedded|external]\n"
           "Loads the web-service plug-in, initialises it and serves HTTP requests\n"
           "/<anything>/<operation> with it until SIGINT or SIGTERM, then finalises it.\n"
           "Request variables come from the query string, an application/x-www-form-\n"
           "urlencoded body, then the headers (any case, '-' and '_' alike).\n"
           "  --plugin PATH       the plug-in (default: ../lib/libqv_variable_iotolvane.so\n"
           "                      beside this executable when present, else the one the\n"
           "                      package installs, beside this executable at\n"
           "      " QV_INSTALLED_PLUGIN_FROM_BINDIR
           ")\n"
           "  --listen ADDR:PORT  address to listen on (default 127.0.0.1:8080; port 0\n"
           "                      picks a free port)\n"
           "  --threads N         request threads calling the plug-in (default 4, 1..256)\n"
           "  --registry MODE     embedded (default): start a development registry on\n"
           "                      /tmp/qvPortableRegistry when nothing listens there;\n"
           "                      external: use whatever listens there\n"
           "Prints 'listening on http://ADDR:PORT' once ready; one access-log line per\n"
           "request on stderr.\n";
}

bool WebHostOptions::Parse(int argc, const char* const* argv, std::string& error) {
    for (int i = 1; i < argc; ++i) {
        std::string argument = argv[i];
        std::string value;
        const std::string::size_type equals = argument.find('=');
        if (argument.compare(0, 2, "--") == 0 && equals != std::string::npos) {
            value = argument.substr(equals + 1);
            argument = argument.substr(0, equals);
        } else if (argument != "--help" && argument != "-h") {
            if (i + 1 >= argc) {
                error = "missing value for " + argument;
                return false;
            }
            value = argv[++i];
        }
        unsigned long number = 0;
        if (argument == "--help" || argument == "-h") {
            help = true;
        } else if (argument == "--plugin") {
            plugin = value;
        } else if (argument == "--listen") {
            const std::string::size_type colon = value.rfind(':');
            if (colon == std::string::npos || colon == 0 ||
                !ParseNumber(value.substr(colon + 1), 65535, number)) {
                error = "--listen needs ADDR:PORT, got '" + value + "'";
                return false;
            }
            address = value.substr(0, colon);
            port = static_cast<uint16_t>(number);
        } else if (argument == "--threads") {
            if (!ParseNumber(value, 256, number) || number == 0) {
                error = "--threads needs a number from 1 to 256, got '" + value + "'";
                return false;
            }
            threads = static_cast<unsigned>(number);
        } else if (argument == "--registry") {
            if (value != "embedded" && value != "external") {
                error = "--registry is embedded or external, got '" + value + "'";
                return false;
            }
            embeddedRegistry = value == "embedded";
        } else {
            error = "unknown argument '" + argument + "'";
            return false;
        }
    }
    return true;
}

}  // namespace devtools
}  // namespace qv
