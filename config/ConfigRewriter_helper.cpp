// Test helper for the write-back safety test: rewrites the file named by its argument
// through the configuration manager, forever, one complete version after another, and
// writes one byte to stdout after every version that reached the disk. The version of a
// file is in [Data] Version; every key k<i> of that version holds "v<version>-<i>-...".
#include "config/ConfigManager_qvini.h"

#include <unistd.h>

#include <string>

int main(int argc, char** argv) {
    if (argc != 2) {
        return 2;
    }
    ph_fwk::ConfigManager_qvini config(argv[1]);
    const std::string padding(120, 'p');
    for (int version = config.GetInt("Data", "Version", 0) + 1;; ++version) {
        for (int i = 0; i < 32; ++i) {
            std::string value = "v" + std::to_string(version) + "-" + std::to_string(i) + "-";
            config.SetStringNoSave("Data", "k" + std::to_string(i), value + padding);
        }
        if (!config.SetInt("Data", "Version", version)) {
            return 1;
        }
        if (::write(STDOUT_FILENO, "+", 1) != 1) {
            return 0;  // the test has gone
        }
    }
}
