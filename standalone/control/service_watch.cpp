#include "standalone/control/service_watch.h"

#include "base/unique_fd.h"
#include "standalone/control/daemon_control.h"
#include "standalone/control/daemon_incidents.h"
#include "standalone/control/operation_count.h"
#include "standalone/control/start_retry.h"
#include "standalone/control/supervised_daemon.h"
#include "standalone/core/effects.h"
#include "standalone/core/error_number.h"
#include "standalone/core/systemd.h"

#include <poll.h>
#include <sys/eventfd.h>
#include <sys/inotify.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <cerrno>
#include <cstdint>
#include <exception>
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <system_error>
#include <thread>
#include <vector>

namespace velt {
namespace {

using Clock = std::chrono::steady_clock;
using std::chrono::milliseconds;

constexpr milliseconds interval{500};
constexpr milliseconds shortestBackOff{1000};
constexpr milliseconds longestBackOff{30000};

/// So many hold the watch back.
std::atomic<int>& holds() {
    static std::atomic<int> count{0};
    return count;
}

/// One daemon under watch. A start that fails is tried again, at growing intervals.
class WatchedDaemon {
public:
    /// `restoresSupervisors`: nobody else starts a supervisor that was killed again.
    WatchedDaemon(const Daemon& daemon, bool restoresSupervisors)
        : daemon_(daemon), retry_(daemon), restoresSupervisors_(restoresSupervisors) {}

    /// Tells what has happened. To be called whenever something may have. With `mends`, also starts the
    /// daemon again where that is for us to do: from the same reading, so that no end is mended untold.
    void look(bool mends) {
        // Counted before the state is read: what begins in between counts as ours at the next look, too.
        const std::uint64_t operations = operationCount(daemon_);
        const bool byUs = operations != operations_ || operations % 2 != 0;
        const DaemonState state = currentState();
        if (operationCount(daemon_) != operations) {
            return;
        }
        for (const Incident& each : teller_.look(state, byUs, lostItsSupervisor(state))) {
            recordIncident(daemon_, each);
            isBack_ = isBack_ || each.kind == Kind::started || each.kind == Kind::recovered;
        }
        operations_ = operations;
        if (mends) {
            mend(state);
        }
    }

private:
    using Kind = Incident::Kind;

    /// A supervisor that is told to stop may end between the reading of its file and the look whether it
    /// lives; what it leaves says then that it was told to.
    DaemonState currentState() const {
        DaemonState state = daemonState(daemon_);
        return lostItsSupervisor(state) ? daemonState(daemon_) : state;
    }

    void mend(const DaemonState& state) {
        if (isBack_ && holds() == 0) {
            isBack_ = false;
            updateReturned(state);
        }
        if (restoresSupervisors_) {
            mendLost(state);
        }
        if (!retryAt_ && holds() == 0 && retry_.isDue(state)) {
            start([this] { return startDaemon(daemon_); });
        }
    }

    /// Who brings a daemon back, such as systemd, gives it the configuration with which it ran; the settings,
    /// or its certificate, may be others by now.
    void updateReturned(const DaemonState& state) {
        const auto settings = daemon_.settings();
        if (!settings || !settings->enabled() || !isServing(state)) {
            return;
        }
        const auto hash = daemon_.test();
        if (!hash || *hash == state.configurationHash) {
            return;
        }
        if (const auto done = perform(Effect::start, daemon_.name, [this] { return startDaemon(daemon_); });
            !done) {
            ::syslog(LOG_ERR, "%s", done.error().message.c_str());
        }
    }

    void mendLost(const DaemonState& state) {
        const bool lost = lostItsSupervisor(state);
        if (lost && !retryAt_) {
            ::syslog(LOG_ERR, "%s lost its supervisor (process %d); restarting it", titleOf(daemon_).c_str(),
                     static_cast<int>(state.supervisor.pid));
        }
        const bool missing = lost || (retryAt_ && !isServing(state));
        if (!missing) {
            retryAt_.reset();
            backOff_ = shortestBackOff;
        } else if (!retryAt_ || Clock::now() >= *retryAt_) {
            restore();
        }
    }

    void restore() {
        if (start([this] { return restoreDaemon(daemon_); })) {
            retryAt_.reset();
            return;
        }
        retryAt_ = Clock::now() + backOff_;
        backOff_ = std::min(backOff_ * 2, longestBackOff);
    }

