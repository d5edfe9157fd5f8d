// How many descriptors this process may have open.
#ifndef VELT_HOST_BASE_OPEN_FILE_LIMIT_H
#define VELT_HOST_BASE_OPEN_FILE_LIMIT_H

#include <cstddef>

namespace velt::host {

/// Raises the soft limit so that this many connections fit beside what the host and its modules open
/// otherwise; never lowers it. Returns how many connections fit.
std::size_t makeRoomForConnections(std::size_t connections);

} // namespace velt::host

#endif
