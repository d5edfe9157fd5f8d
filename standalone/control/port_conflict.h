// Whether a service can have a port, and who holds it.
#ifndef VELT_STANDALONE_CONTROL_PORT_CONFLICT_H
#define VELT_STANDALONE_CONTROL_PORT_CONFLICT_H

#include <string>
#include <string_view>

namespace velt {

/// Who holds a port.
struct PortConflict {
    int port = 0;       ///< 0: there was no conflict
    std::string holder; ///< in words: "the SFTP service", "nginx (process 812)"
};

/// Whether the service ("ftp", "ssh", or another's name) cannot have one of these ports: 0 when it can have
/// them all; else negative, with the last error set and the conflict kept for lastPortConflict. A question
/// that cannot be answered is no permission to take the port. Thread-safe.
int findPortConflict(std::string_view service, int firstPort, int lastPort);

/// What the calling thread's last findPortConflict found.
PortConflict lastPortConflict();

} // namespace velt

#endif
