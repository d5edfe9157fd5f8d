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

void removeFormerPlans(const DaemonPlan& plan, std::chrono::seconds spared) {
    if (plan.folder.empty()) {
        return;
    }
    // What cannot be removed takes a little room until the next time, no more.
    std::error_code ignored;
    const auto oldest = std::filesystem::file_time_type::clock::now() - spared;
    for (std::filesystem::directory_iterator entry(plan.folder.parent_path(), ignored), end;
         !ignored && entry != end; entry.increment(ignored)) {
        std::error_code stays;
        if (entry->path() != plan.folder && entry->last_write_time(stays) <= oldest) {
            std::filesystem::remove_all(entry->path(), stays);
        }
    }
}

void setAside(const std::filesystem::path& plan) {
    std::error_code ignored;
    std::filesystem::last_write_time(plan, std::filesystem::file_time_type::clock::now(), ignored);
}

std::string titleOf(const Daemon& daemon) {
    return "The " + std::string(daemon.label) + " daemon";
}

} // namespace velt