    bool start(const std::function<Result<>()>& act) {
        const auto started = perform(Effect::start, daemon_.name, act);
        const std::string complaint = started ? "" : started.error().message;
        if (!started && complaint != complaint_) {
            ::syslog(LOG_ERR, "%s", complaint.c_str());
        }
        complaint_ = complaint;
        if (started && isServing(daemonState(daemon_)) && !teller_.tellsRecovery()) {
            recordIncident(daemon_, {Incident::Kind::recovered, ""});
        }
        return static_cast<bool>(started);
    }

    const Daemon& daemon_;
    IncidentTeller teller_;
    StartRetry retry_;
    bool restoresSupervisors_;
    bool isBack_ = false; ///< by somebody else's doing, and not looked at since
    std::uint64_t operations_ = 0;
    std::string complaint_; ///< of the last start
    std::optional<Clock::time_point> retryAt_;
    milliseconds backOff_ = shortestBackOff;
};

/// Wakes when a supervisor replaces its state file: a daemon that has died is started again a tenth of a
/// second later, and then its words are gone.
class StateFolderWatch {
public:
    StateFolderWatch() : notify_(::inotify_init1(IN_CLOEXEC | IN_NONBLOCK)), end_(::eventfd(0, EFD_CLOEXEC)) {
        if (!end_) {
            throw std::system_error(errno, std::generic_category()); // nobody could end the watch
        }
        if (const auto folder = runFolder(); folder && notify_) {
            ::inotify_add_watch(notify_.get(), folder->c_str(), IN_MOVED_TO | IN_DELETE);
        }
    }

    /// Returns after the time, or earlier with a change. False: end() was called.
    bool wait(milliseconds time) const {
        std::array<pollfd, 2> events{{{end_.get(), POLLIN, 0}, {notify_.get(), POLLIN, 0}}};
        ::poll(events.data(), events.size(), static_cast<int>(time.count()));
        std::array<char, 4096> changes{};
        while (::read(notify_.get(), changes.data(), changes.size()) > 0) {
        }
        return (events[0].revents & POLLIN) == 0;
    }

    void end() const { ::eventfd_write(end_.get(), 1); }

private:
    UniqueFd notify_;
    UniqueFd end_;
};

class ServiceWatch {
public:
    ServiceWatch() {
        for (const Daemon* daemon : allDaemons()) {
            daemons_.emplace_back(*daemon, !systemdKeepsSupervisors());
        }
        // Before this returns, so that whatever happens from then on is told.
        look(false);
        thread_ = std::thread([this] { run(); });
    }
    ~ServiceWatch() {
        folder_.end();
        thread_.join();
    }
    ServiceWatch(const ServiceWatch&) = delete;
    ServiceWatch& operator=(const ServiceWatch&) = delete;

private:
    void look(bool mends) {
        for (WatchedDaemon& daemon : daemons_) {
            try {
                daemon.look(mends);
            } catch (const std::exception& error) {
                ::syslog(LOG_ERR, "cannot watch the daemons: %s", error.what());
            }
        }
    }

    void run() {
        auto next = Clock::now();
        do {
            const bool mends = Clock::now() >= next;
            if (mends) {
                next = Clock::now() + interval;
            }
            look(mends);
        } while (
            folder_.wait(std::max(milliseconds(1), std::chrono::ceil<milliseconds>(next - Clock::now()))));
    }

    StateFolderWatch folder_;
    std::vector<WatchedDaemon> daemons_;
    std::thread thread_; // last: it uses the others
};

struct TheWatch {
    std::mutex mutex;
    std::unique_ptr<ServiceWatch> watch;
};

TheWatch& theWatch() {
    static TheWatch instance;
    return instance;
}

} // namespace

Result<> watchServices() {
    const std::lock_guard lock(theWatch().mutex);
    if (theWatch().watch != nullptr) {
        return {};
    }
    try {
        theWatch().watch = std::make_unique<ServiceWatch>();
    } catch (const std::system_error& error) {
        return Error(ErrorNumber::daemon, std::string("Cannot watch the services: ") + error.what() + ".");
    }
    return {};
}

void holdServiceWatch() {
    ++holds();
}

void releaseServiceWatch() {
    --holds();
}

void unwatchServices() {
    const std::lock_guard lock(theWatch().mutex);
    theWatch().watch.reset();
}

} // namespace velt
