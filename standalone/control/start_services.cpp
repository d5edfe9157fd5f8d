#include "standalone/control/start_services.h"

#include "base/text.h"
#include "standalone/control/bring_daemons.h"
#include "standalone/control/daemon_control.h"
#include "standalone/control/daemon_incidents.h"
#include "standalone/control/service_firewall.h"
#include "standalone/control/supervised_daemon.h"
#include "standalone/core/effects.h"

#include <syslog.h>

#include <algorithm>
#include <utility>

namespace velt {
namespace {

Result<> stop(const Daemon& daemon) {
    return perform(Effect::stop, daemon.name, [&] { return stopDaemon(daemon); });
}

/// Whether it is off, and its sessions were left to go on.
bool isLeftToItsEnd(const Daemon& daemon) {
    const DaemonState state = daemonState(daemon);
    return state.state == RunState::closed && isAlive(state.supervisor);
}

Result<> followSettings(const Daemon& daemon) {
    VELT_ASSIGN_OR_RETURN(const auto settings, daemon.settings());
    if (settings.enabled()) {
        return perform(Effect::start, daemon.name, [&] { return startDaemon(daemon); });
    }
    return isLeftToItsEnd(daemon) ? Result<>() : stop(daemon);
}

/// Does it with each daemon, or the named one, even after a failure with another one, and returns the first
/// failure.
Result<> forEachDaemon(Result<> (*act)(const Daemon&), std::string_view service = {}) {
    Result<> outcome;
    for (const Daemon* daemon : allDaemons()) {
        auto done = service.empty() || service == daemon->apiName ? act(*daemon) : Result<>();
        if (!done) {
            ::syslog(LOG_ERR, "%s", done.error().message.c_str());
            outcome = outcome ? std::move(done) : outcome;
        }
    }
    return outcome;
}

Result<> renewIfOn(const Daemon& daemon) {
    VELT_ASSIGN_OR_RETURN(const auto settings, daemon.settings());
    return settings.enabled() ? perform(Effect::restart, daemon.name, [&] { return renewDaemon(daemon); })
                              : Result<>();
}

/// Those that are on have been restarted, whether or not they had sessions.
std::vector<ServiceSessions> withIdleOnes(std::vector<ServiceSessions> counted, std::string_view service) {
    for (const Daemon* daemon : allDaemons()) {
        const bool wanted = service.empty() || service == daemon->apiName;
        const auto settings = daemon->settings();
        if (wanted && settings && settings->enabled() &&
            std::ranges::count(counted, daemon->apiName, &ServiceSessions::service) == 0) {
            counted.push_back({std::string(daemon->apiName), 0, 0});
        }
    }
    return counted;
}

std::vector<DaemonFailure> followAll() {
    followWithFirewall(); // its rules went with the boot as well
    const auto daemons = allDaemons();
    auto failures = bringDaemons({daemons.begin(), daemons.end()}, followSettings);
    for (const DaemonFailure& each : failures) {
        ::syslog(LOG_ERR, "%s", each.error.message.c_str());
    }
    return failures;
}

Result<> firstOf(const std::vector<DaemonFailure>& failures) {
    return failures.empty() ? Result<>() : Result<>(failures.front().error);
}

} // namespace

Result<> startEnabledServices() {
    return firstOf(followAll());
}

Result<> startServicesAtBoot() {
    const auto failures = followAll();
    for (const auto& [daemon, error] : failures) {
        recordIncident(*daemon, {Incident::Kind::failed, std::string(trimmedEnd(error.message, ". "))});
    }
    return firstOf(failures);
}

Result<> stopServices() {
    return forEachDaemon(stop);
}

Result<std::vector<ServiceSessions>> restartServices(SessionPolicy policy, std::string_view service) {
    ServiceRequest request(policy);
    const auto done = forEachDaemon(renewIfOn, service);
    auto sessions = request.finish();
    VELT_RETURN_IF_ERROR(done);
    VELT_ASSIGN_OR_RETURN(auto counted, std::move(sessions));
    return withIdleOnes(std::move(counted), service);
}

} // namespace velt
