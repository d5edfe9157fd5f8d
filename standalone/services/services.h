// What runs, for the other parts of the platform.
#ifndef VELT_STANDALONE_SERVICES_SERVICES_H
#define VELT_STANDALONE_SERVICES_SERVICES_H

#include "standalone/supervise/service_state.h"

#include <string>

namespace velt {

/// What runs of the service: "ftpd", "ftpd-pure" and "ftpd-ssl" are one daemon, "sftp" is the other. Stopped
/// for an unknown name.
ServiceState serviceState(const std::string& service);

} // namespace velt

#endif
