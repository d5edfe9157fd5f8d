// The port of a daemon while its successor listens on it, too.
#ifndef VELT_STANDALONE_PROCESS_SHARED_PORT_H
#define VELT_STANDALONE_PROCESS_SHARED_PORT_H

#include "base/unique_fd.h"

#include <sys/types.h>

namespace velt {

/// The listening socket of another process on this TCP port, as a descriptor of this one. None where the
/// process has no such socket, or does not let this one have it, which takes the rights of a debugger.
UniqueFd listenerOf(pid_t pid, int port);

/// Has the kernel give all new connections to the second of the two sockets that listen on the same address
/// and port, in the order in which they began to. False where they do not share one.
bool steerToSuccessor(const UniqueFd& former, const UniqueFd& successor);

/// Whether a connection waits at the listening socket to be accepted.
bool hasWaiting(const UniqueFd& listener);

} // namespace velt

#endif
