#include "standalone/activity/activity_reader.h"

#include "standalone/activity/activity_settings.h"
#include "standalone/activity/running_transfers.h"
#include "standalone/activity/spool_reader.h"
#include "standalone/activity/transfer_log.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"

#include <syslog.h>

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <exception>
#include <memory>
#include <mutex>
#include <set>
#include <string>
#include <thread>
#include <utility>
#include <vector>

namespace velt {
namespace {

using Clock = std::chrono::steady_clock;

constexpr std::chrono::milliseconds betweenTakes{200};
constexpr std::chrono::seconds betweenLooks{1};
constexpr std::chrono::seconds betweenTrims{60};
constexpr std::chrono::seconds afterProblem{2};
constexpr int mostTrims = 20; ///< before more is taken

class Subscribers {
public:
    ActivitySubscription add(ActivitySubscriber subscriber) {
        const std::lock_guard lock(mutex_);
        subscribers_.emplace(++last_, std::move(subscriber));
        return last_;
    }

    void remove(ActivitySubscription subscription) {
        const std::lock_guard lock(mutex_);
        subscribers_.erase(subscription);
    }

    void tell(const Activity& activity) {
        const std::lock_guard lock(mutex_);
        for (const auto& [subscription, subscriber] : subscribers_) {
            try {
                subscriber(activity);
            } catch (const std::exception& error) {
                syslog(LOG_WARNING, "a subscriber failed: %s", error.what());
            }
        }
    }

private:
    std::mutex mutex_; ///< held during calls, so that who has ended a subscription is not called any more
    ActivitySubscription last_ = 0;
    std::map<ActivitySubscription, ActivitySubscriber> subscribers_;
};

Subscribers& subscribers() {
    static Subscribers all;
    return all;
}

std::string outcomeOf(const OperationRecord& record) {
    if (record.operation == Operation::sessionOpened) {
        return "accepted";
    }
    for (const char* const known : {"password", "configuration", "banned", "limit"}) {
        if (record.reason == known) {
            return known;
        }
    }
    return "other";
}

class Reader {
public:
    void start() {
        const std::lock_guard lock(running_);
        if (!thread_.joinable()) {
            ending_ = false;
            thread_ = std::thread([this] { run(); });
        }
    }

    void stop() {
        const std::lock_guard lock(running_);
        if (!thread_.joinable()) {
            return;
        }
        {
            const std::lock_guard wake(mutex_);
            ending_ = true;
        }
        wake_.notify_all();
        thread_.join();
    }

    ActivityTotals totals() {
        const std::lock_guard lock(mutex_);
        return totals_;
    }

    std::string problem() {
        const std::lock_guard lock(mutex_);
        return problem_;
    }

    std::string logProblem() {
        const std::lock_guard lock(mutex_);
        return logProblem_;
    }

private:
    void run();
    Clock::duration round();
    Result<> open();
    Result<bool> take();
    Result<bool> trim();
    std::vector<Activity> lookAtPages();
    void tellRunning(const std::vector<Activity>& running);
    void tell(const OperationRecord& record);
    void note(const Result<>& outcome);
    void log(const std::vector<OperationRecord>& records);
    bool waitFor(Clock::duration time);

    std::mutex running_; ///< one start or stop at a time
    std::thread thread_;

    std::mutex mutex_; ///< of what follows
    std::condition_variable wake_;
    bool ending_ = false;
    ActivityTotals totals_;
    std::string problem_;
    std::string logProblem_;

