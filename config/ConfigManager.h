// ph_fwk::ConfigManager: settings addressed by section and key. Getters take a default that
// is returned when the setting is absent or unreadable; setters report success as a bool.
// Nothing of its own is thrown (memory exhaustion is std::bad_alloc). Thread safety is up
// to the implementation (ConfigManager_qvini serialises all calls).
#pragma once

#include "config/ConfigIterators.h"

#include <memory>
#include <string>
#include <vector>

namespace ph_fwk {

class ConfigManager {
public:
    using SectionIterPtr = std::unique_ptr<ConfigSectionIter>;
    using KeyIterPtr = std::unique_ptr<ConfigKeyIter>;

    virtual ~ConfigManager() = default;

    virtual int GetInt(const std::string& section, const std::string& key, int defaultValue) = 0;
    virtual bool SetInt(const std::string& section, const std::string& key, int value) = 0;
    virtual std::string GetString(const std::string& section, const std::string& key,
                                  const std::string& defaultValue) = 0;
    virtual bool SetString(const std::string& section, const std::string& key,
                           const std::string& value) = 0;
    virtual bool RemoveSection(const std::string& section) = 0;
    virtual bool RemoveKey(const std::string& section, const std::string& key) = 0;
    // Walks the keys of the section and compares names with strcasecmp.
    virtual bool KeyExists(const std::string& section, const std::string& key);
    virtual bool Clear() = 0;
    virtual SectionIterPtr GetSectionIterator() = 0;
    virtual KeyIterPtr GetKeyIterator(const std::string& section) = 0;
    virtual bool SetIntNoSave(const std::string& section, const std::string& key, int value) = 0;
    virtual bool SetStringNoSave(const std::string& section, const std::string& key,
                                 const std::string& value) = 0;
    virtual bool RemoveSectionNoSave(const std::string& section) = 0;
    virtual bool RemoveKeyNoSave(const std::string& section, const std::string& key) = 0;
    virtual bool Save() = 0;
    virtual void Reload() = 0;

    // Helpers built on the operations above. Booleans are stored as "TRUE"/"FALSE"; a list
    // is stored as each element followed by the separator.
    bool SetIntOrRemove(const std::string& section, const std::string& key, int value,
                        int defaultValue);
    bool SetIntOrRemoveNoSave(const std::string& section, const std::string& key, int value,
                              int defaultValue);
    bool SetStringOrRemoveNoSave(const std::string& section, const std::string& key,
                                 const std::string& value, const std::string& defaultValue);
    bool GetBool(const std::string& section, const std::string& key, bool defaultValue);
    bool SetBool(const std::string& section, const std::string& key, bool value);
    bool SetBoolNoSave(const std::string& section, const std::string& key, bool value);
    bool SetBoolOrRemove(const std::string& section, const std::string& key, bool value,
                         bool defaultValue);
    bool SetBoolOrRemoveNoSave(const std::string& section, const std::string& key, bool value,
                               bool defaultValue);
    bool SetStringList(const std::string& section, const std::string& key,
                       const std::vector<std::string>& list, char separator);
    bool SetStringListNoSave(const std::string& section, const std::string& key,
                             const std::vector<std::string>& list, char separator);
    std::vector<std::string> GetStringList(const std::string& section, const std::string& key,
                                           const std::vector<std::string>& defaultList,
                                           char separator);

    // The text form of a list and back: "a,b," <-> {"a", "b"}.
    static std::string JoinList(const std::vector<std::string>& list, char separator);
    static std::vector<std::string> SplitList(const std::string& text, char separator);
};

}  // namespace ph_fwk
