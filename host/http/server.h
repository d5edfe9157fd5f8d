// The HTTP server: HTTP/1.1 over TCP, TLS and Unix sockets.
#ifndef VELT_HOST_HTTP_SERVER_H
#define VELT_HOST_HTTP_SERVER_H

#include "host/http/listener.h"
#include "host/http/message.h"

#include <chrono>
#include <cstddef>
#include <filesystem>
#include <memory>
#include <vector>

namespace velt::host {

struct HttpLimits {
    std::size_t head = std::size_t{16} * 1024; ///< bytes
    std::size_t body = std::size_t{1024} * 1024;
    std::size_t connections = 1000;
    std::size_t connectionsOfOne = 250; ///< with the same token or user
    std::size_t eventStreamsOfOne = 32;
    std::size_t delayedRefusals = 100; ///< waiting at one time; further failed attempts are answered at once
    std::size_t queuedEvents =
        std::size_t{1024} * 1024; ///< bytes that a slow reader of events may lag behind
    std::chrono::milliseconds headTime{10'000};
    std::chrono::milliseconds bodyTime{30'000};
    std::chrono::milliseconds idleTime{30'000};
    std::chrono::milliseconds writeTime{20'000};
    std::chrono::milliseconds drainTime{2'000};
    std::chrono::milliseconds refusalDelay{1'000}; ///< of the answer to a failed attempt
    std::chrono::milliseconds heartbeat{15'000};   ///< of a stream of events
    std::chrono::milliseconds sweep{1'000};        ///< how often deadlines are checked
    std::chrono::milliseconds groupSearch{10'000}; ///< for the group of a Unix socket that was not found
};

struct TlsFiles {
    std::filesystem::path certificate; ///< PEM, with its chain; empty: no TLS
    std::filesystem::path key;
};

class HttpServer {
public:
    /// The handler outlives the server. Throws ListenError when the TLS files cannot be used.
    HttpServer(HttpHandler& handler, const HttpLimits& limits, const TlsFiles& tls);

    /// Stops at once.
    ~HttpServer();
    HttpServer(const HttpServer&) = delete;
    HttpServer& operator=(const HttpServer&) = delete;

    /// Call it before start(). TCP listeners use TLS if there is a certificate, Unix sockets never do.
    void add(Listener listener);

    /// So many threads serve what comes over TCP, and one more what comes over Unix sockets.
    void start(unsigned threads);

    /// Stops accepting, ends idle connections and streams of events at once, and waits up to `patience` until
    /// the running requests are answered.
    void stop(std::chrono::milliseconds patience);

    std::size_t connections() const;

private:
    struct Core;

    std::unique_ptr<Core> core_;
};

} // namespace velt::host

#endif
