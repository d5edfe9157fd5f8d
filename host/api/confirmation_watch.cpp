#include "host/api/confirmation_watch.h"

#include "standalone/standalone.h"

#include <algorithm>
#include <future>
#include <memory>
#include <optional>

namespace velt::host {

namespace {

using std::chrono::system_clock;

/// After a failure, and where the history cannot be read.
constexpr std::chrono::seconds pause{30};
constexpr int mostWaiting = 1000;
/// No client's, so that none delays it by more than one request.
constexpr const char* ownCaller = "veltd";

/// When the first of the waiting changes is due; nothing when none waits.
std::optional<system_clock::time_point> nextDue() {
    ChangeFilter filter;
    filter.state = ChangeState::waiting;
    filter.limit = mostWaiting;
    const auto waiting = queryChanges(filter);
    if (!waiting) {
        return system_clock::now() + pause;
    }
    std::optional<system_clock::time_point> due;
    for (const ChangeRecord& change : *waiting) {
        if (change.confirmBy && (!due || *change.confirmBy < *due)) {
            due = change.confirmBy;
        }
    }
    return due;
}

} // namespace

ConfirmationWatch::ConfirmationWatch(History& history, RequestOrder& order)
    : history_(history), order_(order), thread_([this] { run(); }) {}

ConfirmationWatch::~ConfirmationWatch() {
    {
        const std::lock_guard lock(mutex_);
        stopping_ = true;
    }
    changed_.notify_all();
    thread_.join();
}

void ConfirmationWatch::wake() {
    {
        const std::lock_guard lock(mutex_);
        woken_ = true;
    }
    changed_.notify_all();
}

void ConfirmationWatch::run() {
    std::unique_lock lock(mutex_);
    const auto called = [this] { return stopping_ || woken_; };
    while (!stopping_) {
        woken_ = false;
        lock.unlock();
        const auto due = nextDue();
        const bool isDue = due && *due <= system_clock::now();
        const bool good = !isDue || takeBack();
        lock.lock();
        if (isDue && good) {
            continue; // the next may be due as well
        }
        if (!good) {
            changed_.wait_for(lock, pause, called);
        } else if (due) {
            changed_.wait_until(lock, *due, called);
        } else {
            changed_.wait(lock, called);
        }
    }
}

/// In its turn among the changes. False when it failed, or veltd is stopping.
bool ConfirmationWatch::takeBack() {
    const auto done = std::make_shared<std::promise<bool>>();
    auto outcome = done->get_future();
    const bool accepted = order_.submit(RequestOrder::Kind::write, ownCaller,
                                        [this, done] { done->set_value(history_.takeBackUnconfirmed()); });
    return accepted && outcome.get();
}

} // namespace velt::host
