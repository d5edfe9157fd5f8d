#include "base/turn_queue.h"

#include <algorithm>
#include <utility>

namespace velt {

TurnQueue::TurnQueue(Work work, Limits limits)
    : work_(std::move(work)), limits_(limits), thread_([this] { run(); }) {}

TurnQueue::~TurnQueue() {
    stop();
}

void TurnQueue::add(const std::string& source, const std::string& item) {
    {
        const std::lock_guard lock(mutex_);
        auto place = std::ranges::find(waiting_, source, &Waiting::source);
        const bool full =
            place == waiting_.end() ? waiting_.size() >= limits_.sources : place->times >= limits_.itemsOfOne;
        if (stopping_ || full) {
            return;
        }
        if (place == waiting_.end()) {
            place = waiting_.insert(place, {source, item});
        }
        ++place->times;
    }
    changed_.notify_all();
}

void TurnQueue::stop() {
    {
        const std::lock_guard lock(mutex_);
        stopping_ = true;
    }
    changed_.notify_all();
    if (thread_.joinable()) {
        thread_.join();
    }
}

void TurnQueue::run() {
    std::unique_lock lock(mutex_);
    while (true) {
        changed_.wait(lock, [this] { return stopping_ || !waiting_.empty(); });
        if (stopping_) {
            return;
        }
        const std::string item = takeNext();
        lock.unlock();
        work_(item);
        lock.lock();
    }
}

std::string TurnQueue::takeNext() {
    Waiting& next = waiting_.front();
    std::string item = next.item;
    if (--next.times == 0) {
        waiting_.pop_front();
    } else {
        waiting_.splice(waiting_.end(), waiting_, waiting_.begin());
    }
    return item;
}

} // namespace velt
