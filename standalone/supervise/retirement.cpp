#include "standalone/supervise/retirement.h"

#include "standalone/process/shared_port.h"

#include <algorithm>
#include <csignal>
#include <thread>
#include <utility>

namespace velt {
namespace {

using std::chrono::milliseconds;

// A client that has begun to connect answers within its distance, or asks again after a second.
constexpr milliseconds shortest{1500};
constexpr milliseconds longest{10000};
constexpr milliseconds hurry{1000}; ///< for what waits already, which never grows, if it must end now
constexpr milliseconds look{20};

} // namespace

Retirement::Retirement(const ProcessId& former, const ProcessId& successor, const std::vector<int>& ports)
    : former_(former) {
    for (const int port : ports) {
        UniqueFd listener = listenerOf(former.pid, port);
        if (steerToSuccessor(listener, listenerOf(successor.pid, port))) {
            listeners_.push_back(std::move(listener));
        }
    }
    if (listeners_.empty()) { // nothing to wait for, or what waits grows again and again
        end();
    }
}

/// Whether it has accepted all that it will, and has made sessions of them.
bool Retirement::isIdle() const {
    return std::ranges::none_of(listeners_, hasWaiting) && isAsleep(former_);
}

bool Retirement::proceed() {
    const auto age = Clock::now() - began_;
    if (isAlive(former_) && (age >= longest || (age >= shortest && isIdle()))) {
        end();
    }
    return !isAlive(former_);
}

void Retirement::finish() {
    const auto deadline = Clock::now() + hurry;
    while (isAlive(former_) && !isIdle() && Clock::now() < deadline) {
        std::this_thread::sleep_for(milliseconds(1));
    }
    end();
}

/// SIGTERM would end its sessions as well.
void Retirement::end() {
    listeners_.clear(); // each keeps its port open
    signalProcess(former_, SIGKILL);
    const auto deadline = Clock::now() + std::chrono::seconds(1);
    while (isAlive(former_) && Clock::now() < deadline) {
        std::this_thread::sleep_for(milliseconds(1));
    }
}

Retirement::Clock::time_point Retirement::nextLook() const {
    return std::max(began_ + shortest, Clock::now() + look);
}

} // namespace velt
