#include "config/ConfigManager.h"

#include <strings.h>

namespace ph_fwk {
namespace {

const char* BoolText(bool value) { return value ? "TRUE" : "FALSE"; }

}  // namespace

bool ConfigManager::KeyExists(const std::string& section, const std::string& key) {
    KeyIterPtr keys = GetKeyIterator(section);
    for (; !keys->AtEnd(); keys->Next()) {
        if (::strcasecmp(keys->Key().c_str(), key.c_str()) == 0) {
            return true;
        }
    }
    return false;
}

bool ConfigManager::SetIntOrRemove(const std::string& section, const std::string& key, int value,
                                   int defaultValue) {
    return value == defaultValue ? RemoveKey(section, key) : SetInt(section, key, value);
}

bool ConfigManager::SetIntOrRemoveNoSave(const std::string& section, const std::string& key,
                                         int value, int defaultValue) {
    return value == defaultValue ? RemoveKeyNoSave(section, key)
                                 : SetIntNoSave(section, key, value);
}

bool ConfigManager::SetStringOrRemoveNoSave(const std::string& section, const std::string& key,
                                            const std::string& value,
                                            const std::string& defaultValue) {
    return value == defaultValue ? RemoveKeyNoSave(section, key)
                                 : SetStringNoSave(section, key, value);
}

bool ConfigManager::GetBool(const std::string& section, const std::string& key, bool defaultValue) {
    std::string text = GetString(section, key, BoolText(defaultValue));
    return ::strcasecmp(text.c_str(), "TRUE") == 0;
}

bool ConfigManager::SetBool(const std::string& section, const std::string& key, bool value) {
    return SetString(section, key, BoolText(value));
}

bool ConfigManager::SetBoolNoSave(const std::string& section, const std::string& key, bool value) {
    return SetStringNoSave(section, key, BoolText(value));
}

bool ConfigManager::SetBoolOrRemove(const std::string& section, const std::string& key, bool value,
                                    bool defaultValue) {
    return value != defaultValue ? SetString(section, key, BoolText(value))
                                 : RemoveKey(section, key);
}

bool ConfigManager::SetBoolOrRemoveNoSave(const std::string& section, const std::string& key,
                                          bool value, bool defaultValue) {
    return value != defaultValue ? SetStringNoSave(section, key, BoolText(value))
                                 : RemoveKeyNoSave(section, key);
}

bool ConfigManager::SetStringList(const std::string& section, const std::string& key,
                                  const std::vector<std::string>& list, char separator) {
    return SetString(section, key, JoinList(list, separator));
}

bool ConfigManager::SetStringListNoSave(const std::string& section, const std::string& key,
                                        const std::vector<std::string>& list, char separator) {
    return SetStringNoSave(section, key, JoinList(list, separator));
}

std::vector<std::string> ConfigManager::GetStringList(const std::string& section,
                                                      const std::string& key,
                                                      const std::vector<std::string>& defaultList,
                                                      char separator) {
    if (!KeyExists(section, key)) {
        return defaultList;
    }
    return SplitList(GetString(section, key, std::string()), separator);
}

std::string ConfigManager::JoinList(const std::vector<std::string>& list, char separator) {
    std::string text;
    for (const std::string& element : list) {
        text += element;
        text += separator;
    }
    return text;
}

std::vector<std::string> ConfigManager::SplitList(const std::string& text, char separator) {
    std::vector<std::string> list;
    size_t begin = 0;
    for (size_t at; (at = text.find(separator, begin)) != std::string::npos; begin = at + 1) {
        list.push_back(text.substr(begin, at - begin));
    }
    if (begin < text.size()) {
        list.push_back(text.substr(begin));
    }
    return list;
}

}  // namespace ph_fwk
