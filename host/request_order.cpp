#include "host/request_order.h"

#include <utility>

namespace velt::host {

RequestOrder::RequestOrder(unsigned threads, std::size_t maxWaiting) : maxWaiting_(maxWaiting) {
    threads_.reserve(threads);
    for (unsigned i = 0; i < threads; ++i) {
        threads_.emplace_back([this] { work(); });
    }
}

RequestOrder::~RequestOrder() {
    stop();
}

bool RequestOrder::submit(Kind kind, Task task) {
    {
        const std::lock_guard lock(mutex_);
        if (stopping_ || ordered_.size() + unordered_.size() >= maxWaiting_) {
            return false;
        }
        auto& queue = kind == Kind::unordered ? unordered_ : ordered_;
        queue.push_back({kind, std::move(task)});
    }
    changed_.notify_one();
    return true;
}

void RequestOrder::stop() {
    {
        const std::lock_guard lock(mutex_);
        stopping_ = true;
    }
    changed_.notify_all();
    for (std::thread& thread : threads_) {
        if (thread.joinable()) {
            thread.join();
        }
    }
}

bool RequestOrder::mayStart(Kind kind) const {
    return kind == Kind::read ? !writing_ : !writing_ && reading_ == 0;
}

std::deque<RequestOrder::Waiting>* RequestOrder::nextQueue() {
    if (!unordered_.empty()) {
        return &unordered_;
    }
    return !ordered_.empty() && mayStart(ordered_.front().kind) ? &ordered_ : nullptr;
}

void RequestOrder::started(Kind kind) {
    if (kind == Kind::read) {
        ++reading_;
    } else if (kind == Kind::write) {
        writing_ = true;
    }
}

void RequestOrder::finished(Kind kind) {
    if (kind == Kind::read) {
        --reading_;
    } else if (kind == Kind::write) {
        writing_ = false;
    }
}

void RequestOrder::work() {
    std::unique_lock lock(mutex_);
    while (true) {
        std::deque<Waiting>* const queue = nextQueue();
        if (queue == nullptr) {
            if (stopping_ && ordered_.empty()) {
                return;
            }
            changed_.wait(lock);
            continue;
        }
        Waiting next = std::move(queue->front());
        queue->pop_front();
        started(next.kind);
        lock.unlock();
        // The next in the queue may be a read that can run beside this one.
        changed_.notify_one();
        next.task();
        next.task = nullptr;
        lock.lock();
        finished(next.kind);
        changed_.notify_all();
    }
}

} // namespace velt::host
