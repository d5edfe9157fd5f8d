// Who listens on which TCP port, as the kernel tells; no connection is made.
#ifndef VELT_STANDALONE_PROCESS_LISTENING_SOCKETS_H
#define VELT_STANDALONE_PROCESS_LISTENING_SOCKETS_H

#include "base/result.h"

#include <sys/types.h>

#include <map>
#include <string>
#include <vector>

namespace velt {

struct ListeningSocket {
    int port = 0;
    unsigned long inode = 0;
    uid_t user = 0;          ///< who opened it
    bool ofLoopback = false; ///< nobody else's machine can reach it
};

/// The listening TCP sockets, IPv4 and IPv6, of the network namespace in which the process `pid` lives; 0 is
/// the caller.
Result<std::vector<ListeningSocket>> listeningSockets(pid_t pid = 0);

/// The same from the kernel's tables of all sockets, for one that answers no such question; takes longer.
Result<std::vector<ListeningSocket>> readListeningSockets(pid_t pid = 0);

/// Whether the process itself holds a listening socket on the port. If its sockets cannot be seen:
/// whether its user has such a socket. False when that cannot be told.
bool listensOn(pid_t pid, int port);

struct SocketOwner {
    pid_t pid = 0; ///< 0: unknown, since its process belongs to another user or namespace
    std::string program;
};

/// The owners of these sockets, by inode. Sockets whose owner cannot be seen are missing. Of several
/// processes that share a socket the one with the smallest pid counts.
std::map<unsigned long, SocketOwner> ownersOf(const std::vector<ListeningSocket>& sockets);

/// The owner in words, for people: "nginx (process 812)", or "another program" when it is unknown.
std::string describeOwner(const SocketOwner& owner);

} // namespace velt

#endif
