// One connection of the HTTP server, over a plain or a TLS stream.
#ifndef VELT_HOST_HTTP_SESSION_H
#define VELT_HOST_HTTP_SESSION_H

#include "host/http/connections.h"
#include "host/http/message.h"
#include "host/http/places.h"
#include "host/http/request_reader.h"
#include "host/http/response_text.h"
#include "host/http/server.h"
#include "host/http/turns.h"

#include <boost/asio/basic_stream_socket.hpp>
#include <boost/asio/buffer.hpp>
#include <boost/asio/generic/stream_protocol.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/post.hpp>
#include <boost/asio/ssl/stream.hpp>
#include <boost/asio/steady_timer.hpp>
#include <boost/asio/write.hpp>

#include <array>
#include <atomic>
#include <memory>
#include <string>
#include <type_traits>
#include <utility>

namespace velt::host {

using Executor = boost::asio::io_context::executor_type;
using PlainStream = boost::asio::basic_stream_socket<boost::asio::generic::stream_protocol, Executor>;
using TlsStream = boost::asio::ssl::stream<PlainStream>;
using Timer =
    boost::asio::basic_waitable_timer<std::chrono::steady_clock,
                                      boost::asio::wait_traits<std::chrono::steady_clock>, Executor>;
using Error = boost::system::error_code;

template<class Stream> class EventStream;

/// What all sessions of a server share. Outlives them.
struct SessionShared {
    HttpHandler& handler;
    const HttpLimits limits;
    Places connectionPlaces{limits.connectionsOfOne};
    Places eventStreamPlaces{limits.eventStreamsOfOne};
    std::atomic<std::size_t> delayedRefusals{0};
};

/// What sessions run on: those of one lane do not wait for the threads of another. Outlives them, but for
/// those that it still holds when it ends; what they share outlives it.
struct Lane {
    boost::asio::io_context context{};
    Turns turns{context};
};

/// Only one operation is in flight at a time, so a session needs no strand. A pending operation keeps it
/// alive.
template<class Stream>
class Session final : public Connection, public std::enable_shared_from_this<Session<Stream>> {
public:
    Session(SessionShared& shared, Lane& lane, Stream stream, Peer peer)
        : shared_(shared), lane_(lane), stream_(std::move(stream)), timer_(lane.context),
          peer_(std::move(peer)), handler_(shared.handler), limits_(shared.limits),
          reader_(limits_.head, limits_.body) {
        if (isOwn(peer_)) {
            trust();
        }
    }

    /// Serves requests until either side ends the connection.
    void start() {
        if constexpr (isTls) {
            enter(State::draining, limits_.headTime);
            stream_.async_handshake(Stream::server, [self = this->shared_from_this()](const Error& error) {
                if (!error) {
                    self->nextRequest();
                }
            });
        } else {
            nextRequest();
        }
    }

    /// Answers 503 and ends the connection.
    void refuse() {
        if constexpr (!isTls) {
            takeNoPlace();
            respond(handler_.failure(503, "Too many connections are open."), false);
        }
    }

private:
    friend class EventStream<Stream>;

    static constexpr bool isTls = std::is_same_v<Stream, TlsStream>;

    int descriptor() override { return socket().native_handle(); }

    PlainStream& socket() {
        if constexpr (isTls) {
            return stream_.next_layer();
        } else {
            return stream_;
        }
    }

    void nextRequest() {
        reader_.reset();
        enter(State::idle, limits_.idleTime);
        step();
    }

    void read() {
        const auto [space, size] = reader_.space();
        stream_.async_read_some(boost::asio::buffer(space, size),
                                [self = this->shared_from_this()](const Error& error, std::size_t bytes) {
                                    self->onRead(error, bytes);
                                });
    }

    void onRead(const Error& error, std::size_t bytes) {
        if (error) {
            if (tooSlow() && state() != State::idle) {
                respond(handler_.failure(408, "The request took too long to arrive."), false);
            }
            return;
        }
        reader_.added(bytes);
        step();
    }

    void step() {
        while (true) {
            if (state() == State::idle && reader_.hasBegun()) {
                enter(State::head, limits_.headTime);
            }
            switch (reader_.next()) {
            case RequestReader::Step::needMore:
                read();
                return;
            case RequestReader::Step::head:
                if (!acceptHead()) {
                    return;
                }
                break;
            case RequestReader::Step::refused:
                respond(handler_.failure(reader_.refusal().status, reader_.refusal().detail), false);
                return;
            case RequestReader::Step::request:
                serve();
                return;
            }
        }
    }

