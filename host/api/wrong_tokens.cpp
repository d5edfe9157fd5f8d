#include "host/api/wrong_tokens.h"

#include "standalone/standalone.h"

#include <algorithm>
#include <exception>

namespace velt::host {

WrongTokens::WrongTokens(HostLog& log, std::size_t maxSources)
    : log_(log), maxSources_(maxSources), thread_([this] { run(); }) {}

WrongTokens::~WrongTokens() {
    stop();
}

void WrongTokens::note(const std::string& address) {
    const std::string source = sourceOfLogin(address);
    {
        const std::lock_guard lock(mutex_);
        auto place = std::ranges::find(waiting_, source, &Waiting::source);
        const bool full =
            place == waiting_.end() ? waiting_.size() >= maxSources_ : place->tokens >= mostOfOne;
        if (stopping_ || full) {
            return;
        }
        if (place == waiting_.end()) {
            place = waiting_.insert(place, {source, address});
        }
        ++place->tokens;
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
        const std::string address = takeNext();
        lock.unlock();
        count(address);
        lock.lock();
    }
}

/// The sources take turns.
std::string WrongTokens::takeNext() {
    Waiting& next = waiting_.front();
    std::string address = next.address;
    if (--next.tokens == 0) {
        waiting_.pop_front();
    } else {
        waiting_.splice(waiting_.end(), waiting_, waiting_.begin());
    }
    return address;
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