    // The thread's own.
    std::unique_ptr<OperationStore> store_;
    std::unique_ptr<SpoolReader> spools_;
    RunningTransfers transfers_;
    std::set<std::pair<std::string, std::int64_t>> taken_; ///< the records of this round
    Clock::time_point nextLook_;
    Clock::time_point nextTrim_;
    OperationLimits limits_; ///< as they were at the last trim
};

Reader& reader() {
    static Reader instance;
    return instance;
}

bool Reader::waitFor(Clock::duration time) {
    std::unique_lock lock(mutex_);
    return !wake_.wait_for(lock, time, [this] { return ending_; });
}

void Reader::run() {
    Clock::duration pause{0};
    while (waitFor(pause)) {
        pause = round();
    }
    spools_.reset();
    store_.reset();
}

Result<> Reader::open() {
    if (!store_) {
        VELT_ASSIGN_OR_RETURN(store_, OperationStore::open(statePath(paths::operationDatabase)));
        spools_ = std::make_unique<SpoolReader>(statePath(paths::spools), *store_);
    }
    return {};
}

/// True when there is more to take at once.
Result<bool> Reader::take() {
    VELT_RETURN_IF_ERROR(open());
    VELT_ASSIGN_OR_RETURN(const auto taken, spools_->take());
    {
        const std::lock_guard lock(mutex_);
        totals_.damaged += taken.damaged;
    }
    for (const OperationRecord& record : taken.records) {
        tell(record);
    }
    log(taken.records);
    bool trims = Clock::now() >= nextTrim_;
    if (!trims && !taken.records.empty()) {
        VELT_ASSIGN_OR_RETURN(trims, store_->isFull(limits_.size));
    }
    VELT_ASSIGN_OR_RETURN(const bool more, trims ? trim() : Result<bool>(false));
    return taken.more || more;
}

/// Removes more than one round takes, so that no flood outgrows the limit. True when it has not finished.
Result<bool> Reader::trim() {
    VELT_ASSIGN_OR_RETURN(const auto settings, loadActivitySettings());
    limits_ = settings.limits;
    bool more = true;
    for (int i = 0; i < mostTrims && more; ++i) {
        VELT_ASSIGN_OR_RETURN(more, store_->trim(limits_, std::chrono::system_clock::now()));
    }
    nextTrim_ = Clock::now() + (more ? Clock::duration(0) : Clock::duration(betweenTrims));
    return more;
}

/// Others read that log; what fails there keeps nothing from the store.
void Reader::log(const std::vector<OperationRecord>& records) {
    if (records.empty()) {
        return;
    }
    const auto settings = loadActivitySettings();
    if (!settings) { // health tells of it
        return;
    }
    const auto written = writeTransferLog(*settings, records);
    const std::lock_guard lock(mutex_);
    logProblem_ = written ? "" : written.error().message;
}

void Reader::note(const Result<>& outcome) {
    const std::lock_guard lock(mutex_);
    problem_ = outcome ? "" : outcome.error().message;
}

Clock::duration Reader::round() {
    // In the order in which it happened: a session is opened before its transfer is seen to run, and one that
    // has ended since runs no more.
    std::vector<Activity> running;
    if (Clock::now() >= nextLook_) {
        nextLook_ = Clock::now() + betweenLooks;
        running = lookAtPages();
    }
    taken_.clear();
    const auto taken = take();
    tellRunning(running);
    note(taken ? Result<>() : Result<>(taken.error()));
    if (!taken) {
        // It may be another file by now, or a whole one again.
        spools_.reset();
        store_.reset();
        return afterProblem;
    }
    return *taken ? Clock::duration(0) : Clock::duration(betweenTakes);
}

std::vector<Activity> Reader::lookAtPages() {
    auto running = transfers_.look();
    const std::lock_guard lock(mutex_);
    totals_.sessions = transfers_.sessions();
    totals_.octets = transfers_.octets();
    return running;
}

void Reader::tellRunning(const std::vector<Activity>& running) {
    for (const Activity& activity : running) {
        if (!taken_.contains({activity.record.session, activity.record.number})) {
            subscribers().tell(activity);
        }
    }
}

void Reader::tell(const OperationRecord& record) {
    taken_.emplace(record.session, record.number);
    if (record.operation == Operation::sessionClosed) {
        transfers_.ended(record);
    }
    {
        const std::lock_guard lock(mutex_);
        ++totals_.records;
        totals_.octets = transfers_.octets();
        if (record.operation == Operation::sessionOpened || record.operation == Operation::loginRefused) {
            ++totals_.logins[{record.protocol, outcomeOf(record)}];
        }
    }
    subscribers().tell({ActivityKind::operation, record, 0});
}

} // namespace

void startActivityReader() {
    reader().start();
}

void stopActivityReader() {
    reader().stop();
}

ActivitySubscription subscribeActivity(ActivitySubscriber subscriber) {
    return subscribers().add(std::move(subscriber));
}

void unsubscribeActivity(ActivitySubscription subscription) {
    subscribers().remove(subscription);
}

ActivityTotals activityTotals() {
    return reader().totals();
}

std::string activityProblem() {
    return reader().problem();
}

std::string transferLogProblem() {
    return reader().logProblem();
}

} // namespace velt
