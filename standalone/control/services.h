// The services as a whole: what runs, and starting what is enabled.
#ifndef VELT_STANDALONE_CONTROL_SERVICES_H
#define VELT_STANDALONE_CONTROL_SERVICES_H

#include "standalone/supervise/service_state.h"

#include <cstdint>
#include <string>

namespace velt {

/// Makes the daemons follow the stored settings after a boot: starts what is enabled. Blocks until each
/// daemon accepts connections or has failed. One that fails does not keep the others from starting; the
/// result is then negative.
int startEnabledServices();

/// Ends the daemons and their sessions. The settings stay as they are stored, so that startEnabledServices
/// starts the same ones again.
int stopServices();

/// How often the daemon behind the service ("ftpd", "sftp") was started again after it had ended by itself,
/// since its supervisor, or the machine, began. 0 for one that is off, and for an unknown name.
std::uint64_t daemonRestarts(const std::string& service);

/// What runs of the service: "ftpd", "ftpd-pure" and "ftpd-ssl" are one daemon, "sftp" is the other. Stopped
/// for an unknown name.
ServiceState serviceState(const std::string& service);

} // namespace velt

#endif
