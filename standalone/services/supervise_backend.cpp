#include "standalone/services/supervise_backend.h"

#include "standalone/core/input_wait.h"
#include "standalone/core/last_error.h"
#include "standalone/core/state_root.h"
#include "standalone/core/unique_fd.h"
#include "standalone/installed_files.h"
#include "standalone/ports/port_probe.h"
#include "standalone/supervise/control_channel.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <cstring>
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
constexpr int reportDescriptor = 3;

std::string joinPorts(const std::vector<int>& ports) {
    std::string text;
    for (const int port : ports) {
        text += (text.empty() ? "" : ",") + std::to_string(port);
    }
    return text;
}

/// Starts the program with `report` as its descriptor 3 and waits for its end, which comes at once: it goes
/// on in a child of its own. 0, or an errno.
int spawnDetached(std::vector<std::string> arguments, int report) {
    std::vector<char*> pointers;
    for (std::string& argument : arguments) {
        pointers.push_back(argument.data());
    }
    pointers.push_back(nullptr);
    std::string path = "PATH=/usr/sbin:/usr/bin:/sbin:/bin";
    std::array<char*, 2> environment{path.data(), nullptr};
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_adddup2(&actions, report, reportDescriptor);
    posix_spawnattr_t attributes;
    posix_spawnattr_init(&attributes);
    sigset_t none;
    sigemptyset(&none);
    sigset_t all;
    sigfillset(&all);
    posix_spawnattr_setsigmask(&attributes, &none);
    posix_spawnattr_setsigdefault(&attributes, &all);
    posix_spawnattr_setflags(&attributes, POSIX_SPAWN_SETSIGMASK | POSIX_SPAWN_SETSIGDEF);
    pid_t pid = 0;
    const int error =
        ::posix_spawn(&pid, pointers[0], &actions, &attributes, pointers.data(), environment.data());
    posix_spawnattr_destroy(&attributes);
    posix_spawn_file_actions_destroy(&actions);
    if (error == 0) {
        int status = 0;
        while (::waitpid(pid, &status, 0) < 0 && errno == EINTR) {
        }
    }
    return error;
}

/// What comes out of the pipe until its end; nothing when that does not come within the limit.
std::optional<std::string> readReport(int descriptor) {
    const auto deadline = std::chrono::steady_clock::now() + startLimit;
    std::string report;
    std::array<char, 4096> buffer{};
    while (waitForInput(descriptor, deadline)) {
        const ssize_t length = ::read(descriptor, buffer.data(), buffer.size());
        if (length <= 0) {
            return report;
        }
        report.append(buffer.data(), static_cast<std::size_t>(length));
    }
    return std::nullopt;
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

} // namespace

SuperviseBackend::SuperviseBackend(std::string daemon) : daemon_(std::move(daemon)) {}

ServiceState SuperviseBackend::state() const {
    return readServiceState(stateFile(statePath("/run/velt"), daemon_)).value_or(ServiceState{});
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
    if (probePorts(plan.listenPorts, isAlive(now.daemon) ? now.daemon.pid : 0) < 0) {
        return -1;
    }
    if (!supervised) {
        return launchSupervisor(directory, plan);
    }
    const ControlRequest request{Command::start, {plan.configurationHash, plan.listenPorts, plan.arguments}};
    const auto answer = askSupervisor(directory, daemon_, request, startLimit);
    if (!answer && isGoneSoon(now.supervisor)) {
        return launchSupervisor(directory, plan);
    }
    if (!answer) {
        return failToStart("its supervisor, process " + std::to_string(now.supervisor.pid) +
                           ", does not answer");
    }
    return answer->empty() ? 0 : failToStart(*answer);
}

int SuperviseBackend::launchSupervisor(const std::filesystem::path& directory, const DaemonPlan& plan) const {
    std::array<int, 2> ends{-1, -1};
    if (::pipe2(ends.data(), O_CLOEXEC) != 0) {
        return failToStart(std::strerror(errno));
    }
    const UniqueFd readEnd(ends[0]);
    UniqueFd writeEnd(ends[1]);
    const std::string program = installedFile("velt-supervise").string();
    std::vector<std::string> arguments{program, directory.string(), daemon_, plan.configurationHash,
                                       joinPorts(plan.listenPorts)};
    arguments.insert(arguments.end(), plan.arguments.begin(), plan.arguments.end());
    if (const int error = spawnDetached(std::move(arguments), writeEnd.get()); error != 0) {
        return failToStart(program + " cannot be started: " + std::strerror(error));
    }
    writeEnd.reset();
    const auto report = readReport(readEnd.get());
    constexpr std::string_view failure = "failed ";
    if (!report) {
        return failToStart("its supervisor does not report in time");
    }
    if (*report == "ready") {
        return 0;
    }
    return failToStart(report->starts_with(failure) ? report->substr(failure.size())
                                                    : "its supervisor ended without a reason");
}

int SuperviseBackend::failToStart(const std::string& reason) const {
    return failedToStart(daemon_, reason);
}

int SuperviseBackend::pause() {
    const ServiceState now = state();
    if (isAlive(now.supervisor)) {
        const auto answer = askSupervisor(statePath("/run/velt"), daemon_, {Command::pause, {}}, endLimit);
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
        answer = askSupervisor(statePath("/run/velt"), daemon_, {Command::stop, {}}, endLimit);
    }
    if (answer && !answer->empty()) {
        return fail(ErrorNumber::daemon, daemonTitle(daemon_) + " cannot be stopped: " + *answer + ".");
    }
    // What is left: a supervisor on its last lines, one that hangs, or the daemon of one that was killed.
    ServiceState left = now;
    left.sessions.push_back(now.supervisor);
    if (!endLeftovers(left)) {
        return fail(ErrorNumber::daemon, daemonTitle(daemon_) + " cannot be stopped: some of its processes "
                                                                "do not end.");
    }
    std::error_code ignored;
    std::filesystem::remove(stateFile(statePath("/run/velt"), daemon_), ignored);
    return 0;
}

} // namespace velt
