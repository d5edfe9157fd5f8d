#include "standalone/control/daemon_control.h"

#include "base/file.h"
#include "base/file_lock.h"
#include "base/unique_fd.h"
#include "standalone/control/operation_count.h"
#include "standalone/control/service_firewall.h"
#include "standalone/control/start_failure.h"
#include "standalone/control/supervised_daemon.h"
#include "standalone/core/error_number.h"
#include "standalone/ports/port_probe.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <string>
#include <vector>

namespace velt {
namespace {

/// One operation on a daemon at a time, over all threads and processes, as long as this lives. Not the lock
/// of the settings: a start may take seconds, in which settings can be read and written.
struct OperationLock {
    UniqueFd file;
    OperationMark mark;
};

Result<OperationLock> lockOperation(const Daemon& daemon) {
    VELT_ASSIGN_OR_RETURN(const auto folder, runFolder());
    const auto file = folder / (std::string(daemon.name) + ".operation");
    UniqueFd lock(::open(file.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, S_IRUSR | S_IWUSR));
    if (!lock) {
        return cannot("open", file);
    }
    VELT_RETURN_IF_ERROR(waitForFileLock(lock.get(), file));
    return OperationLock{std::move(lock), OperationMark(daemon)};
}

std::vector<int> listenerPorts(const DaemonSettings& settings) {
    std::vector<int> ports;
    for (const DaemonPorts& each : settings.ports) {
        if (!each.ofSessions) {
            ports.push_back(each.range.first);
        }
    }
    return ports;
}

/// Whether the stored settings want the daemon after a stop; fails when it could not be started with them.
/// Settings that cannot be read do not want it, since they must not keep anybody from stopping it. The
/// configuration's test takes time, so nothing is tested where nothing runs.
Result<bool> isWantedNext(const Daemon& daemon, const DaemonState& now) {
    const auto settings = daemon.settings();
    if (!settings || !settings->enabled()) {
        return false;
    }
    if (!isServing(now)) {
        return true;
    }
    VELT_RETURN_IF_ERROR(probePorts(listenerPorts(*settings), now.daemon.pid));
    VELT_RETURN_IF_ERROR(daemon.test());
    return true;
}

/// After a start or a stop with this outcome: the rules open the ports of what is enabled, which may have
/// changed although no port did.
Result<> followedByFirewall(Result<> outcome) {
    if (outcome) {
        followWithFirewall();
    }
    return outcome;
}

Result<> startPlanned(const Daemon& daemon) {
    VELT_ASSIGN_OR_RETURN(const auto plan, daemon.plan());
    SupervisedDaemon supervised(daemon);
    if (!plan) {
        return supervised.stop();
    }
    auto started = supervised.start(plan->order);
    if (started) {
        removeFormerPlans(*plan);
    }
    return started;
}

} // namespace

Result<> startDaemon(const Daemon& daemon) {
    VELT_ASSIGN_OR_RETURN(const auto lock, lockOperation(daemon));
    return followedByFirewall(noteOutcome(daemon, startPlanned(daemon)));
}

Result<> stopDaemon(const Daemon& daemon) {
    VELT_ASSIGN_OR_RETURN(const auto lock, lockOperation(daemon));
    VELT_RETURN_IF_ERROR(SupervisedDaemon(daemon).stop());
    return followedByFirewall(noteOutcome(daemon, {}));
}

Result<> stopDaemonForRestart(const Daemon& daemon) {
    VELT_ASSIGN_OR_RETURN(const auto lock, lockOperation(daemon));
    const auto wanted = isWantedNext(daemon, daemonState(daemon));
    if (!wanted) {
        return noteOutcome(daemon, wanted.error());
    }
    // What is still wanted is started next, and the firewall follows that.
    auto stopped = SupervisedDaemon(daemon).stop();
    return *wanted ? stopped : followedByFirewall(stopped);
}

Result<> pauseDaemon(const Daemon& daemon) {
    if (!daemon.canPause) {
        return Error(ErrorNumber::invalid, titleOf(daemon) + " cannot be paused, only stopped.");
    }
    VELT_ASSIGN_OR_RETURN(const auto lock, lockOperation(daemon));
    return SupervisedDaemon(daemon).pause();
}

bool lostItsSupervisor(const DaemonState& state) {
    const bool wasAtWork = state.state == RunState::running || state.state == RunState::failed;
    return wasAtWork && state.supervisor && !isAlive(state.supervisor);
}

Result<> restoreDaemon(const Daemon& daemon) {
    VELT_ASSIGN_OR_RETURN(const auto lock, lockOperation(daemon));
    // Another process may have restored it while the lock was waited for.
    const DaemonState now = daemonState(daemon);
    if (isServing(now) && !lostItsSupervisor(now)) {
        return {};
    }
    VELT_ASSIGN_OR_RETURN(const auto settings, daemon.settings());
    const auto done = settings.enabled() ? startPlanned(daemon) : SupervisedDaemon(daemon).stop();
    return followedByFirewall(noteOutcome(daemon, done));
}

} // namespace velt
