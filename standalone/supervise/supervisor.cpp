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
#include <cerrno>
#include <csignal>
#include <cstring>
#include <iterator>
#include <thread>
#include <utility>

namespace velt {
namespace {

using std::chrono::milliseconds;

// A caller waits five seconds for a start, and needs a little of that for itself.
constexpr milliseconds startLimit{4700};
constexpr milliseconds patience{2000};   ///< between SIGTERM and SIGKILL
constexpr milliseconds farewell{500};    ///< of another supervisor
constexpr milliseconds returnLimit{700}; ///< for a daemon that served a moment ago

UniqueFd openSignals() {
    sigset_t wanted;
    sigemptyset(&wanted);
    for (const int number : {SIGCHLD, SIGTERM, SIGINT, SIGHUP}) {
        sigaddset(&wanted, number);
    }
    ::sigprocmask(SIG_BLOCK, &wanted, nullptr);
    return UniqueFd(::signalfd(-1, &wanted, SFD_CLOEXEC | SFD_NONBLOCK));
}

bool haveCommonPort(const DaemonOrder& one, const DaemonOrder& other) {
    return std::ranges::find_first_of(one.ports, other.ports) != one.ports.end();
}

} // namespace

Supervisor::Supervisor(std::filesystem::path folder, std::string name, DaemonProcess::Listener listener)
    : folder_(std::move(folder)), name_(std::move(name)), listener_(std::move(listener)),
      daemon_(std::make_unique<DaemonProcess>(listener_)) {}

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
    // One whose start failed is on its last lines when somebody hears of that, and starts the next.
    const auto deadline = Clock::now() + farewell;
    while (::flock(lock_.get(), LOCK_EX | LOCK_NB) != 0) {
        if (Clock::now() >= deadline) {
            return Error("it already has a supervisor");
        }
        std::this_thread::sleep_for(milliseconds(5));
    }
    return {};
}

Result<> Supervisor::startDaemon(Clock::time_point deadline) {
    restartAt_.reset();
    auto started = daemon_->start(order_, deadline, [this] {
        record(RunState::failed, reason_.empty() ? "it is being started" : reason_);
        return Result<>();
    });
    startedAt_ = Clock::now();
    publish(started ? RunState::running : RunState::failed, started ? "" : started.error().message);
    return started;
}

void Supervisor::run() {
    while (!finished_) {
        waitForEvents();
        if (retirement_ && retirement_->proceed()) {
            retirement_.reset();
            record(state_, reason_);
        }
        if (restartAt_ && Clock::now() >= *restartAt_ && !finished_) {
            restartDaemon();
        }
    }
}

void Supervisor::waitForEvents() {
    std::vector<pollfd> events{{signals_.get(), POLLIN, 0},
                               {control_->descriptor(), POLLIN, 0},
                               {daemon_->outputDescriptor(), POLLIN, 0}};
    for (const auto& each : former_) {
        events.push_back({each->outputDescriptor(), POLLIN, 0});
    }
    ::poll(events.data(), events.size(), millisecondsToNextTask());
    if (events[2].revents != 0) {
        daemon_->readOutput();
    }
    std::ranges::for_each(former_, [](const auto& each) { each->readOutput(); });
    std::erase_if(former_, [](const auto& each) { return each->isSilent() && !each->id(); });
    if (events[0].revents != 0) {
        onSignals();
    }
    if (events[1].revents != 0 && !finished_) {
        control_->serve([this](const ControlRequest& request) { return handle(request); });
    }
}

Result<SessionCount> Supervisor::handle(const ControlRequest& request) {
    reapChildren(); // the daemon may have ended a moment ago
    switch (request.command) {
    case Command::start:
        return follow(request.order, request.endSessions);
    case Command::pause:
        return pause();
    case Command::stop:
        return stop();
    case Command::close:
        return close();
    }
    return Error("unknown command");
}

Result<SessionCount> Supervisor::follow(const DaemonOrder& order, bool endSessions) {
    const auto deadline = Clock::now() + startLimit;
    const bool unchanged = state_ == RunState::running && daemon_->id() && !order.renew &&
                           order.configurationHash == order_.configurationHash;
    if (!unchanged) {
        finishRetirement();
        VELT_RETURN_IF_ERROR(canHandOver(order) ? handOver(order, deadline) : exchange(order, deadline));
    }
    if (endSessions) {
        finishRetirement();
    }
    std::vector<ProcessId> settled = sessions();
    if (!unchanged) { // those of the new daemon began with the new settings
        for (const ProcessId& fresh : childrenOf(daemon_->id().pid)) {
            std::erase(settled, fresh);
        }
    }
    return settleSessions(settled, endSessions);
}

bool Supervisor::canHandOver(const DaemonOrder& order) const {
    const bool serves = state_ == RunState::running && daemon_->id();
    return serves && (!haveCommonPort(order, order_) || (order.sharesPorts && order_.sharesPorts));
}

/// The former daemon ends when the new one listens, and not at all if that does not come up.
Result<> Supervisor::handOver(const DaemonOrder& order, Clock::time_point deadline) {
    auto successor = std::make_unique<DaemonProcess>(listener_);
    auto started = successor->start(order, deadline, [this] {
        record(state_, reason_);
        return published_; // a daemon that nobody knows of could not be ended
    });
    if (!started) {
        record(state_, reason_);
        return started;
    }
    retirement_.emplace(daemon_->id(), successor->id(), order.ports);
    if (retirement_->proceed()) { // where nobody can be waiting for it
        retirement_.reset();
    }
    daemon_->retire();
    former_.push_back(std::move(daemon_));
    daemon_ = std::move(successor);
    order_ = order;
    startedAt_ = Clock::now();
    backOff_.forget();
    publish(RunState::running);
    return {};
}

