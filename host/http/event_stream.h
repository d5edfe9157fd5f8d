// A connection that serves the stream of events.
#ifndef VELT_HOST_HTTP_EVENT_STREAM_H
#define VELT_HOST_HTTP_EVENT_STREAM_H

#include "host/http/session.h"

#include <boost/asio/bind_executor.hpp>
#include <boost/asio/dispatch.hpp>
#include <boost/asio/strand.hpp>

#include <sys/socket.h>

#include <deque>

namespace velt::host {

/// Events come from any thread, and it reads and writes at the same time, so everything runs on a strand.
template<class Stream>
class EventStream final : public EventReader, public std::enable_shared_from_this<EventStream<Stream>> {
public:
    explicit EventStream(std::shared_ptr<Session<Stream>> session)
        : session_(std::move(session)), strand_(session_->lane_.context.get_executor()),
          heartbeat_(session_->lane_.context) {}

    static void start(const std::shared_ptr<Session<Stream>>& session, HttpRequest request) {
        const auto stream = std::make_shared<EventStream>(session);
        session->enterWithoutDeadline(Connection::State::events);
        // What a slow reader has not taken waits here, where it is counted, and not in the kernel.
        const int size = 16 * 1024;
        setsockopt(session->descriptor(), SOL_SOCKET, SO_SNDBUF, &size, sizeof size);
        boost::asio::post(stream->strand_, [stream, asked = std::move(request)] {
            stream->push(std::make_shared<const std::string>(eventStreamHead()));
            stream->waitForEnd();
            stream->beat();
            // After the head, so that it is sent before any event.
            stream->session_->handler_.addEventReader(stream, asked, stream->session_->principal_);
        });
    }

    void deliver(const std::shared_ptr<const std::string>& event) override {
        session_->lane_.turns.add([self = this->shared_from_this(), event] {
            boost::asio::dispatch(self->strand_, [self, event] { self->push(event); });
        });
    }

    void end() override {
        boost::asio::dispatch(strand_, [self = this->shared_from_this()] { self->close(); });
    }

private:
    using Text = std::shared_ptr<const std::string>;

    void push(const Text& event) {
        if (ended_) {
            return;
        }
        queued_ += event->size();
        if (queued_ > session_->limits_.queuedEvents) {
            close();
            return;
        }
        queue_.push_back(event);
        if (queue_.size() == 1) {
            write();
        }
    }

    void write() {
        session_->enter(Connection::State::events, session_->limits_.writeTime);
        boost::asio::async_write(session_->stream_, boost::asio::buffer(*queue_.front()),
                                 boost::asio::bind_executor(strand_, [self = this->shared_from_this()](
                                                                         const Error& error, std::size_t) {
                                     if (error) {
                                         self->close();
                                         return;
                                     }
                                     self->queued_ -= self->queue_.front()->size();
                                     self->queue_.pop_front();
                                     if (self->queue_.empty()) {
                                         self->session_->enterWithoutDeadline(Connection::State::events);
                                     } else {
                                         self->write();
                                     }
                                 }));
    }

    /// The client has nothing more to send; the end of its data means that it left.
    void waitForEnd() {
        session_->stream_.async_read_some(
            boost::asio::buffer(session_->discarded_),
            boost::asio::bind_executor(strand_,
                                       [self = this->shared_from_this()](const Error& error, std::size_t) {
                                           if (error) {
                                               self->close();
                                           } else if (!self->ended_) {
                                               self->waitForEnd();
                                           }
                                       }));
    }

    void beat() {
        heartbeat_.expires_after(session_->limits_.heartbeat);
        heartbeat_.async_wait(
            boost::asio::bind_executor(strand_, [self = this->shared_from_this()](const Error& error) {
                if (!error && !self->ended_) {
                    self->deliver(std::make_shared<const std::string>(": beat\n\n"));
                    self->beat();
                }
            }));
    }

    void close() {
        ended_ = true;
        heartbeat_.cancel();
        shutdown(session_->descriptor(), SHUT_RDWR);
    }

    std::shared_ptr<Session<Stream>> session_;
    boost::asio::strand<Executor> strand_;
    Timer heartbeat_;
    std::deque<Text> queue_;
    std::size_t queued_ = 0;
    bool ended_ = false;
};

} // namespace velt::host

#endif
