// Listening sockets. Needs no HTTP library.
#ifndef VELT_HOST_HTTP_LISTENER_H
#define VELT_HOST_HTTP_LISTENER_H

#include "base/unique_fd.h"
#include "host/http/message.h"

#include <filesystem>
#include <stdexcept>
#include <string>
#include <vector>

namespace velt::host {

/// The host cannot listen somewhere; what() is a sentence for the administrator.
class ListenError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// Owns a listening descriptor, and the path of a Unix socket that it made.
class Listener {
public:
    /// Listens on an address such as "127.0.0.1:8080", "[::1]:0" or "localhost:8080"; port 0 takes a free
    /// one. Addresses other than loopback need `allowRemote`. Throws ListenError.
    static Listener tcp(const std::string& address, bool allowRemote);

    /// Listens on a Unix socket that its owner can connect to, and the group once it could be looked up.
    /// Replaces the socket of a dead host, not that of a live one. Throws ListenError.
    static Listener unixSocket(const std::filesystem::path& path, const std::string& group);

    /// The sockets that the service manager passed by socket activation, usually none. `allowRemote` is as
    /// for tcp(). Throws ListenError.
    static std::vector<Listener> inherited(bool allowRemote);

    Listener(Listener&&) noexcept = default;
    Listener& operator=(Listener&&) = delete;
    Listener(const Listener&) = delete;
    ~Listener();

    /// False where nobody of the group can connect yet, since there is none or it cannot be looked up: to be
    /// called again then. Throws ListenError.
    bool shareWithGroup();

    int descriptor() const { return descriptor_.get(); }
    bool isUnixSocket() const { return isUnixSocket_; }

    /// "127.0.0.1:8080", or the path.
    std::string name() const;
    unsigned short port() const; ///< 0 for a Unix socket

private:
    Listener(int descriptor, bool isUnixSocket);

    UniqueFd descriptor_;
    bool isUnixSocket_;
    std::filesystem::path path_; ///< to unlink in the destructor; "" for none
    std::string group_;          ///< that is still to have it; "" for none
};

/// What the kernel knows about a connected socket.
Peer peerOf(int descriptor, bool isTls);

} // namespace velt::host

#endif