/// The former daemon ends first. It is started again if the new one does not come up.
Result<> Supervisor::exchange(const DaemonOrder& order, Clock::time_point deadline) {
    const bool served = state_ == RunState::running && daemon_->id();
    VELT_RETURN_IF_ERROR(endDaemon());
    const DaemonOrder former = std::exchange(order_, order);
    backOff_.forget();
    // A failed start is not tried again: the caller hears of it and decides.
    auto started = startDaemon(served ? deadline - returnLimit : deadline);
    if (!started && served) {
        order_ = former;
        (void)startDaemon(Clock::now() + returnLimit);
    }
    return started;
}

DaemonState Supervisor::processes() const {
    DaemonState now;
    now.supervisor = identifyProcess(::getpid()).value_or(ProcessId{});
    now.daemon = daemon_->id();
    std::ranges::transform(former_, std::back_inserter(now.retired),
                           [](const auto& each) { return each->id(); });
    std::erase_if(now.retired, [](const ProcessId& daemon) { return !isAlive(daemon); });
    return now;
}

Result<SessionCount> Supervisor::settleSessions(const std::vector<ProcessId>& sessions, bool end) {
    const int count = static_cast<int>(sessions.size());
    if (end && !endTrees(sessions, patience)) {
        return Error("some of its sessions did not end");
    }
    return end ? SessionCount{count, 0} : SessionCount{0, count};
}

Result<SessionCount> Supervisor::pause() {
    restartAt_.reset();
    finishRetirement();
    VELT_RETURN_IF_ERROR(endDaemon());
    publish(RunState::paused);
    return settleSessions(sessions(), false);
}

Result<SessionCount> Supervisor::stop() {
    restartAt_.reset();
    const int count = static_cast<int>(sessions().size());
    const bool ended = endProcesses([] { return descendantsOf(::getpid()); }, patience);
    settleDaemon();
    if (!ended) {
        return Error("some of its processes did not end");
    }
    leave();
    return SessionCount{count, 0};
}

/// SIGTERM would end its sessions as well. Who waits at its port is not waited for: it serves nobody more.
Result<SessionCount> Supervisor::close() {
    restartAt_.reset();
    finishRetirement();
    signalProcess(daemon_->id(), SIGKILL);
    VELT_RETURN_IF_ERROR(endDaemon());
    order_.ports.clear();
    publish(RunState::closed);
    auto settled = settleSessions(sessions(), false);
    endIfEmpty();
    return settled;
}

void Supervisor::endIfEmpty() {
    if (state_ == RunState::closed && descendantsOf(::getpid()).empty()) {
        leave();
    }
}

void Supervisor::leave() {
    ::unlink(stateFile(folder_, name_).c_str());
    finished_ = true;
}

void Supervisor::finishRetirement() {
    if (retirement_) {
        retirement_->finish();
        retirement_.reset();
        record(state_, reason_);
    }
}

Result<> Supervisor::endDaemon() {
    const ProcessId daemon = daemon_->id();
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
    if (daemon_->id() && ::waitpid(daemon_->id().pid, &status, WNOHANG) == daemon_->id().pid) {
        daemon_->ended(status);
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
    endIfEmpty();
}

void Supervisor::reapChildren() {
    int status = 0;
    // Other threads wait for what they start. Processes that lost their parent are those of this first
    // thread.
    constexpr int ownOnes = WNOHANG | __WNOTHREAD;
    for (pid_t pid = ::waitpid(-1, &status, ownOnes); pid > 0; pid = ::waitpid(-1, &status, ownOnes)) {
        if (pid == daemon_->id().pid) {
            onDaemonEnd(status);
        }
        for (const auto& each : former_) {
            if (pid == each->id().pid) {
                each->ended(status);
            }
        }
    }
}

void Supervisor::onDaemonEnd(int waitStatus) {
    const std::string reason = daemon_->ended(waitStatus).message;
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

int Supervisor::millisecondsToNextTask() const {
    if (!restartAt_ && !retirement_) {
        return -1;
    }
    const auto never = Clock::time_point::max();
    const auto next = std::min(restartAt_.value_or(never), retirement_ ? retirement_->nextLook() : never);
    const auto left = std::chrono::duration_cast<milliseconds>(next - Clock::now());
    return static_cast<int>(std::max<milliseconds::rep>(left.count() + 1, 0));
}

/// To be called also before a daemon does anything: a later supervisor must find it.
DaemonState Supervisor::record(RunState state, std::string reason) {
    state_ = state;
    reason_ = std::move(reason);
    DaemonState now = processes();
    now.state = state;
    if (finished_) { // a supervisor that is listed but not alive counts as killed
        now.supervisor = {};
    }
    now.configurationHash = order_.configurationHash;
    now.ports = order_.ports;
    now.restarts = restarts_;
    now.sessions = descendantsOf(::getpid());
    std::erase(now.sessions, daemon_->id());
    now.reason = reason_;
    published_ = storeDaemonState(stateFile(folder_, name_), now);
    if (!published_) {
        ::syslog(LOG_ERR, "%s", published_.error().message.c_str());
    }
    return now;
}

void Supervisor::publish(RunState state, std::string reason) {
    tellServiceManager(statusLine(record(state, std::move(reason))));
}

} // namespace velt
