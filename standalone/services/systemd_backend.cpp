#include "standalone/services/systemd_backend.h"

#include "standalone/core/file_store.h"
#include "standalone/core/last_error.h"
#include "standalone/core/process.h"
#include "standalone/ports/port_probe.h"
#include "standalone/services/systemd_unit.h"
#include "standalone/supervise/last_words.h"

#include <algorithm>
#include <charconv>
#include <fstream>
#include <thread>
#include <utility>

namespace velt {
namespace {

using std::chrono::milliseconds;

constexpr milliseconds startLimit{4700};
constexpr milliseconds pollInterval{20};
constexpr milliseconds patience{2000};

std::string withoutLineEnd(std::string text) {
    while (!text.empty() && text.back() == '\n') {
        text.pop_back();
    }
    return text;
}

} // namespace

SystemdBackend::SystemdBackend(std::string daemon, SystemdPlaces places)
    : daemon_(std::move(daemon)), places_(std::move(places)) {}

std::string SystemdBackend::property(const std::string& name) const {
    return withoutLineEnd(
        runProcess({places_.systemctl, "show", "--value", "--property=" + name, unitName(daemon_)}).output);
}

ServiceState SystemdBackend::state() const {
    ServiceState state;
    const auto unit = readFile(places_.units / unitName(daemon_));
    if (!unit) {
        return state; // we never started it since the machine did
    }
    const DaemonPlan plan = readUnit(*unit);
    state.configurationHash = plan.configurationHash;
    state.ports = plan.listenPorts;
    const std::string active = property("ActiveState");
    if (active == "active") {
        pid_t pid = 0;
        const std::string text = property("MainPID");
        std::from_chars(text.data(), text.data() + text.size(), pid);
        state.daemon = identifyProcess(pid).value_or(ProcessId{});
        state.state = RunState::running;
    } else if (active == "failed" || active == "activating") {
        state.state = RunState::failed;
        state.reason = reasonInJournal();
    }
    return state;
}

int SystemdBackend::start(const DaemonPlan& plan) {
    const auto deadline = Clock::now() + startLimit;
    const ServiceState now = state();
    if (isServing(now) && now.configurationHash == plan.configurationHash) {
        return 0;
    }
    if (probePorts(plan.listenPorts, now.daemon.pid) < 0 || writeUnit(plan) < 0) {
        return -1;
    }
    const ProcessResult started =
        runProcess({places_.systemctl, "restart", unitName(daemon_)}, {},
                   std::chrono::duration_cast<milliseconds>(deadline - Clock::now()));
    if (started.exitCode != 0) {
        return failedToStart(daemon_, lastWords(started.errors));
    }
    return waitUntilServing(deadline);
}

int SystemdBackend::writeUnit(const DaemonPlan& plan) const {
    const std::filesystem::path file = places_.units / unitName(daemon_);
    if (replaceFile(file, renderUnit(daemon_, plan), 0644) < 0) {
        return -1;
    }
    const ProcessResult reloaded = runProcess({places_.systemctl, "daemon-reload"});
    return reloaded.exitCode == 0 ? 0 : failedToStart(daemon_, lastWords(reloaded.errors));
}

int SystemdBackend::waitUntilServing(Clock::time_point deadline) const {
    for (;;) {
        const ServiceState now = state();
        if (isServing(now)) {
            return 0;
        }
        const bool late = Clock::now() >= deadline;
        if (now.state == RunState::failed || late) {
            const std::string words = reasonInJournal();
            runProcess({places_.systemctl, "stop", unitName(daemon_)});
            return failedToStart(daemon_, late && words.empty() ? "it does not listen in time" : words);
        }
        std::this_thread::sleep_for(pollInterval);
    }
}

std::string SystemdBackend::reasonInJournal() const {
    return lastWords(runProcess({places_.journalctl, "--unit=" + unitName(daemon_), "--lines=5",
                                 "--output=cat", "--no-pager"})
                         .output);
}

int SystemdBackend::endListener() const {
    std::error_code error;
    if (!std::filesystem::exists(places_.units / unitName(daemon_), error)) {
        return 0;
    }
    const ProcessResult stopped = runProcess({places_.systemctl, "stop", unitName(daemon_)});
    if (stopped.exitCode != 0) {
        return fail(ErrorNumber::daemon,
                    daemonTitle(daemon_) + " cannot be stopped: " + lastWords(stopped.errors) + ".");
    }
    return 0;
}

int SystemdBackend::pause() {
    return endListener();
}

int SystemdBackend::stop() {
    // Asked before the stop: an inactive unit may not tell its group any more.
    const std::string group = property("ControlGroup");
    if (endListener() < 0) {
        return -1;
    }
    const auto remaining = [this, &group] { return unitProcesses(group); };
    if (!endProcesses(remaining, patience)) {
        return fail(ErrorNumber::daemon, daemonTitle(daemon_) + " cannot be stopped: some of its sessions do "
                                                                "not end.");
    }
    return 0;
}

std::vector<ProcessId> SystemdBackend::unitProcesses(const std::string& controlGroup) const {
    std::vector<ProcessId> processes;
    // The group is looked for by the unit's own place as well: after a pause systemd has forgotten it, while
    // the sessions are still in it.
    const std::string path = controlGroup.empty() ? "/system.slice/" + unitName(daemon_) : controlGroup;
    for (const std::string& hierarchy : {std::string(), std::string("/systemd"), std::string("/unified")}) {
        std::ifstream members(places_.cgroups.string() + hierarchy + path + "/cgroup.procs");
        for (pid_t pid = 0; members >> pid;) {
            const auto process = identifyProcess(pid);
            if (process && std::find(processes.begin(), processes.end(), *process) == processes.end()) {
                processes.push_back(*process);
            }
        }
    }
    return processes;
}

} // namespace velt
