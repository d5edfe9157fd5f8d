#include "standalone/ports/port_probe.h"

#include "base/unique_fd.h"
#include "standalone/core/error_number.h"
#include "standalone/process/listening_sockets.h"

#include <netinet/in.h>
#include <sys/socket.h>

#include <cerrno>
#include <cstring>

namespace velt {
namespace {

int bindTo(int family, const sockaddr* address, socklen_t size) {
    const UniqueFd socket(::socket(family, SOCK_STREAM | SOCK_CLOEXEC, 0));
    const int on = 1;
    // As the daemons do: ignore connections of a former listener in TIME_WAIT.
    if (!socket || ::setsockopt(socket.get(), SOL_SOCKET, SO_REUSEADDR, &on, sizeof on) != 0 ||
        ::bind(socket.get(), address, size) != 0) {
        return errno;
    }
    // A second socket may be bound beside a listening one in some combinations of addresses; only listening
    // is proof.
    return ::listen(socket.get(), 1) == 0 ? 0 : errno;
}

/// 0, or the errno with which the port cannot be had.
int tryPort(int port) {
    sockaddr_in6 any6{};
    any6.sin6_family = AF_INET6;
    any6.sin6_port = htons(static_cast<in_port_t>(port));
    const int error = bindTo(AF_INET6, reinterpret_cast<const sockaddr*>(&any6), sizeof any6);
    if (error != EAFNOSUPPORT && error != EADDRNOTAVAIL) {
        return error;
    }
    sockaddr_in any4{}; // a kernel without IPv6
    any4.sin_family = AF_INET;
    any4.sin_port = htons(static_cast<in_port_t>(port));
    return bindTo(AF_INET, reinterpret_cast<const sockaddr*>(&any4), sizeof any4);
}

} // namespace

std::string describeListener(int port) {
    std::vector<ListeningSocket> sockets = listeningSockets().valueOr({});
    std::erase_if(sockets, [port](const ListeningSocket& socket) { return socket.port != port; });
    const auto owners = ownersOf(sockets);
    return describeOwner(owners.empty() ? SocketOwner{} : owners.begin()->second);
}

Result<> probePorts(const std::vector<int>& ports, pid_t own) {
    for (const int port : ports) {
        if (own > 0 && listensOn(own, port)) {
            continue;
        }
        const int error = tryPort(port);
        const std::string name = "Port " + std::to_string(port);
        if (error == EADDRINUSE) {
            return Error(ErrorNumber::portTaken, name + " is in use by " + describeListener(port) + ".");
        }
        if (error != 0) {
            return Error(ErrorNumber::daemon, name + " cannot be opened: " + std::strerror(error) + ".");
        }
    }
    return {};
}

} // namespace velt
