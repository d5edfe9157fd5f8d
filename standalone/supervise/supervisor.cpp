#include "standalone/supervise/supervisor.h"

#include "standalone/supervise/service_manager.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/file.h>
#include <sys/prctl.h>
#include <sys/signalfd.h>
#include <sys/wait.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <utility>

namespace velt {
namespace {

using std::chrono::milliseconds;

// A caller waits five seconds for a start; what it must do besides needs a little of that.
constexpr milliseconds startLimit{4700};
constexpr milliseconds shortestBackOff{100};
constexpr milliseconds longestBackOff{30000};
constexpr milliseconds steadyRun{10000}; ///< a daemon that ran this long is not in a loop of crashes
constexpr milliseconds patience{2000};   ///< between SIGTERM and SIGKILL

int openSignals() {
    sigset_t wanted;
    sigemptyset(&wanted);
    for (const int number : {SIGCHLD, SIGTERM, SIGINT, SIGHUP}) {
        sigaddset(&wanted, number);
    }
    ::sigprocmask(SIG_BLOCK, &wanted, nullptr);
    return ::signalfd(-1, &wanted, SFD_CLOEXEC | SFD_NONBLOCK);
}

/// For those who look at the unit and find it active: that is the supervisor.
std::string statusLine(const ServiceState& state) {
    switch (state.state) {
    case RunState::running:
        return "STATUS=the daemon serves";
    case RunState::paused:
        return "STATUS=paused, only sessions of before go on";
    case RunState::failed:
        return "STATUS=the daemon does not serve: " + state.reason;
    case RunState::stopped:
        break;
    }
    return "STATUS=";
}

} // namespace

Supervisor::Supervisor(std::filesystem::path directory, std::string service)
    : directory_(std::move(directory)), service_(std::move(service)), backOff_(shortestBackOff) {}

Supervisor::~Supervisor() {
    if (signals_ >= 0) {
        ::close(signals_);
    }
    if (lock_ >= 0) {
        ::close(lock_);
    }
}

std::string Supervisor::begin(const DaemonOrder& order) {
    const auto deadline = Clock::now() + startLimit;
    if (!takeLock()) {
        return "another supervisor of this service runs";
    }
    ::prctl(PR_SET_CHILD_SUBREAPER, 1);
    signals_ = openSignals();
    const auto former = readServiceState(stateFile(directory_, service_));
    if (former && !endLeftovers(*former)) {
        return "the former daemon, process " + std::to_string(former->daemon.pid) + ", does not end";
    }
    control_.emplace(directory_, service_);
    if (signals_ < 0 || control_->descriptor() < 0) {
        return "the supervisor cannot make its control socket in " + directory_.string();
    }
    order_ = order;
    std::string reason = startDaemon(deadline);
    if (!reason.empty()) {
        control_.reset();
        endProcesses([] { return descendantsOf(::getpid()); }, patience);
        finished_ = true;
        publish(RunState::failed, reason);
    }
    return reason;
}

bool Supervisor::takeLock() {
    const std::filesystem::path file = lockFile(directory_, service_);
    lock_ = ::open(file.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, S_IRUSR | S_IWUSR);
    return lock_ >= 0 && ::flock(lock_, LOCK_EX | LOCK_NB) == 0;
}

std::string Supervisor::startDaemon(Clock::time_point deadline) {
    restartAt_.reset();
    std::string reason = daemon_.start(order_, deadline);
    startedAt_ = Clock::now();
    publish(reason.empty() ? RunState::running : RunState::failed, reason);
    return reason;
}

void Supervisor::run() {
    while (!finished_) {
        std::array<pollfd, 3> events{{{signals_, POLLIN, 0},
                                      {control_->descriptor(), POLLIN, 0},
                                      {daemon_.outputDescriptor(), POLLIN, 0}}};
        ::poll(events.data(), events.size(), millisecondsToRestart());
        if (events[2].revents != 0) {
            daemon_.readOutput();
        }
        if (events[0].revents != 0) {
            onSignals();
        }
        if (events[1].revents != 0 && !finished_) {
            control_->serve([this](const ControlRequest& request) { return handle(request); });
        }
        if (restartAt_ && Clock::now() >= *restartAt_ && !finished_) {
            restartDaemon();
        }
    }
}

std::string Supervisor::handle(const ControlRequest& request) {
    reapChildren(); // the daemon may have ended a moment ago
    switch (request.command) {
    case Command::start:
        return replaceDaemon(request.order);
    case Command::pause:
        return pause();
    case Command::stop:
        return stop();
    }
    return "the command is unknown";
}

std::string Supervisor::replaceDaemon(const DaemonOrder& order) {
    const auto deadline = Clock::now() + startLimit;
    const bool unchanged =
        state_ == RunState::running && daemon_.id() && order.configurationHash == order_.configurationHash;
    if (unchanged) {
        return "";
    }
    if (!endDaemon()) {
        return "the former daemon, process " + std::to_string(daemon_.id().pid) + ", does not end";
    }
    order_ = order;
    backOff_ = shortestBackOff;
    // A failed start is not tried again: whoever asked for it hears of it and decides.
    return startDaemon(deadline);
}

std::string Supervisor::pause() {
    restartAt_.reset();
    if (!endDaemon()) {
        return "the daemon, process " + std::to_string(daemon_.id().pid) + ", does not end";
    }
    publish(RunState::paused);
    return "";
}

std::string Supervisor::stop() {
    restartAt_.reset();
    const bool ended = endProcesses([] { return descendantsOf(::getpid()); }, patience);
    settleDaemon();
    if (!ended) {
        return "some of its processes do not end";
    }
    std::error_code ignored;
    std::filesystem::remove(stateFile(directory_, service_), ignored);
    finished_ = true;
    return "";
}

bool Supervisor::endDaemon() {
    const ProcessId daemon = daemon_.id();
    if (!daemon) {
        return true;
    }
    const bool ended = endProcesses(
        [&daemon] { return isAlive(daemon) ? std::vector{daemon} : std::vector<ProcessId>(); }, patience);
    settleDaemon();
    return ended;
}

/// Takes note of an end that was asked for, before reapChildren() sees it and has the daemon started again.
void Supervisor::settleDaemon() {
    int status = 0;
    if (daemon_.id() && ::waitpid(daemon_.id().pid, &status, WNOHANG) == daemon_.id().pid) {
        daemon_.ended(status);
    }
}

void Supervisor::onSignals() {
    signalfd_siginfo signal{};
    bool asked = false;
    while (::read(signals_, &signal, sizeof signal) == static_cast<ssize_t>(sizeof signal)) {
        asked = asked || signal.ssi_signo == SIGTERM || signal.ssi_signo == SIGINT;
    }
    if (asked) {
        stop();
        finished_ = true;
        return;
    }
    reapChildren();
}

void Supervisor::reapChildren() {
    int status = 0;
    for (pid_t pid = ::waitpid(-1, &status, WNOHANG); pid > 0; pid = ::waitpid(-1, &status, WNOHANG)) {
        if (pid == daemon_.id().pid) {
            onDaemonEnd(status);
        }
    }
}

void Supervisor::onDaemonEnd(int waitStatus) {
    const std::string reason = daemon_.ended(waitStatus);
    if (Clock::now() - startedAt_ >= steadyRun) {
        backOff_ = shortestBackOff;
    }
    ::syslog(LOG_ERR, "the daemon of %s is started again: %s", service_.c_str(), reason.c_str());
    restartAt_ = Clock::now() + backOff_;
    backOff_ = std::min(backOff_ * 2, longestBackOff);
    publish(RunState::failed, reason);
}

void Supervisor::restartDaemon() {
    ++restarts_;
    const std::string reason = startDaemon(Clock::now() + startLimit);
    if (!reason.empty()) {
        ::syslog(LOG_ERR, "the daemon of %s does not start: %s", service_.c_str(), reason.c_str());
        restartAt_ = Clock::now() + backOff_;
        backOff_ = std::min(backOff_ * 2, longestBackOff);
    }
}

int Supervisor::millisecondsToRestart() const {
    if (!restartAt_) {
        return -1;
    }
    const auto left = std::chrono::duration_cast<milliseconds>(*restartAt_ - Clock::now());
    return static_cast<int>(std::max<milliseconds::rep>(left.count() + 1, 0));
}

void Supervisor::publish(RunState state, std::string reason) {
    state_ = state;
    ServiceState record;
    record.state = state;
    if (!finished_) { // who is named there and gone was killed
        record.supervisor = identifyProcess(::getpid()).value_or(ProcessId{});
    }
    record.daemon = daemon_.id();
    record.configurationHash = order_.configurationHash;
    record.ports = order_.ports;
    record.restarts = restarts_;
    record.sessions = descendantsOf(::getpid());
    std::erase(record.sessions, daemon_.id());
    record.reason = std::move(reason);
    tellServiceManager(statusLine(record));
    if (!writeServiceState(stateFile(directory_, service_), record)) {
        ::syslog(LOG_ERR, "the state of %s cannot be written: %s", service_.c_str(), std::strerror(errno));
    }
}

} // namespace velt