    /// False when reading goes on later, or not at all.
    bool acceptHead() {
        enter(State::body, limits_.bodyTime);
        if (auto refusal = handler_.checkAccess(reader_.request(), peer_, principal_)) {
            refuseAccess(std::move(*refusal));
            return false;
        }
        if (!takePlace()) {
            respond(handler_.failure(429, "Too many connections are open with this token or user."), false);
            return false;
        }
        trust();
        reader_.limitBody(handler_.bodyLimit(reader_.request(), principal_));
        if (!reader_.expectsContinue()) {
            return true;
        }
        static constexpr std::string_view interim = "HTTP/1.1 100 Continue\r\n\r\n";
        boost::asio::async_write(stream_, boost::asio::buffer(interim),
                                 [self = this->shared_from_this()](const Error& error, std::size_t) {
                                     if (!error) {
                                         self->step();
                                     }
                                 });
        return false;
    }

    /// Requests of one connection may show different tokens.
    bool takePlace() {
        if (place_ == nullptr || place_->holder() != principal_.holder) {
            place_.reset();
            place_ = shared_.connectionPlaces.take(principal_.holder);
        }
        return place_ != nullptr;
    }

    void refuseAccess(Refusal refusal) {
        enterWithoutDeadline(State::working);
        // Each delayed refusal holds a connection; beyond the limit they would use them up.
        if (!refusal.delayed || ++shared_.delayedRefusals > limits_.delayedRefusals) {
            shared_.delayedRefusals -= refusal.delayed ? 1U : 0U;
            respond(refusal.response, false);
            return;
        }
        timer_.expires_after(limits_.refusalDelay);
        timer_.async_wait(
            [self = this->shared_from_this(), response = std::move(refusal.response)](const Error&) {
                --self->shared_.delayedRefusals;
                self->respond(response, false);
            });
    }

    void serve() {
        enterWithoutDeadline(State::working);
        HttpRequest request = reader_.takeRequest();
        if (handler_.asksForEvents(request)) {
            serveEvents(std::move(request));
            return;
        }
        withBody_ = request.method != "HEAD";
        handler_.handle(std::move(request), principal_,
                        [self = this->shared_from_this()](HttpResponse response) {
                            boost::asio::post(self->lane_.context, [self, answer = std::move(response)] {
                                self->respond(answer, self->reader_.keepAlive());
                            });
                        });
    }

    void serveEvents(HttpRequest request) {
        eventStreamPlace_ = shared_.eventStreamPlaces.take(principal_.holder);
        if (eventStreamPlace_ == nullptr) {
            respond(handler_.failure(429, "Too many streams of events are open with this token or user."),
                    reader_.keepAlive());
            return;
        }
        EventStream<Stream>::start(this->shared_from_this(), std::move(request));
    }

    void respond(const HttpResponse& response, bool keepAlive) {
        keepAlive = keepAlive && !ending();
        enter(State::writing, limits_.writeTime);
        output_ = responseText(response, keepAlive, withBody_);
        boost::asio::async_write(
            stream_, boost::asio::buffer(output_),
            [self = this->shared_from_this(), keepAlive](const Error& error, std::size_t) {
                if (error) {
                    return;
                }
                if (keepAlive) {
                    self->withBody_ = true;
                    self->nextRequest();
                } else {
                    self->finish();
                }
            });
    }

    /// Shuts down the sending side, and for a while discards what the client still sends: a reset could keep
    /// it from reading the answer.
    void finish() {
        enter(State::draining, limits_.drainTime);
        if constexpr (isTls) {
            stream_.async_shutdown([self = this->shared_from_this()](const Error&) { self->drain(); });
        } else {
            drain();
        }
    }

    void drain() {
        Error ignored;
        socket().shutdown(boost::asio::socket_base::shutdown_send, ignored);
        discard();
    }

    void discard() {
        socket().async_read_some(boost::asio::buffer(discarded_),
                                 [self = this->shared_from_this()](const Error& error, std::size_t) {
                                     if (!error) {
                                         self->discard();
                                     }
                                 });
    }

    SessionShared& shared_;
    Lane& lane_;
    Stream stream_;
    Timer timer_;
    Peer peer_;
    HttpHandler& handler_;
    const HttpLimits& limits_;
    RequestReader reader_;
    Principal principal_;
    std::unique_ptr<Places::Place> place_;
    std::unique_ptr<Places::Place> eventStreamPlace_;
    std::string output_;
    bool withBody_ = true;
    std::array<char, 1024> discarded_{};
};

} // namespace velt::host

#endif
