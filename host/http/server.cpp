#include "host/http/server.h"

#include "host/http/event_stream.h"
#include "host/http/session.h"
#include "host/http/tls_context.h"

#include <boost/asio/basic_socket_acceptor.hpp>
#include <boost/asio/executor_work_guard.hpp>

#include <netinet/in.h>
#include <netinet/tcp.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <functional>
#include <mutex>
#include <thread>

namespace velt::host {

namespace {

namespace asio = boost::asio;

using Acceptor = asio::basic_socket_acceptor<asio::generic::stream_protocol, Executor>;

constexpr std::chrono::milliseconds acceptPause{50};
/// How many connections beyond the limit get a 503.
constexpr std::size_t refusedConnections = 64;

} // namespace

struct HttpServer::Core {
    /// One listening socket and its acceptor.
    struct Door {
        Door(Lane& itsLane, Listener socket)
            : lane(itsLane), listener(std::move(socket)), acceptor(lane.context), peer(lane.context),
              pause(lane.context) {
            // Both close their descriptor, so each has its own.
            acceptor.assign({listener.isUnixSocket() ? AF_UNIX : AF_INET, 0}, dup(listener.descriptor()));
        }

        Lane& lane; ///< of all sessions that come in here
        Listener listener;
        Acceptor acceptor;
        PlainStream peer;
        Timer pause;
    };

    Core(HttpHandler& theHandler, const HttpLimits& theLimits, const TlsFiles& tls)
        : shared{theHandler, theLimits}, tlsContext(makeTlsContext(tls)), sweeper(tcp.context),
          groupSearch(tcp.context) {}

    /// With the lock of the doors, once the threads run.
    void accept(Door& door) {
        door.acceptor.async_accept(door.peer, [this, &door](const Error& error) {
            const std::lock_guard lock(doorMutex);
            if (stopping) {
                return;
            }
            if (!error) {
                welcome(door);
                accept(door);
            } else {
                acceptLater(door);
            }
        });
    }

    /// Out of descriptors: an attempt at once would fail, too.
    void acceptLater(Door& door) {
        door.pause.expires_after(acceptPause);
        door.pause.async_wait([this, &door](const Error&) {
            const std::lock_guard lock(doorMutex);
            if (!stopping) {
                accept(door);
            }
        });
    }

    void welcome(Door& door) {
        PlainStream socket = std::move(door.peer); // leaves a closed socket for the next one
        const bool isTls = tlsContext != nullptr && !door.listener.isUnixSocket();
        Peer peer = peerOf(socket.native_handle(), isTls);
        if (!peer.isUnixSocket) {
            const int on = 1;
            setsockopt(socket.native_handle(), IPPROTO_TCP, TCP_NODELAY, &on, sizeof on);
        }
        const std::size_t open = connections.count();
        // Idle connections must not keep out clients that have a request, and none may keep out root.
        if (!isOwn(peer) && open >= limits.connections && !connections.makeRoom()) {
            if (!isTls && open < limits.connections + refusedConnections) {
                make<PlainStream>(door.lane, std::move(socket), std::move(peer))->refuse();
            }
            return;
        }
        if (isTls) {
            make<TlsStream>(door.lane, TlsStream(std::move(socket), *tlsContext), std::move(peer))->start();
        } else {
            make<PlainStream>(door.lane, std::move(socket), std::move(peer))->start();
        }
    }

    template<class Stream> std::shared_ptr<Session<Stream>> make(Lane& lane, Stream stream, Peer peer) {
        auto session = std::make_shared<Session<Stream>>(shared, lane, std::move(stream), std::move(peer));
        connections.add(session);
        return session;
    }

    void sweep() {
        sweeper.expires_after(limits.sweep);
        sweeper.async_wait([this](const Error& error) {
            if (!error) {
                connections.enforceDeadlines();
                sweep();
            }
        });
    }

    /// A group that cannot be looked up now would stay locked out until the next start.
    void searchGroupsLater() {
        groupSearch.expires_after(limits.groupSearch);
        groupSearch.async_wait([this](const Error& error) {
            if (!error && !doorsAreShared()) {
                searchGroupsLater();
            }
        });
    }

    bool doorsAreShared() {
        try {
            return std::ranges::all_of(doors,
                                       [](const auto& door) { return door->listener.shareWithGroup(); });
        } catch (const ListenError&) {
            return false;
        }
    }

    void closeDoors() {
        const std::lock_guard lock(doorMutex);
        stopping = true;
        for (const auto& door : doors) {
            Error ignored;
            door->acceptor.close(ignored);
        }
    }

    void join() {
        tcp.context.stop();
        local.context.stop();
        for (std::thread& thread : threads) {
            thread.join();
        }
        threads.clear();
    }

    SessionShared shared;
    const HttpLimits& limits = shared.limits;
    Lane tcp;
    Lane local; ///< of the Unix sockets: administrators do not wait for what the network asks
    std::unique_ptr<asio::ssl::context> tlsContext;
    Connections connections;
    std::array<asio::executor_work_guard<Executor>, 2> work{asio::make_work_guard(tcp.context),
                                                            asio::make_work_guard(local.context)};
    std::mutex doorMutex; ///< of both below: a door may not be closed while another thread accepts
    std::vector<std::unique_ptr<Door>> doors;
    bool stopping = false;
    Timer sweeper;
    Timer groupSearch;
    std::vector<std::thread> threads;
};

HttpServer::HttpServer(HttpHandler& handler, const HttpLimits& limits, const TlsFiles& tls)
    : core_(std::make_unique<Core>(handler, limits, tls)) {}

HttpServer::~HttpServer() {
    stop(std::chrono::milliseconds(0));
}

void HttpServer::add(Listener listener) {
    Lane& lane = listener.isUnixSocket() ? core_->local : core_->tcp;
    core_->doors.push_back(std::make_unique<Core::Door>(lane, std::move(listener)));
}

void HttpServer::start(unsigned threads) {
    core_->sweep();
    core_->searchGroupsLater();
    for (const auto& door : core_->doors) {
        core_->accept(*door);
    }
    core_->threads.emplace_back([this] { core_->local.context.run(); });
    for (unsigned i = 0; i < threads; ++i) {
        core_->threads.emplace_back([this] { core_->tcp.context.run(); });
    }
}

void HttpServer::stop(std::chrono::milliseconds patience) {
    if (core_->threads.empty()) {
        return;
    }
    core_->closeDoors();
    const auto end = std::chrono::steady_clock::now() + patience;
    do {
        core_->connections.endUnused();
        if (core_->connections.count() == 0) {
            break;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(10));
    } while (std::chrono::steady_clock::now() < end);
    core_->join();
}

std::size_t HttpServer::connections() const {
    return core_->connections.count();
}

} // namespace velt::host
