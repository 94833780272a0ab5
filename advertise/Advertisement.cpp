#include "advertise/Advertisement.h"

#include "advertise/MdnsError.h"
#include "advertise/TxtList.h"
#include "config/ConfigManager_qvini.h"

#include <new>
#include <string>

namespace qv::variable::remoteconfig {

const char kAdvertisedType[] = "_qv-iovar._tcp";
const char kAdvertisedDomain[] = "local";
const char kInstanceSuffix[] = " qv_variable_iotolvane";

namespace {

// The plug-in's one announcement; null while nothing is announced.
MdnsService* g_pAdvertisement = nullptr;

}  // namespace

std::string AdvertisedInstanceName(const std::string& hostName) {
    return (hostName.empty() ? std::string("unknown") : hostName) + kInstanceSuffix;
}

int StartAdvertisementFrom(ph_fwk::ConfigManager& config) {
    if (g_pAdvertisement != nullptr) {
        return kMdnsOk;  // the wrapper has one client per process; keep the running one
    }
    try {
        const std::string name =
            AdvertisedInstanceName(config.GetString("SYSTEMSETTINGS", "Host_Name", ""));
        AvahiStringList* txt = nullptr;
        TxtListNew(&txt);
        static const std::uint8_t kYes[] = {'y', 'e', 's'};
        TxtListAddPair(&txt, "supportTolvane", 3, kYes);  // on failure only "MAC" is announced
        int result = MdnsServiceStart(name.c_str(), kAdvertisedType, kAdvertisedDomain,
                                      kAdvertisedPort, &txt, &g_pAdvertisement);
        TxtListFree(&txt);
        return result;
    } catch (const std::bad_alloc&) {
        return kMdnsNoMemory;
    }
}

void StartAdvertisement() { StartAdvertisementFrom(ph_fwk::GetSystemConfig()); }

void StopAdvertisement() {
    MdnsServiceStop(g_pAdvertisement);
    g_pAdvertisement = nullptr;
}

MdnsService* CurrentAdvertisement() { return g_pAdvertisement; }

}  // namespace qv::variable::remoteconfig
