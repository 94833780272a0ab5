// Helpers shared by the config tests: a fresh temporary directory removed with its contents,
// whole-file reads and writes, and a dump of a store as "[name] @line" / "key=value @line q".
#pragma once

#include "config/IniStore.h"

#include <memory>
#include <string>

namespace qv_ini_test {

class TempDir {
public:
    TempDir();
    ~TempDir();
    TempDir(const TempDir&) = delete;
    TempDir& operator=(const TempDir&) = delete;
    const std::string& Path() const { return m_path; }
    std::string File(const std::string& name) const { return m_path + "/" + name; }

private:
    std::string m_path;
};

struct StoreDeleter {
    void operator()(IniStore* store) const { IniDestroy(store); }
};
using Store = std::unique_ptr<IniStore, StoreDeleter>;

Store NewStore(uint32_t parseFlags = 0x12);
std::string ReadAll(const std::string& path);
void WriteAll(const std::string& path, const std::string& bytes);
std::string Dump(IniStore* store);
std::string TestData(const std::string& name);

}  // namespace qv_ini_test
