// Listening sockets, made without the HTTP library.
#ifndef VELT_HOST_HTTP_LISTENER_H
#define VELT_HOST_HTTP_LISTENER_H

#include "host/http/message.h"

#include <filesystem>
#include <stdexcept>
#include <string>
#include <vector>

namespace velt::host {

/// A place cannot be listened on; what() is a sentence for the administrator.
class ListenError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// A listening descriptor, closed at the end; a Unix socket's path is unlinked then if it was made here.
class Listener {
public:
    /// An address such as "127.0.0.1:8080", "[::1]:0" or "localhost:8080"; port 0 takes a free one. Anything
    /// but loopback is refused unless `allowRemote`. Throws ListenError.
    static Listener tcp(const std::string& address, bool allowRemote);

    /// A Unix socket that its owner and the group (when there is such a group) can connect to. What a dead
    /// host has left at the path is removed, a live one is not. Throws ListenError.
    static Listener unixSocket(const std::filesystem::path& path, const std::string& group);

    /// What the service manager hands over when it started this process by socket activation; usually none.
    /// The rule of tcp() holds for these as well. Throws ListenError.
    static std::vector<Listener> inherited(bool allowRemote);

    Listener(Listener&& other) noexcept;
    Listener& operator=(Listener&&) = delete;
    Listener(const Listener&) = delete;
    ~Listener();

    int descriptor() const { return descriptor_; }
    bool isUnixSocket() const { return family_ == familyUnix; }

    /// "127.0.0.1:8080", or the path.
    std::string name() const;
    unsigned short port() const; ///< 0 for a Unix socket

private:
    static const int familyUnix;

    Listener(int descriptor, int family, std::filesystem::path path);

    int descriptor_;
    int family_;
    std::filesystem::path path_; ///< to unlink at the end
};

/// What the kernel tells about a connected socket.
Peer peerOf(int descriptor, bool isTls);

} // namespace velt::host

#endif
