#include "config/ConfigManager_qvini.h"

#include <array>

namespace ph_fwk {
namespace {

constexpr int32_t kNoLineLimit = -1;
constexpr uint32_t kWriteFlags = 0x36;         // temporary file by mkstemp, compact, fsync
constexpr uint32_t kClearedWriteFlags = 0x26;  // the same without compacting
constexpr uint32_t kParseFlags = 0x12;         // double quotes stripped

}  // namespace

const char kSystemConfigPath[] = "/etc/velmora/share/qv-rt.ini";

ConfigManager_qvini::ConfigManager_qvini(std::string path) : m_sPath(std::move(path)) {}

ConfigManager_qvini::~ConfigManager_qvini() { IniDestroy(m_pStore); }

bool ConfigManager_qvini::Open() {
    if (m_pStore) {
        return true;
    }
    m_pStore = IniCreate();
    if (!m_pStore) {
        return false;
    }
    IniSetWriteOptions(m_pStore, kNoLineLimit, 0, kWriteFlags);
    IniSetParseFlags(m_pStore, kParseFlags);
    IniLoadFile(m_pStore, m_sPath.c_str());
    return true;
}

void ConfigManager_qvini::Refresh() {
    if (IniFileChanged(m_pStore) != 0) {
        IniLoadFile(m_pStore, m_sPath.c_str());
    }
}

bool ConfigManager_qvini::Write() { return IniWriteFile(m_pStore, m_sPath.c_str()) == 0; }

int ConfigManager_qvini::GetInt(const std::string& section, const std::string& key,
                                int defaultValue) {
    mthread::ScopedLock lock(m_lock);
    if (!Open()) {
        return defaultValue;
    }
    Refresh();
    int32_t value = 0;
    return IniGetInt(m_pStore, section.c_str(), key.c_str(), &value) < 1 ? defaultValue : value;
}

std::string ConfigManager_qvini::GetString(const std::string& section, const std::string& key,
                                           const std::string& defaultValue) {
    mthread::ScopedLock lock(m_lock);
    if (!Open()) {
        return defaultValue;
    }
    Refresh();
    std::array<char, 1024> buffer;
    if (IniGetString(m_pStore, section.c_str(), key.c_str(), buffer.data(), buffer.size()) < 1) {
        return defaultValue;
    }
    return buffer.data();
}

bool ConfigManager_qvini::KeyExists(const std::string& section, const std::string& key) {
    mthread::ScopedLock lock(m_lock);
    return Open() && IniKeyExists(m_pStore, section.c_str(), key.c_str()) == 1;
}

bool ConfigManager_qvini::SetInt(const std::string& section, const std::string& key, int value) {
    mthread::ScopedLock lock(m_lock);
    if (!Open()) {
        return false;
    }
    Refresh();
    return IniSetInt(m_pStore, section.c_str(), key.c_str(), value) >= 1 && Write();
}

bool ConfigManager_qvini::SetString(const std::string& section, const std::string& key,
                                    const std::string& value) {
    mthread::ScopedLock lock(m_lock);
    if (!Open()) {
        return false;
    }
    Refresh();
    return IniSetString(m_pStore, section.c_str(), key.c_str(), value.c_str()) >= 1 && Write();
}

bool ConfigManager_qvini::SetIntNoSave(const std::string& section, const std::string& key,
                                       int value) {
    mthread::ScopedLock lock(m_lock);
    return Open() && IniSetInt(m_pStore, section.c_str(), key.c_str(), value) >= 1;
}

bool ConfigManager_qvini::SetStringNoSave(const std::string& section, const std::string& key,
                                          const std::string& value) {
    mthread::ScopedLock lock(m_lock);
    return Open() && IniSetString(m_pStore, section.c_str(), key.c_str(), value.c_str()) >= 1;
}

bool ConfigManager_qvini::RemoveSection(const std::string& section) {
    mthread::ScopedLock lock(m_lock);
    if (!Open()) {
        return false;
    }
    Refresh();
    return IniDeleteSection(m_pStore, section.c_str()) == 1 ? Write() : true;
}

bool ConfigManager_qvini::RemoveKey(const std::string& section, const std::string& key) {
    mthread::ScopedLock lock(m_lock);
    if (!Open()) {
        return false;
    }
    Refresh();
    return IniDeleteKey(m_pStore, section.c_str(), key.c_str()) == 1 ? Write() : true;
}

bool ConfigManager_qvini::RemoveSectionNoSave(const std::string& section) {
    mthread::ScopedLock lock(m_lock);
    if (!Open()) {
        return false;
    }
    IniDeleteSection(m_pStore, section.c_str());
    return true;
}

bool ConfigManager_qvini::RemoveKeyNoSave(const std::string& section, const std::string& key) {
    mthread::ScopedLock lock(m_lock);
    if (!Open()) {
        return false;
    }
    IniDeleteKey(m_pStore, section.c_str(), key.c_str());
    return true;
}

bool ConfigManager_qvini::Clear() {
    mthread::ScopedLock lock(m_lock);
    if (!Open()) {
        return false;
    }
    IniDestroy(m_pStore);
    m_pStore = IniCreate();
    if (!m_pStore) {
        return false;
    }
    IniSetWriteOptions(m_pStore, kNoLineLimit, 0, kClearedWriteFlags);
    return Write();
}

bool ConfigManager_qvini::Save() {
    mthread::ScopedLock lock(m_lock);
    return Open() && Write();
}

void ConfigManager_qvini::Reload() {
    mthread::ScopedLock lock(m_lock);
    if (Open()) {
        IniLoadFile(m_pStore, m_sPath.c_str());
    }
}

ConfigManager::SectionIterPtr ConfigManager_qvini::GetSectionIterator() {
    mthread::ScopedLock lock(m_lock);
    if (!Open()) {
        return std::make_unique<nQVEmbCfg::tNullSectionIterator>();
    }
    Refresh();
    std::vector<std::string> names;
    const int count = IniSectionCount(m_pStore);
    names.reserve(static_cast<size_t>(count));
    for (int i = 1; i <= count; ++i) {
        const char* name = nullptr;
        IniSectionName(m_pStore, i, &name);
        names.emplace_back(name);
    }
    return std::make_unique<FileIO_SectionIterator>(std::move(names));
}

ConfigManager::KeyIterPtr ConfigManager_qvini::GetKeyIterator(const std::string& section) {
    mthread::ScopedLock lock(m_lock);
    if (!Open()) {
        return std::make_unique<nQVEmbCfg::tNullKeyIterator>();
    }
    Refresh();
    std::vector<std::pair<std::string, std::string>> pairs;
    const int count = IniKeyCount(m_pStore, section.c_str());
    pairs.reserve(static_cast<size_t>(count));
    for (int i = 1; i <= count; ++i) {
        const char* key = nullptr;
        const char* value = nullptr;
        IniKeyName(m_pStore, section.c_str(), i, &key);
        IniKeyValue(m_pStore, section.c_str(), i, &value);
        pairs.emplace_back(key, value);
    }
    return std::make_unique<FileIO_KeyIterator>(std::move(pairs));
}

ConfigManager& GetSystemConfig() {
    static ConfigManager* const instance = new ConfigManager_qvini(kSystemConfigPath);
    return *instance;
}

}  // namespace ph_fwk
