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

// A caller waits five seconds for a start, and needs a little of that for itself.
constexpr milliseconds startLimit{4700};
constexpr milliseconds patience{2000}; ///< between SIGTERM and SIGKILL

UniqueFd openSignals() {
    sigset_t wanted;
    sigemptyset(&wanted);
    for (const int number : {SIGCHLD, SIGTERM, SIGINT, SIGHUP}) {
        sigaddset(&wanted, number);
    }
    ::sigprocmask(SIG_BLOCK, &wanted, nullptr);
    return UniqueFd(::signalfd(-1, &wanted, SFD_CLOEXEC | SFD_NONBLOCK));
}

/// For administrators who look at the unit: it is active as long as the supervisor runs.
std::string statusLine(const DaemonState& state) {
    switch (state.state) {
    case RunState::running:
        return "STATUS=the daemon serves";
    case RunState::paused:
        return "STATUS=paused: open sessions continue";
    case RunState::failed:
        return "STATUS=the daemon does not serve: " + state.reason;
    case RunState::stopped:
        break;
    }
    return "STATUS=";
}

} // namespace

Supervisor::Supervisor(std::filesystem::path folder, std::string name, DaemonProcess::Listener listener)
    : folder_(std::move(folder)), name_(std::move(name)), daemon_(std::move(listener)) {}

Result<> Supervisor::begin(const DaemonOrder& order) {
    const auto deadline = Clock::now() + startLimit;
    VELT_RETURN_IF_ERROR(takeLock());
    ::prctl(PR_SET_CHILD_SUBREAPER, 1);
    signals_ = openSignals();
    if (!signals_) {
        return Error(std::string("cannot wait for signals: ") + std::strerror(errno));
    }
    VELT_ASSIGN_OR_RETURN(const auto former, readDaemonState(stateFile(folder_, name_)));
    if (former && !endLeftovers(*former)) {
        return Error("the former daemon, process " + std::to_string(former->daemon.pid) + ", did not end");
    }
    VELT_ASSIGN_OR_RETURN(auto control, ControlListener::open(folder_, name_));
    control_.emplace(std::move(control));
    order_ = order;
    auto started = startDaemon(deadline);
    if (started && !published_) {
        started = published_; // a daemon that nobody knows of could not be ended
    }
    if (!started) {
        control_.reset();
        endProcesses([] { return descendantsOf(::getpid()); }, patience);
        finished_ = true;
        publish(RunState::failed, started.error().message);
    }
    return started;
}

Result<> Supervisor::takeLock() {
    const std::filesystem::path file = lockFile(folder_, name_);
    lock_ = UniqueFd(::open(file.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, S_IRUSR | S_IWUSR));
    if (!lock_) {
        return Error("cannot open " + file.string() + ": " + std::strerror(errno));
    }
    return ::flock(lock_.get(), LOCK_EX | LOCK_NB) == 0 ? Result<>() : Error("it already has a supervisor");
}

Result<> Supervisor::startDaemon(Clock::time_point deadline) {
    restartAt_.reset();
    auto started = daemon_.start(order_, deadline);
    startedAt_ = Clock::now();
    publish(started ? RunState::running : RunState::failed, started ? "" : started.error().message);
    return started;
}

void Supervisor::run() {
    while (!finished_) {
        std::array<pollfd, 3> events{{{signals_.get(), POLLIN, 0},
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

Result<> Supervisor::handle(const ControlRequest& request) {
    reapChildren(); // the daemon may have ended a moment ago
    switch (request.command) {
    case Command::start:
        return replaceDaemon(request.order);
    case Command::pause:
        return pause();
    case Command::stop:
        return stop();
    }
    return Error("unknown command");
}

Result<> Supervisor::replaceDaemon(const DaemonOrder& order) {
    const auto deadline = Clock::now() + startLimit;
    const bool unchanged =
        state_ == RunState::running && daemon_.id() && order.configurationHash == order_.configurationHash;
    if (unchanged) {
        return {};
    }
    VELT_RETURN_IF_ERROR(endDaemon());
    order_ = order;
    backOff_.forget();
    // A failed start is not tried again: the caller hears of it and decides.
    return startDaemon(deadline);
}

Result<> Supervisor::pause() {
    restartAt_.reset();
    auto ended = endDaemon();
    if (ended) {
        publish(RunState::paused);
    }
    return ended;
}

Result<> Supervisor::stop() {
    restartAt_.reset();
    const bool ended = endProcesses([] { return descendantsOf(::getpid()); }, patience);
    settleDaemon();
    if (!ended) {
        return Error("some of its processes did not end");
    }
    ::unlink(stateFile(folder_, name_).c_str());
    finished_ = true;
    return {};
}

Result<> Supervisor::endDaemon() {
    const ProcessId daemon = daemon_.id();
    if (!daemon) {
        return {};
    }
    const bool ended = endProcesses(
        [&daemon] { return isAlive(daemon) ? std::vector{daemon} : std::vector<ProcessId>(); }, patience);
    settleDaemon();
    return ended ? Result<>()
                 : Error("the running daemon, process " + std::to_string(daemon.pid) + ", did not end");
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
    while (::read(signals_.get(), &signal, sizeof signal) == static_cast<ssize_t>(sizeof signal)) {
        asked = asked || signal.ssi_signo == SIGTERM || signal.ssi_signo == SIGINT;
    }
    if (asked) {
        (void)stop(); // what does not end now is left to the next supervisor
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
    const std::string reason = daemon_.ended(waitStatus).message;
    ::syslog(LOG_ERR, "%s has ended and is started again: %s", name_.c_str(), reason.c_str());
    restartAfter(Clock::now() - startedAt_);
    publish(RunState::failed, reason);
}

void Supervisor::restartDaemon() {
    ++restarts_;
    if (const auto started = startDaemon(Clock::now() + startLimit); !started) {
        ::syslog(LOG_ERR, "%s does not start: %s", name_.c_str(), started.error().message.c_str());
        restartAfter(Clock::duration::zero());
    }
}

void Supervisor::restartAfter(Clock::duration run) {
    restartAt_ = Clock::now() + backOff_.after(run);
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
    DaemonState record;
    record.state = state;
    if (!finished_) { // a supervisor that is listed but not alive counts as killed
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
    published_ = storeDaemonState(stateFile(folder_, name_), record);
    if (!published_) {
        ::syslog(LOG_ERR, "%s", published_.error().message.c_str());
    }
}

} // namespace velt
