#include "standalone/control/service_watch.h"

#include "standalone/control/daemon_control.h"
#include "standalone/control/service_backend.h"
#include "standalone/core/boundary.h"
#include "standalone/core/effects.h"

#include <syslog.h>

#include <algorithm>
#include <array>
#include <condition_variable>
#include <memory>
#include <mutex>
#include <thread>

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
    explicit WatchedDaemon(Daemon daemon) : daemon_(daemon) {}

    void look() {
        const ServiceState state = daemonState(daemon_);
        const bool lost = lostItsSupervisor(state);
        if (lost && !retryAt_) {
            ::syslog(LOG_ERR, "the supervisor of %s, process %d, has ended: the daemon is started again",
                     daemonName(daemon_).c_str(), static_cast<int>(state.supervisor.pid));
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
        const int result =
            perform(Effect::start, daemonName(daemon_), [this] { return restoreDaemon(daemon_); });
        if (result >= 0) {
            retryAt_.reset();
            return;
        }
        ::syslog(LOG_ERR, "%s", lastErrorSentence().c_str());
        retryAt_ = Clock::now() + backOff_;
        backOff_ = std::min(backOff_ * 2, longestBackOff);
    }

    Daemon daemon_;
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
        std::array daemons{WatchedDaemon(Daemon::ftp), WatchedDaemon(Daemon::sftp)};
        std::unique_lock lock(mutex_);
        while (!wake_.wait_for(lock, interval, [this] { return ended_; })) {
            lock.unlock();
            for (WatchedDaemon& daemon : daemons) {
                atBoundary([&daemon] {
                    daemon.look();
                    return 0;
                });
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

int watchServices() {
    return atBoundary([] {
        const std::lock_guard lock(theWatch().mutex);
        if (theWatch().watch == nullptr && !systemdKeepsSupervisors()) {
            theWatch().watch = std::make_unique<ServiceWatch>();
        }
        return 0;
    });
}

void unwatchServices() {
    const std::lock_guard lock(theWatch().mutex);
    theWatch().watch.reset();
}

} // namespace velt
