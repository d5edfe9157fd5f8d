#include "standalone/daemons/daemon.h"

#include <algorithm>
#include <array>

namespace velt {

bool DaemonSettings::enabled() const {
    return std::ranges::any_of(services, &ServiceSwitch::on);
}

std::span<const Daemon* const> allDaemons() {
    static constexpr std::array table{&ftpDaemon, &sftpDaemon};
    return table;
}

const Daemon* daemonServing(std::string_view nameInContract) {
    for (const Daemon* daemon : allDaemons()) {
        for (const ServiceName& name : daemon->serviceNames) {
            if (name.inContract == nameInContract) {
                return daemon;
            }
        }
    }
    return nullptr;
}

bool isOn(const Daemon& daemon, const DaemonSettings& settings, std::string_view nameInContract) {
    const auto name = std::ranges::find(daemon.serviceNames, nameInContract, &ServiceName::inContract);
    return name != daemon.serviceNames.end() &&
           std::ranges::any_of(settings.services, [&](const ServiceSwitch& each) {
               return each.on && each.service == name->service;
           });
}

std::string titleOf(const Daemon& daemon) {
    return "The " + std::string(daemon.label) + " daemon";
}

} // namespace velt
