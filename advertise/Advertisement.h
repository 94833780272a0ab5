// The plug-in's two advertisement steps: StartAdvertisement (run by Init) announces
// "<host name> qv_variable_iotolvane" as "_qv-iovar._tcp" on port 80 with the TXT pairs
// "supportTolvane"="yes" and "MAC"; StopAdvertisement (run by Finalize) withdraws it.
//
// Threads: both are called under the plug-in's initialisation lock, never concurrently.
// Failure: an announcement that cannot be made is not an error of the plug-in: the steps
// return nothing and the process-wide record pointer stays null.
#pragma once

#include "advertise/MdnsService.h"

#include <string>

namespace ph_fwk {
class ConfigManager;
}

namespace qv::variable::remoteconfig {

// The announced service type, domain, port and instance-name suffix.
extern const char kAdvertisedType[];
extern const char kAdvertisedDomain[];
constexpr std::uint16_t kAdvertisedPort = 80;
extern const char kInstanceSuffix[];

// Reads Host_Name of SYSTEMSETTINGS from the system configuration and starts the
// announcement. Does nothing while an announcement is already running.
void StartAdvertisement();

// Stops the announcement, if any, and clears the process-wide pointer.
void StopAdvertisement();

// StartAdvertisement over the given configuration; returns the publisher's result (0, or a
// publisher code; kMdnsOk also when an announcement was already running).
int StartAdvertisementFrom(ph_fwk::ConfigManager& config);

// The instance name for a host name: "unknown" stands in for an empty one.
std::string AdvertisedInstanceName(const std::string& hostName);

// The running announcement, or null. For diagnostics and tests; read it only from the thread
// that starts and stops.
MdnsService* CurrentAdvertisement();

}  // namespace qv::variable::remoteconfig
