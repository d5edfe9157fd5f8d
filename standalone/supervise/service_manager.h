// Notifies the service manager that started this process, after the protocol of sd_notify(3).
#ifndef VELT_STANDALONE_SUPERVISE_SERVICE_MANAGER_H
#define VELT_STANDALONE_SUPERVISE_SERVICE_MANAGER_H

#include "standalone/supervise/daemon_state.h"

#include <string>

namespace velt {

/// Sends assignments like "READY=1", one a line. Nothing happens where no manager listens. Thread-safe.
void tellServiceManager(const std::string& assignments);

/// "STATUS=" and a line for administrators who look at the unit: it is active as long as the supervisor runs.
std::string statusLine(const DaemonState& state);

} // namespace velt

#endif
