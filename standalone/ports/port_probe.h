// Whether a daemon could open its ports now.
#ifndef VELT_STANDALONE_PORTS_PORT_PROBE_H
#define VELT_STANDALONE_PORTS_PORT_PROBE_H

#include <sys/types.h>

#include <string>
#include <vector>

namespace velt {

/// Binds each port for a moment, except those on which the process `own` (0: none) listens itself. Negative
/// when one cannot be had, with the last error naming the port and who holds it.
int probePorts(const std::vector<int>& ports, pid_t own = 0);

/// Who listens on the port now, in words; "another program" when that cannot be told.
std::string describeListener(int port);

} // namespace velt

#endif
