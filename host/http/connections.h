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
        working, ///< the request is being served: no deadline
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

protected:
    void enter(State state, std::chrono::milliseconds time);
    void enterWithoutDeadline(State state);
    State state() const { return state_; }

    /// Whether the client was too slow with its request.
    bool tooSlow() const { return tooSlow_; }

    /// Whether the host stops, so that this request is the connection's last.
    bool ending() const { return ending_; }

    virtual int descriptor() = 0;

private:
    static constexpr std::int64_t never = INT64_MAX;

    std::atomic<State> state_{State::idle};
    std::atomic<std::int64_t> deadline_{never};
    std::atomic<bool> tooSlow_{false};
    std::atomic<bool> ending_{false};
};

/// Thread-safe.
class Connections {
public:
    void add(const std::shared_ptr<Connection>& connection);
    void enforceDeadlines();
    void endUnused();

    /// Those that are open now.
    std::size_t count();

private:
    template<class Action> void forEach(const Action& action);

    std::mutex mutex_;
    std::list<std::weak_ptr<Connection>> all_;
};

} // namespace velt::host

#endif
