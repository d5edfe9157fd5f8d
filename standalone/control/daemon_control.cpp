#include "standalone/control/daemon_control.h"

#include "base/file.h"
#include "base/file_lock.h"
#include "base/unique_fd.h"
#include "standalone/control/intended_ports.h"
#include "standalone/control/operation_count.h"
#include "standalone/control/pending_stops.h"
#include "standalone/control/service_firewall.h"
#include "standalone/control/start_failure.h"
#include "standalone/control/supervised_daemon.h"
#include "standalone/core/error_number.h"
#include "standalone/ports/port_probe.h"
#include "standalone/process/replaced_programs.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <string>
#include <vector>

namespace velt {
namespace {

// Within this time who has connected has logged in, or is disconnected.
constexpr std::chrono::seconds loginLimit{60};

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

/// The ports on which the daemon is to listen; without those that another of our daemons is about to give up.
std::vector<int> listenerPorts(const Daemon& daemon, const DaemonSettings& settings) {
    std::vector<int> ports;
    for (const DaemonPorts& each : settings.ports) {
        if (!each.ofSessions && !isGivenUp(each.range.first, daemon)) {
            ports.push_back(each.range.first);
        }
    }
    return ports;
}

Result<> checkStartable(const Daemon& daemon, const DaemonSettings& settings, const DaemonState& now) {
    VELT_RETURN_IF_ERROR(
        probePorts(listenerPorts(daemon, settings), isAlive(now.daemon) ? now.daemon.pid : 0));
    VELT_ASSIGN_OR_RETURN([[maybe_unused]] const auto hash, daemon.test());
    return {};
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
    VELT_RETURN_IF_ERROR(checkStartable(daemon, *settings, now));
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

/// Notes what became of the sessions, for those who want to know at the end of the request.
Result<> counted(const Daemon& daemon, const Result<SessionCount>& done) {
    if (!done) {
        return done.error();
    }
    pendingStops().count(daemon, *done);
    return {};
}

/// Whether the sessions end that the daemon has when it takes up the plan.
bool endsSessions(const Daemon& daemon, const DaemonPlan& plan, const std::string& former) {
    const PendingStops& request = pendingStops();
    if (request.policy != SessionPolicy::byChange) {
        return request.policy == SessionPolicy::end && !request.ended.contains(&daemon);
    }
    return !former.empty() && former != plan.order.configurationHash &&
           daemon.takesRights(plan.folder.parent_path() / former, plan.folder);
}

/// A supervisor goes on with its own program when that is replaced. Only a start of both brings the new one,
/// and ends the sessions: so where they end, and nowhere else.
Result<SessionCount> start(const Daemon& daemon, const DaemonOrder& order, bool endsSessions) {
    SupervisedDaemon supervised(daemon);
    const DaemonState state = daemonState(daemon);
    if (!endsSessions || !isAlive(state.supervisor) || !replacedFileOf(state.supervisor.pid)) {
        return supervised.start(order, endsSessions);
    }
    VELT_ASSIGN_OR_RETURN(const auto ended, supervised.stop());
    VELT_ASSIGN_OR_RETURN([[maybe_unused]] const auto none, supervised.start(order, false));
    return ended;
}

Result<> startPlanned(const Daemon& daemon, bool renew = false) {
    VELT_ASSIGN_OR_RETURN(auto plan, daemon.plan());
    if (!plan) {
        return counted(daemon, SupervisedDaemon(daemon).stop());
    }
    plan->order.renew = renew;
    const std::string former = daemonState(daemon).configurationHash;
    auto started = counted(daemon, start(daemon, plan->order, endsSessions(daemon, *plan, former)));
    if (started) {
        if (pendingStops().isOpen()) {
            pendingStops().ended.insert(&daemon);
        }
        if (!former.empty() && former != plan->order.configurationHash) {
            setAside(plan->folder.parent_path() / former);
        }
        removeFormerPlans(*plan, loginLimit);
    }
    return started;
}

/// Whether the end waits, since the thread's request may still have the daemon go on.
bool isPutOff(const Daemon& daemon, PendingStops::Kind kind) {
    PendingStops& request = pendingStops();
    const auto settings = daemon.settings();
    const bool waits = request.isOpen() && !request.finishing && settings && settings->enabled() &&
                       isServing(daemonState(daemon));
    if (waits) {
        request.waiting.insert_or_assign(&daemon, kind);
    } else {
        request.waiting.erase(&daemon);
    }
    return waits;
}

} // namespace

Result<> startDaemon(const Daemon& daemon) {
    VELT_ASSIGN_OR_RETURN(const auto lock, lockOperation(daemon));
    pendingStops().waiting.erase(&daemon);
    return followedByFirewall(noteOutcome(daemon, startPlanned(daemon)));
}

Result<> renewDaemon(const Daemon& daemon) {
    VELT_ASSIGN_OR_RETURN(const auto lock, lockOperation(daemon));
    pendingStops().waiting.erase(&daemon);
    return followedByFirewall(noteOutcome(daemon, startPlanned(daemon, true)));
}

Result<> stopDaemon(const Daemon& daemon) {
    VELT_ASSIGN_OR_RETURN(const auto lock, lockOperation(daemon));
    if (isPutOff(daemon, PendingStops::Kind::stop)) {
        return {};
    }
    VELT_RETURN_IF_ERROR(counted(daemon, SupervisedDaemon(daemon).stop()));
    return followedByFirewall(noteOutcome(daemon, {}));
}

Result<> stopDaemonForRestart(const Daemon& daemon) {
    VELT_ASSIGN_OR_RETURN(const auto lock, lockOperation(daemon));
    const auto wanted = isWantedNext(daemon, daemonState(daemon));
    if (!wanted) {
        return noteOutcome(daemon, wanted.error());
    }
    if (isPutOff(daemon, PendingStops::Kind::stop)) {
        return {};
    }
    // What is still wanted is started next, and the firewall follows that.
    auto stopped = counted(daemon, SupervisedDaemon(daemon).stop());
    return *wanted ? stopped : followedByFirewall(stopped);
}

Result<> pauseDaemon(const Daemon& daemon) {
    if (!daemon.canPause) {
        return Error(ErrorNumber::invalid, titleOf(daemon) + " cannot be paused, only stopped.");
    }
    VELT_ASSIGN_OR_RETURN(const auto lock, lockOperation(daemon));
    if (isPutOff(daemon, PendingStops::Kind::pause)) {
        return {};
    }
    return counted(daemon, SupervisedDaemon(daemon).pause());
}

Result<> closeDaemon(const Daemon& daemon) {
    VELT_ASSIGN_OR_RETURN(const auto lock, lockOperation(daemon));
    pendingStops().waiting.erase(&daemon);
    VELT_RETURN_IF_ERROR(counted(daemon, SupervisedDaemon(daemon).close()));
    return followedByFirewall(noteOutcome(daemon, {}));
}

Result<> checkStart(const Daemon& daemon) {
    VELT_ASSIGN_OR_RETURN(const auto settings, daemon.settings());
    return settings.enabled() ? checkStartable(daemon, settings, daemonState(daemon)) : Result<>();
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
    const auto done =
        settings.enabled() ? startPlanned(daemon) : counted(daemon, SupervisedDaemon(daemon).stop());
    return followedByFirewall(noteOutcome(daemon, done));
}

} // namespace velt
