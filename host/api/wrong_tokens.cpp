#include "host/api/wrong_tokens.h"

#include "standalone/standalone.h"

#include <exception>
#include <utility>

namespace velt::host {

WrongTokens::WrongTokens(HostLog& log, std::size_t maxWaiting)
    : log_(log), maxWaiting_(maxWaiting), thread_([this] { run(); }) {}

WrongTokens::~WrongTokens() {
    stop();
}

void WrongTokens::note(const std::string& address) {
    {
        const std::lock_guard lock(mutex_);
        if (stopping_ || waiting_.size() >= maxWaiting_) {
            return;
        }
        waiting_.push_back(address);
    }
    changed_.notify_all();
}

void WrongTokens::stop() {
    {
        const std::lock_guard lock(mutex_);
        stopping_ = true;
    }
    changed_.notify_all();
    if (thread_.joinable()) {
        thread_.join();
    }
}

void WrongTokens::run() {
    std::unique_lock lock(mutex_);
    while (true) {
        changed_.wait(lock, [this] { return stopping_ || !waiting_.empty(); });
        if (stopping_) {
            return;
        }
        const std::string address = std::move(waiting_.front());
        waiting_.pop_front();
        lock.unlock();
        count(address);
        lock.lock();
    }
}

void WrongTokens::count(const std::string& address) {
    try {
        // Those that came while the ban was being made must not make it again.
        if (!currentBanOf(address)) {
            noteFailedLogin("veltd", address);
        }
    } catch (const std::exception& error) {
        log_.write(std::string("cannot count a wrong token: ") + error.what());
    }
}

} // namespace velt::host
