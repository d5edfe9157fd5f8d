// What a supervisor is told to run.
#ifndef VELT_STANDALONE_SUPERVISE_DAEMON_ORDER_H
#define VELT_STANDALONE_SUPERVISE_DAEMON_ORDER_H

#include <string>
#include <vector>

namespace velt {

/// One daemon, ready to be started in the foreground; it writes its reasons to standard error.
struct DaemonOrder {
    std::string configurationHash;      ///< equal hashes: a running daemon need not be started again
    std::vector<int> ports;             ///< TCP ports: the daemon is ready when it listens on all of them
    std::vector<std::string> arguments; ///< arguments[0] is an absolute path
};

} // namespace velt

#endif
