// Whether a daemon could open its ports now.
#ifndef VELT_STANDALONE_PORTS_PORT_PROBE_H
#define VELT_STANDALONE_PORTS_PORT_PROBE_H

#include "base/result.h"

#include <sys/types.h>

#include <string>
#include <vector>

namespace velt {

/// Binds each port for a moment, except those on which the process `own` (0: none) listens itself. The error
/// names the first that cannot be had, and who holds it.
Result<> probePorts(const std::vector<int>& ports, pid_t own = 0);

/// Who listens on the port now, in words; "another program" when that cannot be told.
std::string describeListener(int port);

} // namespace velt

#endif
