// Requests and answers, without sockets and parsers.
#ifndef VELT_HOST_HTTP_MESSAGE_H
#define VELT_HOST_HTTP_MESSAGE_H

#include <sys/types.h>
#include <unistd.h>

#include <cstddef>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace velt::host {

/// The other end of a connection, as the kernel knows it.
struct Peer {
    bool isUnixSocket = false;
    bool isTls = false;
    std::string address;      ///< "127.0.0.1"; "local" for a Unix socket
    std::string localAddress; ///< the address that the client connected to
    unsigned short localPort = 0;
    uid_t uid = static_cast<uid_t>(-1); ///< of a Unix socket's peer
    std::vector<gid_t> groups;          ///< of a Unix socket's peer
};

/// Whether it is root or the host's own user, on the Unix socket.
inline bool isOwn(const Peer& peer) {
    return peer.isUnixSocket && (peer.uid == 0 || peer.uid == geteuid());
}

/// A request. While only its head has been read, the body is empty.
struct HttpRequest {
    std::string method;
    std::string target; ///< path and query, as sent
    std::string host;
    std::string origin;        ///< "" when there is none
    std::string fetchSite;     ///< "" when there is none
    std::string authorization; ///< "" when there is none
    std::string ifMatch;       ///< "" when there is none
    std::string accept;        ///< "" when there is none
    std::string body;
    bool wellFormed = true; ///< if false, the server refuses it once access is granted

    /// The target without query, and the query without "?".
    std::string path() const { return target.substr(0, target.find('?')); }
    std::string query() const {
        const std::size_t mark = target.find('?');
        return mark == std::string::npos ? "" : target.substr(mark + 1);
    }
};

struct HttpResponse {
    int status = 200;
    std::string contentType;
    std::string body;
    std::vector<std::pair<std::string, std::string>> headers;
};

enum class Role {
    viewer,
    admin,
};

/// Who sent a request, once access was granted.
struct Principal {
    Role role = Role::viewer;
    std::string actor;
    std::string address;
    /// Whose connections are counted together and whose requests share their turns; "" is root, whose
    /// connections are not limited.
    std::string holder;
    std::string tokenId; ///< of the token that was shown; "" when there was none
};

/// The answer to a request that is refused by its head.
struct Refusal {
    HttpResponse response;
    bool delayed = false; ///< a failed attempt: the answer is delayed
};

/// A client that reads the stream of events.
class EventReader {
public:
    EventReader() = default;
    virtual ~EventReader() = default;
    EventReader(const EventReader&) = delete;
    EventReader& operator=(const EventReader&) = delete;

    /// Sends one event, which is complete. From any thread; does not block.
    virtual void deliver(const std::shared_ptr<const std::string>& event) = 0;

    /// Ends the connection. From any thread; does not block.
    virtual void end() = 0;
};

/// What the server asks of the application, which is on a floor above and is not known here. Called by
/// several threads at once.
class HttpHandler {
public:
    using Done = std::function<void(HttpResponse)>;

    HttpHandler() = default;
    virtual ~HttpHandler() = default;
    HttpHandler(const HttpHandler&) = delete;
    HttpHandler& operator=(const HttpHandler&) = delete;

    /// Checks a request's head. Grants access by filling `principal`, or refuses the request.
    virtual std::optional<Refusal> checkAccess(const HttpRequest& head, const Peer& peer,
                                               Principal& principal) = 0;

    /// How large the body of a request may be that was granted access, in bytes, if the server's own limit
    /// is not smaller.
    virtual std::size_t bodyLimit(const HttpRequest& head, const Principal& principal) const = 0;

    /// Whether the request asks for the stream of events.
    virtual bool asksForEvents(const HttpRequest& request) const = 0;

    /// Answers a request by calling `done` once, now or later, on any thread. Must not block.
    virtual void handle(HttpRequest request, const Principal& principal, Done done) = 0;

    /// The answer to what the server refuses by itself: a malformed or oversized request, an overload.
    virtual HttpResponse failure(int status, const std::string& detail) = 0;

    /// The request that asked for the stream of events has its reader now.
    virtual void addEventReader(const std::shared_ptr<EventReader>& reader, const HttpRequest& request,
                                const Principal& principal) = 0;
};

} // namespace velt::host

#endif
