#include "standalone/control/intended_ports.h"

#include "standalone/control/supervised_daemon.h"

#include <algorithm>
#include <utility>

namespace velt {

namespace {

const IntendedPorts*& intended() {
    thread_local const IntendedPorts* ports = nullptr;
    return ports;
}

} // namespace

WithIntendedPorts::WithIntendedPorts(IntendedPorts ports) : ports_(std::move(ports)) {
    intended() = &ports_;
}

WithIntendedPorts::~WithIntendedPorts() {
    intended() = nullptr;
}

Result<std::vector<DaemonPorts>> portsToBe(const Daemon& daemon) {
    VELT_ASSIGN_OR_RETURN(auto settings, daemon.settings());
    const IntendedPorts* const wanted = intended();
    if (wanted == nullptr) {
        return std::move(settings.ports);
    }
    const std::string name(daemon.apiName);
    const auto listener = wanted->listeners.find(name);
    const auto range = wanted->ofSessions.find(name);
    for (DaemonPorts& ports : settings.ports) {
        if (!ports.ofSessions && listener != wanted->listeners.end()) {
            ports.range = {listener->second, listener->second};
        } else if (ports.ofSessions && range != wanted->ofSessions.end()) {
            ports.range = range->second;
        }
    }
    return std::move(settings.ports);
}

bool isGivenUp(int port, const Daemon& asking) {
    if (intended() == nullptr) {
        return false;
    }
    return std::ranges::any_of(allDaemons(), [&](const Daemon* daemon) {
        if (daemon == &asking || std::ranges::count(daemonState(*daemon).ports, port) == 0) {
            return false;
        }
        const auto ports = portsToBe(*daemon);
        return ports && std::ranges::none_of(*ports, [port](const DaemonPorts& each) {
                   return each.range.first <= port && port <= each.range.last;
               });
    });
}

} // namespace velt
