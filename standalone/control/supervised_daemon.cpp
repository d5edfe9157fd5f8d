#include "standalone/control/supervised_daemon.h"

#include "base/file.h"
#include "base/text.h"
#include "standalone/control/child_launcher.h"
#include "standalone/control/systemd_launcher.h"
#include "standalone/core/error_number.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/core/systemd.h"
#include "standalone/ports/port_probe.h"
#include "standalone/supervise/control_channel.h"

#include <syslog.h>
#include <unistd.h>

#include <chrono>
#include <optional>
#include <thread>
#include <utility>
#include <vector>

namespace velt {
namespace {

using std::chrono::milliseconds;

// An end that takes longer than this is taken out of the supervisor's hands.
constexpr milliseconds endLimit{6000};
constexpr milliseconds farewellLimit{500};
constexpr milliseconds releaseLimit{300};

std::unique_ptr<SupervisorLauncher> launcherFor(const Daemon& daemon) {
    if (systemdKeepsSupervisors()) {
        return std::make_unique<SystemdLauncher>(daemon);
    }
    return std::make_unique<ChildLauncher>(daemon.name);
}

/// Whether the process ends within a moment. A supervisor whose daemon could not be started does, and answers
/// no more.
bool isGoneSoon(const ProcessId& process) {
    const auto deadline = std::chrono::steady_clock::now() + farewellLimit;
    while (isAlive(process)) {
        if (std::chrono::steady_clock::now() >= deadline) {
            return false;
        }
        std::this_thread::sleep_for(milliseconds(2));
    }
    return true;
}

/// A session that has just begun holds its daemon's listener for a moment, even after the daemon's end.
Result<> awaitPorts(const std::vector<int>& ports, pid_t own) {
    const auto deadline = std::chrono::steady_clock::now() + releaseLimit;
    for (;;) {
        auto free = probePorts(ports, own);
        if (free || free.error().number != ErrorNumber::portTaken ||
            std::chrono::steady_clock::now() >= deadline) {
            return free;
        }
        std::this_thread::sleep_for(milliseconds(2));
    }
}

} // namespace

SupervisedDaemon::SupervisedDaemon(const Daemon& daemon) : SupervisedDaemon(daemon, launcherFor(daemon)) {}

SupervisedDaemon::SupervisedDaemon(const Daemon& daemon, std::unique_ptr<SupervisorLauncher> launcher)
    : daemon_(daemon), name_(daemon.name), launcher_(std::move(launcher)) {}

Result<SessionCount> SupervisedDaemon::start(const DaemonOrder& order, bool endSessions) {
    VELT_ASSIGN_OR_RETURN(const auto folder, runFolder());
    VELT_ASSIGN_OR_RETURN(const DaemonState now, knownState("does not start"));
    const bool supervised = isAlive(now.supervisor);
    const bool unchanged =
        supervised && isServing(now) && !order.renew && now.configurationHash == order.configurationHash;
    if (unchanged && !endSessions) {
        return SessionCount{};
    }
    VELT_RETURN_IF_ERROR(awaitPorts(order.ports, isAlive(now.daemon) ? now.daemon.pid : 0));
    const auto started = supervised ? handOver(folder, now.supervisor, {Command::start, order, endSessions})
                                    : launch(folder, order);
    return started ? started : failure("does not start", started.error().message);
}

Result<SessionCount> SupervisedDaemon::launch(const std::filesystem::path& folder, const DaemonOrder& order) {
    VELT_RETURN_IF_ERROR(launcher_->launch(folder, order));
    return SessionCount{};
}

/// Gives the order to the running supervisor.
Result<SessionCount> SupervisedDaemon::handOver(const std::filesystem::path& folder,
                                                const ProcessId& supervisor, const ControlRequest& request) {
    const DaemonOrder& order = request.order;
    const auto answer = askSupervisor(folder, name_, request, startLimit);
    if (!answer) {
        return isGoneSoon(supervisor)
                   ? launch(folder, order)
                   : Error("its supervisor, process " + std::to_string(supervisor.pid) + ", does not answer");
    }
    if (!*answer && answer->error().message == unknownRequest) { // from before an upgrade
        const auto stopped = stop();
        return stopped ? launch(folder, order) : stopped;
    }
    if (!*answer) {
        return *answer;
    }
    // The daemon serves: its start did not fail, even if a restart would use its former settings.
    if (const auto kept = launcher_->keep(folder, order); !kept) {
        ::syslog(LOG_ERR, "%s runs, but a restart would use its former settings: %s",
                 titleOf(daemon_).c_str(), kept.error().message.c_str());
    }
    return *answer;
}

Error SupervisedDaemon::failure(const std::string& what, std::string_view reason, SourcePlace where) const {
    const std::string phrase(trimmedEnd(reason, ". ")); // daemons end their sentences as they like
    return {ErrorNumber::daemon, titleOf(daemon_) + " " + what + ": " + phrase + ".", where};
}

/// Who takes a daemon that runs for one that does not leaves it behind.
Result<DaemonState> SupervisedDaemon::knownState(const std::string& what) const {
    const auto state = readDaemonState(stateFile(statePath(paths::run), name_));
    return state ? Result<DaemonState>(state->value_or(DaemonState{})) : failure(what, state.error().message);
}

Result<SessionCount> SupervisedDaemon::pause() {
    VELT_ASSIGN_OR_RETURN(const DaemonState now, knownState("cannot be paused"));
    if (!isAlive(now.supervisor)) {
        // Without a supervisor nobody could end the sessions later, once their listener is gone and no longer
        // shows which are its own.
        return stop();
    }
    const auto answer = askSupervisor(statePath(paths::run), name_, {Command::pause, {}}, endLimit);
    auto paused = answer.value_or(Error("its supervisor does not answer"));
    return paused ? paused : failure("cannot be paused", paused.error().message);
}

Result<SessionCount> SupervisedDaemon::close() {
    constexpr const char* what = "cannot be closed";
    VELT_ASSIGN_OR_RETURN(const DaemonState now, knownState(what));
    if (!isAlive(now.supervisor)) {
        return stop(); // nobody would be there to end what is left
    }
    const auto answer = askSupervisor(statePath(paths::run), name_, {Command::close, {}}, endLimit);
    auto closed = answer.value_or(Error("its supervisor does not answer"));
    if (!closed) {
        const bool isFormer = closed.error().message == unknownRequest;
        return failure(what, isFormer ? "its supervisor is of a former version, which can only end the "
                                        "sessions"
                                      : closed.error().message);
    }
    if (const auto released = launcher_->release(statePath(paths::run)); !released) {
        ::syslog(LOG_ERR, "%s", released.error().message.c_str());
    }
    return closed;
}

Result<SessionCount> SupervisedDaemon::stop() {
    VELT_ASSIGN_OR_RETURN(const DaemonState now, knownState("cannot be stopped"));
    std::optional<Result<SessionCount>> answer;
    if (isAlive(now.supervisor)) {
        answer = askSupervisor(statePath(paths::run), name_, {Command::stop, {}}, endLimit);
    }
    if (answer && !*answer) {
        return failure("cannot be stopped", answer->error().message);
    }
    if (const auto retired = launcher_->retire(); !retired) {
        return failure("cannot be stopped", retired.error().message);
    }
    // What is left: a supervisor on its last lines, one that hangs, or the daemon of one that was killed.
    DaemonState left = now;
    left.sessions.push_back(now.supervisor);
    if (!endLeftovers(left)) {
        return failure("cannot be stopped", "some of its processes did not end");
    }
    ::unlink(stateFile(statePath(paths::run), name_).c_str());
    return answer ? **answer : SessionCount{};
}

DaemonState daemonState(const Daemon& daemon) {
    return loadDaemonState(stateFile(statePath(paths::run), daemon.name)).value_or(DaemonState{});
}

Result<std::filesystem::path> runFolder() {
    const std::filesystem::path folder = statePath(paths::run);
    VELT_RETURN_IF_ERROR(makeFolder(folder));
    return folder;
}

} // namespace velt
