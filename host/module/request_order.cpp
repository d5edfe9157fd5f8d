#include "host/module/request_order.h"

#include <utility>

namespace velt::host {

namespace {

constexpr unsigned unorderedThreads = 2;

} // namespace

RequestOrder::RequestOrder(unsigned threads, std::size_t maxWaiting, std::size_t maxWaitingBytes)
    : maxWaiting_(maxWaiting), maxWaitingBytes_(maxWaitingBytes) {
    threads_.reserve(threads + unorderedThreads);
    for (unsigned i = 0; i < threads; ++i) {
        threads_.emplace_back([this] { work(ordered_); });
    }
    for (unsigned i = 0; i < unorderedThreads; ++i) {
        threads_.emplace_back([this] { work(unordered_); });
    }
}

RequestOrder::~RequestOrder() {
    stop();
}

bool RequestOrder::submit(Kind kind, Task task, std::size_t bytes) {
    Pool& pool = kind == Kind::unordered ? unordered_ : ordered_;
    {
        const std::lock_guard lock(mutex_);
        if (stopping_ || pool.queue.size() >= maxWaiting_ || pool.bytes + bytes > maxWaitingBytes_) {
            return false;
        }
        pool.queue.push_back({kind, std::move(task), bytes});
        pool.bytes += bytes;
    }
    pool.changed.notify_one();
    return true;
}

void RequestOrder::stop() {
    {
        const std::lock_guard lock(mutex_);
        stopping_ = true;
    }
    ordered_.changed.notify_all();
    unordered_.changed.notify_all();
    for (std::thread& thread : threads_) {
        if (thread.joinable()) {
            thread.join();
        }
    }
}

bool RequestOrder::mayStart(Kind kind) const {
    return kind == Kind::unordered || (!writing_ && (kind == Kind::read || reading_ == 0));
}

void RequestOrder::note(Kind kind, bool runs) {
    if (kind == Kind::read) {
        reading_ += runs ? 1 : -1;
    } else if (kind == Kind::write) {
        writing_ = runs;
    }
}

void RequestOrder::work(Pool& pool) {
    std::unique_lock lock(mutex_);
    while (true) {
        if (pool.queue.empty() && stopping_) {
            return;
        }
        if (pool.queue.empty() || !mayStart(pool.queue.front().kind)) {
            pool.changed.wait(lock);
            continue;
        }
        Waiting next = std::move(pool.queue.front());
        pool.queue.pop_front();
        pool.bytes -= next.bytes;
        note(next.kind, true);
        lock.unlock();
        // The next one may be a read that can run at the same time.
        pool.changed.notify_one();
        next.task();
        next.task = nullptr;
        lock.lock();
        note(next.kind, false);
        pool.changed.notify_all();
    }
}

} // namespace velt::host
