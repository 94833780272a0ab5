#include "config/IniTestSupport.h"

#include "config/IniModel.h"

#include <ftw.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <sstream>
#include <stdexcept>
#include <vector>

namespace qv_ini_test {

TempDir::TempDir() {
    const char* base = std::getenv("TMPDIR");
    std::string templ = std::string(base && *base ? base : "/tmp") + "/config_test.XXXXXX";
    std::vector<char> buffer(templ.begin(), templ.end());
    buffer.push_back('\0');
    if (!::mkdtemp(buffer.data())) {
        throw std::runtime_error("mkdtemp failed");
    }
    m_path = buffer.data();
}

TempDir::~TempDir() {
    ::nftw(
        m_path.c_str(),
        [](const char* path, const struct stat*, int, struct FTW*) { return ::remove(path); }, 16,
        FTW_DEPTH | FTW_PHYS);
}

Store NewStore(uint32_t parseFlags) {
    Store store(IniCreate());
    if (store) {
        IniSetParseFlags(store.get(), parseFlags);
    }
    return store;
}

std::string ReadAll(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    std::ostringstream out;
    out << in.rdbuf();
    return out.str();
}

void WriteAll(const std::string& path, const std::string& bytes) {
    std::ofstream out(path, std::ios::binary | std::ios::trunc);
    out << bytes;
}

std::string Dump(IniStore* store) {
    std::string out;
    for (int s = 1; s <= IniSectionCount(store); ++s) {
        const char* section = nullptr;
        IniSectionName(store, s, &section);
        std::string name = section;
        out += "[" + name + "] @" + std::to_string(IniSectionLine(store, name.c_str())) + "\n";
        for (int k = 1; k <= IniKeyCount(store, name.c_str()); ++k) {
            const char* key = nullptr;
            const char* value = nullptr;
            IniKeyName(store, name.c_str(), k, &key);
            IniKeyValue(store, name.c_str(), k, &value);
            out += std::string(key) + "=" + value + " @" +
                   std::to_string(IniKeyLine(store, name.c_str(), key));
            // The quote character has no getter; it is read from the model.
            int quote = store->sections[static_cast<size_t>(s) - 1]
                            ->keys[static_cast<size_t>(k) - 1]
                            ->quote;
            if (quote) {
                out += std::string(" q") + static_cast<char>(quote);
            }
            out += "\n";
        }
    }
    return out;
}

std::string TestData(const std::string& name) {
    return std::string(CONFIG_TESTDATA_DIR) + "/" + name;
}

}  // namespace qv_ini_test
