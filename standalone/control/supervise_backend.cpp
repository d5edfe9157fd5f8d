#include "standalone/control/supervise_backend.h"

#include "standalone/control/child_launcher.h"
#include "standalone/core/boundary.h"
#include "standalone/core/last_error.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/ports/port_probe.h"
#include "standalone/supervise/control_channel.h"

#include <syslog.h>

#include <chrono>
#include <optional>
#include <thread>
#include <utility>

namespace velt {
namespace {

using std::chrono::milliseconds;

// A start is promised to be over within five seconds, of which the supervisor allows itself a little less. An
// end that takes longer than this is taken out of the supervisor's hands.
constexpr milliseconds startLimit{4900};
constexpr milliseconds endLimit{6000};
constexpr milliseconds farewellLimit{500};

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

} // namespace

SuperviseBackend::SuperviseBackend(std::string daemon)
    : daemon_(std::move(daemon)), launcher_(std::make_unique<ChildLauncher>(daemon_)) {}

SuperviseBackend::SuperviseBackend(std::string daemon, std::unique_ptr<SupervisorLauncher> launcher)
    : daemon_(std::move(daemon)), launcher_(std::move(launcher)) {}

ServiceState SuperviseBackend::state() const {
    return readServiceState(stateFile(statePath(paths::run), daemon_)).value_or(ServiceState{});
}

int SuperviseBackend::start(const DaemonPlan& plan) {
    const std::filesystem::path directory = runDirectory();
    if (directory.empty()) {
        return -1;
    }
    const ServiceState now = state();
    const bool supervised = isAlive(now.supervisor);
    if (supervised && isServing(now) && now.configurationHash == plan.configurationHash) {
        return 0;
    }
    if (toContract(probePorts(plan.listenPorts, isAlive(now.daemon) ? now.daemon.pid : 0)) < 0) {
        return -1;
    }
    if (!supervised) {
        return outcome(launcher_->launch(directory, plan));
    }
    const ControlRequest request{Command::start, {plan.configurationHash, plan.listenPorts, plan.arguments}};
    const auto answer = askSupervisor(directory, daemon_, request, startLimit);
    if (!answer && isGoneSoon(now.supervisor)) {
        return outcome(launcher_->launch(directory, plan));
    }
    if (!answer) {
        return failedToStart(daemon_, "its supervisor, process " + std::to_string(now.supervisor.pid) +
                                          ", does not answer");
    }
    if (answer->empty()) {
        keep(directory, plan);
    }
    return outcome(*answer);
}

/// The daemon serves; that it would not come back as it is now is no failure of its start.
void SuperviseBackend::keep(const std::filesystem::path& directory, const DaemonPlan& plan) {
    if (const std::string reason = launcher_->keep(directory, plan); !reason.empty()) {
        ::syslog(LOG_ERR, "%s would come back with former settings: %s", daemonTitle(daemon_).c_str(),
                 reason.c_str());
    }
}

int SuperviseBackend::outcome(const std::string& reason) const {
    return reason.empty() ? 0 : failedToStart(daemon_, reason);
}

int SuperviseBackend::pause() {
    const ServiceState now = state();
    if (isAlive(now.supervisor)) {
        const auto answer = askSupervisor(statePath(paths::run), daemon_, {Command::pause, {}}, endLimit);
        if (answer && answer->empty()) {
            return 0;
        }
        return fail(ErrorNumber::daemon, daemonTitle(daemon_) + " cannot be paused: " +
                                             answer.value_or("its supervisor does not answer") + ".");
    }
    // Without a supervisor nobody could end the sessions later, once their listener is gone and no longer
    // shows which are its own.
    return stop();
}

int SuperviseBackend::stop() {
    const ServiceState now = state();
    std::optional<std::string> answer;
    if (isAlive(now.supervisor)) {
        answer = askSupervisor(statePath(paths::run), daemon_, {Command::stop, {}}, endLimit);
    }
    const std::string reason = answer && !answer->empty() ? *answer : launcher_->retire();
    if (!reason.empty()) {
        return fail(ErrorNumber::daemon, daemonTitle(daemon_) + " cannot be stopped: " + reason + ".");
    }
    // What is left: a supervisor on its last lines, one that hangs, or the daemon of one that was killed.
    ServiceState left = now;
    left.sessions.push_back(now.supervisor);
    if (!endLeftovers(left)) {
        return fail(ErrorNumber::daemon, daemonTitle(daemon_) + " cannot be stopped: some of its processes "
                                                                "do not end.");
    }
    std::error_code ignored;
    std::filesystem::remove(stateFile(statePath(paths::run), daemon_), ignored);
    return 0;
}

} // namespace velt
