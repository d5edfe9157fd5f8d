// How many files this process may have open.
#ifndef VELT_HOST_BASE_OPEN_FILE_LIMIT_H
#define VELT_HOST_BASE_OPEN_FILE_LIMIT_H

#include <cstddef>

namespace velt::host {

/// Raises the soft limit, never lowers it, so that this many connections fit in besides what the host and its
/// modules open. Returns how many do.
std::size_t makeRoomForConnections(std::size_t connections);

} // namespace velt::host

#endif
