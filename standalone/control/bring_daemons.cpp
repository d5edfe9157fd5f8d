#include "standalone/control/bring_daemons.h"

#include "standalone/control/daemon_control.h"
#include "standalone/control/supervised_daemon.h"
#include "standalone/core/effects.h"
#include "standalone/core/error_number.h"

#include <algorithm>
#include <iterator>
#include <utility>

namespace velt {

namespace {

/// One of those that wait. False when none is in the way of another and can be paused.
bool makeRoom(const std::vector<const Daemon*>& waiting) {
    return std::ranges::any_of(waiting, [&](const Daemon* daemon) {
        const bool inTheWay = std::ranges::any_of(
            waiting, [&](const Daemon* other) { return other != daemon && isInTheWay(*daemon, *other); });
        return inTheWay && daemon->canPause && isServing(daemonState(*daemon)) &&
               perform(Effect::stop, daemon->name, [&] { return pauseDaemon(*daemon); });
    });
}

} // namespace

bool isInTheWay(const Daemon& daemon, const Daemon& other) {
    const auto wanted = other.settings();
    const auto ports = daemonState(daemon).ports;
    return wanted && std::ranges::any_of(wanted->ports, [&](const DaemonPorts& each) {
               return !each.ofSessions && std::ranges::count(ports, each.range.first) != 0;
           });
}

std::vector<DaemonFailure> bringDaemons(std::vector<const Daemon*> daemons,
                                        const std::function<Result<>(const Daemon&)>& bring) {
    std::vector<DaemonFailure> failures;
    while (!daemons.empty()) {
        std::vector<const Daemon*> waiting;
        std::vector<DaemonFailure> taken;
        for (const Daemon* daemon : daemons) {
            const auto done = bring(*daemon);
            if (!done && done.error().number == ErrorNumber::portTaken) {
                waiting.push_back(daemon);
                taken.push_back({daemon, done.error()});
            } else if (!done) {
                failures.push_back({daemon, done.error()});
            }
        }
        if (waiting.size() == daemons.size() && !makeRoom(waiting)) {
            std::ranges::move(taken, std::back_inserter(failures));
            break;
        }
        daemons = std::move(waiting);
    }
    return failures;
}

} // namespace velt
