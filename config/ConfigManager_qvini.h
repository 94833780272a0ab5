// ph_fwk::ConfigManager_qvini: the configuration manager over one INI file. The file is read
// on first use, re-read when its modification time changes, and replaced safely by the
// saving operations. Safe to use from several threads: every operation holds the object's
// recursive lock. A file that cannot be read leaves the settings empty (getters give their
// defaults); a failed write returns false and keeps the change in memory.
#pragma once

#include "basic_thread/gnu/sync_objects.h"
#include "config/ConfigManager.h"
#include "config/IniStore.h"

#include <string>

namespace ph_fwk {

// The target's system configuration file.
extern const char kSystemConfigPath[];

class ConfigManager_qvini : public ConfigManager {
public:
    explicit ConfigManager_qvini(std::string path = kSystemConfigPath);
    ~ConfigManager_qvini() override;
    ConfigManager_qvini(const ConfigManager_qvini&) = delete;
    ConfigManager_qvini& operator=(const ConfigManager_qvini&) = delete;

    int GetInt(const std::string& section, const std::string& key, int defaultValue) override;
    bool SetInt(const std::string& section, const std::string& key, int value) override;
    std::string GetString(const std::string& section, const std::string& key,
                          const std::string& defaultValue) override;
    bool SetString(const std::string& section, const std::string& key,
                   const std::string& value) override;
    bool RemoveSection(const std::string& section) override;
    bool RemoveKey(const std::string& section, const std::string& key) override;
    bool KeyExists(const std::string& section, const std::string& key) override;
    bool Clear() override;
    SectionIterPtr GetSectionIterator() override;
    KeyIterPtr GetKeyIterator(const std::string& section) override;
    bool SetIntNoSave(const std::string& section, const std::string& key, int value) override;
    bool SetStringNoSave(const std::string& section, const std::string& key,
                         const std::string& value) override;
    bool RemoveSectionNoSave(const std::string& section) override;
    bool RemoveKeyNoSave(const std::string& section, const std::string& key) override;
    bool Save() override;
    void Reload() override;

private:
    // The steps every operation is made of; called with the lock held.
    bool Open();
    void Refresh();
    bool Write();

    IniStore* m_pStore = nullptr;
    std::string m_sPath;
    mthread::CriticalSection m_lock;
};

// The process-wide manager of kSystemConfigPath, made on the first call and never destroyed.
// The first call must not race with another.
ConfigManager& GetSystemConfig();

}  // namespace ph_fwk
