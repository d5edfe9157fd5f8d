// Requests that wait: the callers in turn, those of one caller in the order of arrival.
#ifndef VELT_HOST_MODULE_WAITING_REQUESTS_H
#define VELT_HOST_MODULE_WAITING_REQUESTS_H

#include <cstddef>
#include <deque>
#include <functional>
#include <list>
#include <string>

namespace velt::host {

enum class RequestKind {
    read,
    write,
    unordered, ///< needs no module: runs beside anything
    search,    ///< the same, but may take long: one at a time
};

struct WaitingRequest {
    RequestKind kind;
    std::function<void()> task;
    std::size_t bytes; ///< that it holds
};

/// A caller who has just come is served after at most one request of each other, however many they have.
/// Not thread-safe.
class WaitingRequests {
public:
    /// Of each caller at most `most` may wait, and hold at most `mostBytes`. One may always wait, whatever it
    /// holds.
    WaitingRequests(std::size_t most, std::size_t mostBytes) : most_(most), mostBytes_(mostBytes) {}

    /// False when there is no room for it.
    bool add(const std::string& caller, WaitingRequest request);

    bool empty() const { return lines_.empty(); }

    /// Stays the same until it is taken. Only when one waits.
    const WaitingRequest& next() const { return lines_.front().requests.front(); }
    WaitingRequest takeNext();

private:
    /// What waits of one caller; never empty.
    struct Line {
        std::string caller;
        std::deque<WaitingRequest> requests;
        std::size_t bytes = 0;
    };

    const std::size_t most_;
    const std::size_t mostBytes_;
    std::list<Line> lines_; ///< in the order of their turns
};

} // namespace velt::host

#endif
