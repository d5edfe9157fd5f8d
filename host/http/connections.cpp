#include "host/http/connections.h"

#include <sys/socket.h>

#include <vector>

namespace velt::host {

namespace {

std::uint64_t nowInMilliseconds() {
    const auto now = std::chrono::steady_clock::now().time_since_epoch();
    return static_cast<std::uint64_t>(std::chrono::duration_cast<std::chrono::milliseconds>(now).count());
}

} // namespace

void Connection::enter(State state, std::chrono::milliseconds time) {
    moment_ = moment(state, nowInMilliseconds() + static_cast<std::uint64_t>(time.count()));
    // It became idle while the host was ending the idle ones.
    if (ending_ && state == State::idle) {
        shutdown(descriptor(), SHUT_RD);
    }
}

void Connection::enterWithoutDeadline(State state) {
    moment_ = moment(state, never);
}

void Connection::enforceDeadline() {
    Moment seen = moment_;
    const State state = stateOf(seen);
    // Unless the connection has moved on and has another deadline.
    if (nowInMilliseconds() <= seen >> stateBits ||
        !moment_.compare_exchange_strong(seen, moment(state, never))) {
        return;
    }
    if (state == State::idle || state == State::head || state == State::body) {
        // The reader wakes up, and answers if it must. A request that has just become complete is still
        // answered.
        tooSlow_ = state != State::idle;
        shutdown(descriptor(), SHUT_RD);
    } else {
        shutdown(descriptor(), SHUT_RDWR);
    }
}

void Connection::endWhenUnused() {
    ending_ = true;
    const State state = this->state();
    if (state == State::idle || state == State::head) {
        shutdown(descriptor(), SHUT_RD);
    } else if (state == State::events) {
        shutdown(descriptor(), SHUT_RDWR);
    }
}

bool Connection::giveWay() {
    const State state = this->state();
    const bool waits = state != State::working && state != State::writing && state != State::events;
    if (trusted_ || !waits || givesWay_.exchange(true)) {
        return false;
    }
    shutdown(descriptor(), SHUT_RDWR);
    return true;
}

void Connections::add(const std::shared_ptr<Connection>& connection) {
    const std::lock_guard lock(mutex_);
    all_.push_back(connection);
}

template<class Action> void Connections::forEach(const Action& action) {
    // Not under the lock: this may be the last pointer to a connection.
    std::vector<std::shared_ptr<Connection>> open;
    {
        const std::lock_guard lock(mutex_);
        for (auto place = all_.begin(); place != all_.end();) {
            if (auto connection = place->lock()) {
                open.push_back(std::move(connection));
                ++place;
            } else {
                place = all_.erase(place);
            }
        }
    }
    for (const auto& connection : open) {
        action(*connection);
    }
}

void Connections::enforceDeadlines() {
    forEach([](Connection& connection) { connection.enforceDeadline(); });
}

bool Connections::makeRoom() {
    bool found = false;
    forEach([&found](Connection& connection) { found = found || connection.giveWay(); });
    return found;
}

void Connections::endUnused() {
    forEach([](Connection& connection) { connection.endWhenUnused(); });
}

std::size_t Connections::count() {
    const std::lock_guard lock(mutex_);
    std::erase_if(all_, [](const std::weak_ptr<Connection>& each) { return each.expired(); });
    return all_.size();
}

} // namespace velt::host
