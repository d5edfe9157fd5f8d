// Whether a service can have a port, and who holds it.
#ifndef VELT_STANDALONE_CONTROL_PORT_CONFLICT_H
#define VELT_STANDALONE_CONTROL_PORT_CONFLICT_H

#include "base/result.h"

#include <optional>
#include <string>
#include <string_view>

namespace velt {

/// A port that a service cannot have.
struct PortConflict {
    int port = 0;
    std::string holder;   ///< in words: "the SFTP service", "nginx (process 812)", "the service iscsi of this
                          ///< server"; "" when it is not a port
    std::string sentence; ///< for people
};

/// The first of these ports that the service ("ftp", "ssh", or another's name) cannot have; nothing when it
/// can have them all. Fails when that cannot be told; the ports must not be taken then. Thread-safe.
Result<std::optional<PortConflict>> findPortConflict(std::string_view service, int firstPort, int lastPort);

} // namespace velt

#endif
