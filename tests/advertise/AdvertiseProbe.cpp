// advertise_probe: drives StartAdvertisement/StopAdvertisement for the end-to-end test,
// one command per line on stdin, one answer per line on stdout:
//   start -> "start <code>"   (the publisher's result; 0 when announced)
//   name  -> "name <current instance name>" or "name -" when nothing is announced
//   stop  -> "stopped"
// At end of input the announcement is stopped.
#include "advertise/Advertisement.h"
#include "config/ConfigManager_qvini.h"
#include "platform/avahi_client/qvAvahiClient.h"

#include <iostream>
#include <string>

using namespace qv::variable::remoteconfig;

int main() {
    std::string command;
    while (std::getline(std::cin, command)) {
        if (command == "start") {
            std::cout << "start " << StartAdvertisementFrom(ph_fwk::GetSystemConfig()) << std::endl;
        } else if (command == "name") {
            std::string name = "-";
            if (MdnsService* service = CurrentAdvertisement()) {
                // The poll thread renames the service on collisions.
                AvahiThreadedPollLock(0);
                name = service->name;
                AvahiThreadedPollUnlock(0);
            }
            std::cout << "name " << name << std::endl;
        } else if (command == "stop") {
            StopAdvertisement();
            std::cout << "stopped" << std::endl;
        } else {
            std::cout << "unknown command" << std::endl;
        }
    }
    StopAdvertisement();
    return 0;
}
