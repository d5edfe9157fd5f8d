// The open connections and their deadlines.
#ifndef VELT_HOST_HTTP_CONNECTIONS_H
#define VELT_HOST_HTTP_CONNECTIONS_H

#include <atomic>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <list>
#include <memory>
#include <mutex>

namespace velt::host {

/// One connection. Only its destructor closes the descriptor, so other threads may shut it down.
class Connection {
public:
    enum class State {
        idle,    ///< between requests
        head,    ///< part of a head has arrived
        body,    ///< part of a body has arrived
        working, ///< the request is being served, or its refusal is delayed: no deadline
        writing,
        events,   ///< a stream of events
        draining, ///< the answer is sent; what the client still sends is discarded
    };

    Connection() = default;
    virtual ~Connection() = default;
    Connection(const Connection&) = delete;
    Connection& operator=(const Connection&) = delete;

    /// Shuts the connection down when its deadline has passed. A slow request still gets an answer.
    void enforceDeadline();

    /// The host is stopping: ends the connection at once unless a request on it is being served.
    void endWhenUnused();

    /// Ends the connection to make room for another, if it is waiting for its client and no request on it was
    /// granted access. False otherwise, or if it is already ending that way.
    bool giveWay();

protected:
    void enter(State state, std::chrono::milliseconds time);
    void enterWithoutDeadline(State state);
    State state() const { return stateOf(moment_); }

    /// A request on this connection was granted access.
    void trust() { trusted_ = true; }

    /// This connection is beyond the limit, so ending it makes no room.
    void takeNoPlace() { givesWay_ = true; }

    /// Whether the client was too slow with its request.
    bool tooSlow() const { return tooSlow_; }

    /// Whether the host is stopping, so that this request is the connection's last.
    bool ending() const { return ending_; }

    virtual int descriptor() = 0;

private:
    // State and deadline change together: a deadline that has passed must not end the state that followed.
    using Moment = std::uint64_t;
    static constexpr unsigned stateBits = 3;
    static constexpr std::uint64_t never = UINT64_MAX >> stateBits;

    static Moment moment(State state, std::uint64_t deadline) {
        return deadline << stateBits | static_cast<Moment>(state);
    }
    static State stateOf(Moment moment) { return static_cast<State>(moment & ((1U << stateBits) - 1)); }

    std::atomic<Moment> moment_{moment(State::idle, never)};
    std::atomic<bool> tooSlow_{false};
    std::atomic<bool> ending_{false};
    std::atomic<bool> trusted_{false};
    std::atomic<bool> givesWay_{false};
};

/// Thread-safe.
class Connections {
public:
    void add(const std::shared_ptr<Connection>& connection);
    void enforceDeadlines();
    void endUnused();

    /// Ends the oldest connection that can give way. False when none can.
    bool makeRoom();

    /// How many are open now.
    std::size_t count();

private:
    template<class Action> void forEach(const Action& action);

    std::mutex mutex_;
    std::list<std::weak_ptr<Connection>> all_;
};

} // namespace velt::host

#endif
