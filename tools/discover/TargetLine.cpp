#include "tools/discover/TargetLine.h"

#include <avahi-common/malloc.h>

namespace qv::tools::discover {

std::string TxtValue(AvahiStringList* txt, const char* key) {
    AvahiStringList* item = avahi_string_list_find(txt, key);
    if (item == nullptr) {
        return "-";
    }
    char* foundKey = nullptr;
    char* value = nullptr;
    size_t size = 0;
    if (avahi_string_list_get_pair(item, &foundKey, &value, &size) != 0) {
        return "-";
    }
    std::string text = value != nullptr ? std::string(value, size) : std::string();
    avahi_free(foundKey);
    avahi_free(value);
    return text;
}

std::string FormatTarget(const Target& target) {
    return target.name + '\t' + target.host + '\t' + target.address + '\t' +
           std::to_string(target.port) + "\tMAC=" + target.mac +
           "\tsupportTolvane=" + target.supportTolvane;
}

}  // namespace qv::tools::discover
