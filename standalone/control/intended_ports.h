// Ports that the daemons are to have when all of a change is done.
#ifndef VELT_STANDALONE_CONTROL_INTENDED_PORTS_H
#define VELT_STANDALONE_CONTROL_INTENDED_PORTS_H

#include "base/result.h"
#include "standalone/daemons/daemon.h"

#include <map>
#include <string>
#include <vector>

namespace velt {

/// What is not named here stays as it is stored.
struct IntendedPorts {
    std::map<std::string, int> listeners;                  ///< by the daemon's apiName
    std::map<std::string, VELT_FTP_PORT_RANGE> ofSessions; ///< likewise

    bool operator==(const IntendedPorts&) const = default;
};

/// While it lives, this thread's questions about ports (findPortConflict, and whether a daemon could start)
/// take these for what the daemons have. One at a time on a thread.
class WithIntendedPorts {
public:
    explicit WithIntendedPorts(IntendedPorts ports);
    ~WithIntendedPorts();
    WithIntendedPorts(const WithIntendedPorts&) = delete;
    WithIntendedPorts& operator=(const WithIntendedPorts&) = delete;

private:
    IntendedPorts ports_;
};

/// The daemon's ports: the stored ones, but for those that this thread intends.
Result<std::vector<DaemonPorts>> portsToBe(const Daemon& daemon);

/// Whether another of our daemons listens on the port now and gives it up by what this thread intends.
bool isGivenUp(int port, const Daemon& asking);

} // namespace velt

#endif
