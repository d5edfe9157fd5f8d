#include "host/http/turns.h"

#include <boost/asio/post.hpp>

#include <utility>

namespace velt::host {

namespace {

/// Each sends something to one client, which takes some ten microseconds.
constexpr int piecesOfTurn = 16;

} // namespace

void Turns::add(std::function<void()> work) {
    {
        const std::lock_guard lock(mutex_);
        waiting_.push_back(std::move(work));
        if (std::exchange(hasTurn_, true)) {
            return;
        }
    }
    postTurn();
}

void Turns::postTurn() {
    boost::asio::post(context_, [this] { takeTurn(); });
}

void Turns::takeTurn() {
    for (int i = 0; i < piecesOfTurn; ++i) {
        const auto work = next();
        if (!work) {
            return;
        }
        work();
    }
    postTurn(); // at the end of the queue, behind what has come meanwhile
}

/// Nothing when all is done; the turn is over then.
std::function<void()> Turns::next() {
    const std::lock_guard lock(mutex_);
    if (waiting_.empty()) {
        hasTurn_ = false;
        return nullptr;
    }
    auto work = std::move(waiting_.front());
    waiting_.pop_front();
    return work;
}

} // namespace velt::host
