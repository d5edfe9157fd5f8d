#include "standalone/daemons/daemon.h"

#include <algorithm>
#include <array>
#include <system_error>

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

void removeFormerPlans(const DaemonPlan& plan) {
    if (plan.folder.empty()) {
        return;
    }
    // What cannot be removed takes a little room until the next time, no more.
    std::error_code ignored;
    for (std::filesystem::directory_iterator entry(plan.folder.parent_path(), ignored), end;
         !ignored && entry != end; entry.increment(ignored)) {
        if (entry->path() != plan.folder) {
            std::error_code stays;
            std::filesystem::remove_all(entry->path(), stays);
        }
    }
}

std::string titleOf(const Daemon& daemon) {
    return "The " + std::string(daemon.label) + " daemon";
}

} // namespace velt
