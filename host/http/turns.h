// Work for very many connections at once, a little at a time.
#ifndef VELT_HOST_HTTP_TURNS_H
#define VELT_HOST_HTTP_TURNS_H

#include <boost/asio/io_context.hpp>

#include <deque>
#include <functional>
#include <mutex>

namespace velt::host {

/// Does pieces of work in the order in which they came, one at a time, on the threads of a context. After a
/// few of them, whatever else waits for these threads has its turn: a request that comes while an event goes
/// out to a thousand clients is not kept waiting for all of them. Thread-safe.
class Turns {
public:
    /// The context outlives it, and is not run any more when it ends. Pieces that were not done by then are
    /// dropped.
    explicit Turns(boost::asio::io_context& context) : context_(context) {}
    Turns(const Turns&) = delete;
    Turns& operator=(const Turns&) = delete;
    ~Turns() = default;

    /// The work must not throw.
    void add(std::function<void()> work);

private:
    void postTurn();
    void takeTurn();
    std::function<void()> next();

    boost::asio::io_context& context_;
    std::mutex mutex_; ///< of both below
    std::deque<std::function<void()>> waiting_;
    bool hasTurn_ = false; ///< a turn is posted or runs
};

} // namespace velt::host

#endif
