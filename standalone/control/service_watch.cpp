#include "standalone/control/service_watch.h"

#include "standalone/control/daemon_control.h"
#include "standalone/control/supervised_daemon.h"
#include "standalone/core/effects.h"
#include "standalone/core/error_number.h"
#include "standalone/core/systemd.h"

#include <syslog.h>

#include <algorithm>
#include <condition_variable>
#include <exception>
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

/// One daemon under watch. A start that fails is tried again, at growing intervals.
class WatchedDaemon {
public:
    explicit WatchedDaemon(const Daemon& daemon) : daemon_(daemon) {}

    void look() {
        const DaemonState state = daemonState(daemon_);
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

private:
    void restore() {
        const auto restored = perform(Effect::start, daemon_.name, [this] { return restoreDaemon(daemon_); });
        if (restored) {
            retryAt_.reset();
            return;
        }
        ::syslog(LOG_ERR, "%s", restored.error().message.c_str());
        retryAt_ = Clock::now() + backOff_;
        backOff_ = std::min(backOff_ * 2, longestBackOff);
    }

    const Daemon& daemon_;
    std::optional<Clock::time_point> retryAt_;
    milliseconds backOff_ = shortestBackOff;
};

class ServiceWatch {
public:
    ServiceWatch() : thread_([this] { run(); }) {}
    ~ServiceWatch() {
        {
            const std::lock_guard lock(mutex_);
            ended_ = true;
        }
        wake_.notify_all();
        thread_.join();
    }
    ServiceWatch(const ServiceWatch&) = delete;
    ServiceWatch& operator=(const ServiceWatch&) = delete;

private:
    void run() {
        std::vector<WatchedDaemon> daemons;
        for (const Daemon* daemon : allDaemons()) {
            daemons.emplace_back(*daemon);
        }
        std::unique_lock lock(mutex_);
        while (!wake_.wait_for(lock, interval, [this] { return ended_; })) {
            lock.unlock();
            try {
                std::ranges::for_each(daemons, &WatchedDaemon::look);
            } catch (const std::exception& error) {
                ::syslog(LOG_ERR, "cannot watch the daemons: %s", error.what());
            }
            lock.lock();
        }
    }

    std::mutex mutex_;
    std::condition_variable wake_;
    bool ended_ = false;
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
    if (theWatch().watch != nullptr || systemdKeepsSupervisors()) {
        return {};
    }
    try {
        theWatch().watch = std::make_unique<ServiceWatch>();
    } catch (const std::system_error& error) {
        return Error(ErrorNumber::daemon, std::string("Cannot start a thread: ") + error.what() + ".");
    }
    return {};
}

void unwatchServices() {
    const std::lock_guard lock(theWatch().mutex);
    theWatch().watch.reset();
}

} // namespace velt
