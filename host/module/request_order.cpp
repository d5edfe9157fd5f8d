#include "host/module/request_order.h"

#include <utility>

namespace velt::host {

namespace {

constexpr unsigned unorderedThreads = 2;

} // namespace

RequestOrder::RequestOrder(unsigned threads, std::size_t maxWaiting, std::size_t maxWaitingBytes)
    : ordered_{{maxWaiting, maxWaitingBytes}},
      unordered_{{maxWaiting, maxWaitingBytes}}, searches_{{maxWaiting, maxWaitingBytes}} {
    try {
        start(ordered_, threads);
        start(unordered_, unorderedThreads);
        start(searches_, 1);
    } catch (...) {
        stop(); // those that have started
        throw;
    }
}

RequestOrder::~RequestOrder() {
    stop();
}

bool RequestOrder::submit(Kind kind, const std::string& caller, Task task, std::size_t bytes) {
    Pool& pool = poolOf(kind);
    {
        const std::lock_guard lock(mutex_);
        if (stopping_ || !pool.waiting.add(caller, {kind, std::move(task), bytes})) {
            return false;
        }
    }
    pool.changed.notify_one();
    return true;
}

void RequestOrder::stop() {
    {
        const std::lock_guard lock(mutex_);
        stopping_ = true;
    }
    for (Pool* const pool : {&ordered_, &unordered_, &searches_}) {
        pool->changed.notify_all();
    }
    for (std::thread& thread : threads_) {
        if (thread.joinable()) {
            thread.join();
        }
    }
}

RequestOrder::Pool& RequestOrder::poolOf(Kind kind) {
    switch (kind) {
    case Kind::unordered:
        return unordered_;
    case Kind::search:
        return searches_;
    default:
        return ordered_;
    }
}

void RequestOrder::start(Pool& pool, unsigned threads) {
    for (unsigned i = 0; i < threads; ++i) {
        threads_.emplace_back([this, &pool] { work(pool); });
    }
}

bool RequestOrder::mayStart(Kind kind) const {
    switch (kind) {
    case Kind::read:
        return !writing_;
    case Kind::write:
        return !writing_ && reading_ == 0;
    default:
        return true;
    }
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
        if (pool.waiting.empty() && stopping_) {
            return;
        }
        if (pool.waiting.empty() || !mayStart(pool.waiting.next().kind)) {
            pool.changed.wait(lock);
            continue;
        }
        WaitingRequest next = pool.waiting.takeNext();
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
