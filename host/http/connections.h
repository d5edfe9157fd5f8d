// The open connections: counted, and looked at for their deadlines.
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

/// One connection. It closes its descriptor in its destructor only, so that others may shut it down
/// meanwhile.
class Connection {
public:
    enum class State {
        idle,    ///< between requests
        head,    ///< part of a head is there
        body,    ///< part of a body is there
        working, ///< the request is being served, or its refusal waits: no deadline
        writing,
        events,   ///< a stream of events
        draining, ///< the answer is out, what the client still sends is thrown away
    };

    Connection() = default;
    virtual ~Connection() = default;
    Connection(const Connection&) = delete;
    Connection& operator=(const Connection&) = delete;

    /// Shuts the connection down when its deadline has passed. Who was slow with a request can still be told.
    void enforceDeadline();

    /// The host stops: ends the connection at once when nobody waits for an answer on it.
    void endWhenUnused();

    /// Ends a connection that takes another's place: one that waits for its client, and on which no request
    /// has been granted access yet. False for others, and for one that ends so already.
    bool giveWay();

protected:
    void enter(State state, std::chrono::milliseconds time);
    void enterWithoutDeadline(State state);
    State state() const { return stateOf(moment_); }

    /// A request on this connection was granted access.
    void trust() { trusted_ = true; }

    /// This connection is one beyond those that have a place, so it has none to give.
    void takeNoPlace() { givesWay_ = true; }

    /// Whether the client was too slow with its request.
    bool tooSlow() const { return tooSlow_; }

    /// Whether the host stops, so that this request is the connection's last.
    bool ending() const { return ending_; }

    virtual int descriptor() = 0;

private:
    // State and deadline change together: who finds that a deadline has passed must not act on the state that
    // came after it.
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

    /// Lets the oldest connection that can give way to a new one. False when none can.
    bool makeRoom();

    /// Those that are open now.
    std::size_t count();

private:
    template<class Action> void forEach(const Action& action);

    std::mutex mutex_;
    std::list<std::weak_ptr<Connection>> all_;
};

} // namespace velt::host

#endif
