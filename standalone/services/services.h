// The services beyond what the contract says about them.
#ifndef VELT_STANDALONE_SERVICES_SERVICES_H
#define VELT_STANDALONE_SERVICES_SERVICES_H

#include "standalone/supervise/service_state.h"

#include <string>

namespace velt {

/// For the time after a boot: loads the firewall's rules, starts every daemon that the stored settings enable and stops those
/// that they do not. Negative when a daemon failed, with the last error of the last one that did; the others were
/// started all the same. Rules that cannot be loaded are written to the system log.
int startEnabledServices();

/// What runs of the service: "ftpd", "ftpd-pure" and "ftpd-ssl" are one daemon, "sftp" is the other. Stopped for an unknown
/// name.
ServiceState serviceState(const std::string& service);

} // namespace velt

#endif
