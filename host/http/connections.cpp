#include "host/http/connections.h"

#include <sys/socket.h>

#include <vector>

namespace velt::host {

namespace {

std::int64_t nowInMilliseconds() {
    const auto now = std::chrono::steady_clock::now().time_since_epoch();
    return std::chrono::duration_cast<std::chrono::milliseconds>(now).count();
}

} // namespace

void Connection::enter(State state, std::chrono::milliseconds time) {
    state_ = state;
    deadline_ = nowInMilliseconds() + time.count();
    // A connection that stopped being used while the host was ending the unused ones.
    if (ending_ && state == State::idle) {
        shutdown(descriptor(), SHUT_RD);
    }
}

void Connection::enterWithoutDeadline(State state) {
    state_ = state;
    deadline_ = never;
}

void Connection::enforceDeadline() {
    if (nowInMilliseconds() <= deadline_) {
        return;
    }
    const State state = state_;
    if (state == State::idle || state == State::head || state == State::body) {
        tooSlow_ = state != State::idle;
        // The reader wakes up, and answers if it has to; the deadline of its writing is the next. A request
        // that was complete a moment ago is still answered.
        deadline_ = never;
        shutdown(descriptor(), SHUT_RD);
    } else {
        shutdown(descriptor(), SHUT_RDWR);
    }
}

void Connection::endWhenUnused() {
    ending_ = true;
    const State state = state_;
    if (state == State::idle || state == State::head) {
        shutdown(descriptor(), SHUT_RD);
    } else if (state == State::events) {
        shutdown(descriptor(), SHUT_RDWR);
    }
}

void Connections::add(const std::shared_ptr<Connection>& connection) {
    const std::lock_guard lock(mutex_);
    all_.push_back(connection);
}

template<class Action> void Connections::forEach(const Action& action) {
    // A connection may end here, by the last pointer to it: not under the lock.
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

void Connections::endUnused() {
    forEach([](Connection& connection) { connection.endWhenUnused(); });
}

std::size_t Connections::count() {
    const std::lock_guard lock(mutex_);
    std::erase_if(all_, [](const std::weak_ptr<Connection>& each) { return each.expired(); });
    return all_.size();
}

} // namespace velt::host
