// The state of daemons by the names that the contract has for their services.
#ifndef VELT_TESTS_STANDALONE_SUPPORT_DAEMON_STATES_H
#define VELT_TESTS_STANDALONE_SUPPORT_DAEMON_STATES_H

#include "standalone/control/supervised_daemon.h"

#include <string>

namespace velt::test {

/// Stopped for an unknown name.
inline DaemonState serviceState(const std::string& service) {
    const Daemon* const daemon = daemonServing(service);
    return daemon == nullptr ? DaemonState{} : daemonState(*daemon);
}

} // namespace velt::test

#endif
