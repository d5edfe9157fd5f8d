#include "standalone/control/service_overview.h"

#include "standalone/control/start_failure.h"
#include "standalone/control/supervised_daemon.h"

#include <algorithm>

namespace velt {
namespace {

StoredService describe(const Daemon& daemon, std::string_view service,
                       const Result<DaemonSettings>& settings) {
    StoredService described{std::string(service), std::string(daemon.apiName), std::nullopt, std::nullopt};
    if (settings) {
        const auto found = std::ranges::find(settings->services, service, &ServiceSwitch::service);
        described.enabled = found != settings->services.end() && found->on;
        const auto port = std::ranges::find(settings->ports, false, &DaemonPorts::ofSessions);
        described.port = port != settings->ports.end() ? std::optional(port->range.first) : std::nullopt;
    }
    return described;
}

/// Why a daemon does not serve, when no start of it has failed.
std::string reasonOf(const Daemon& daemon, const DaemonState& state) {
    if (state.state == RunState::paused) {
        return titleOf(daemon) + " is paused.";
    }
    return titleOf(daemon) + " does not run" + (state.reason.empty() ? "." : ": " + state.reason + ".");
}

/// Nothing when the daemon follows its settings.
std::optional<ServiceDown> downOf(const Daemon& daemon) {
    const auto settings = daemon.settings();
    if (settings && !settings->enabled()) {
        return std::nullopt;
    }
    const DaemonState state = daemonState(daemon);
    ServiceDown down{std::string(daemon.apiName), "", isServing(state), std::string(daemon.label)};
    if (!settings) {
        down.reason = settings.error().message;
        return down;
    }
    const auto failure = startFailure(daemon);
    if (down.servesFormerSettings && !failure) {
        return std::nullopt;
    }
    down.reason = failure.value_or(reasonOf(daemon, state));
    return down;
}

} // namespace

std::vector<StoredService> storedServices() {
    std::vector<StoredService> services;
    for (const Daemon* daemon : allDaemons()) {
        const auto settings = daemon->settings();
        for (const ServiceName& name : daemon->serviceNames) {
            const bool known =
                std::ranges::find(services, name.service, &StoredService::name) != services.end();
            if (!known) {
                services.push_back(describe(*daemon, name.service, settings));
            }
        }
    }
    return services;
}

std::vector<ServiceDown> servicesDown() {
    std::vector<ServiceDown> down;
    for (const Daemon* daemon : allDaemons()) {
        if (auto found = downOf(*daemon)) {
            down.push_back(std::move(*found));
        }
    }
    return down;
}

std::map<std::string, std::uint64_t> daemonRestarts() {
    std::map<std::string, std::uint64_t> restarts;
    for (const Daemon* daemon : allDaemons()) {
        restarts[std::string(daemon->apiName)] = daemonState(*daemon).restarts;
    }
    return restarts;
}

} // namespace velt
