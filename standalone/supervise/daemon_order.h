// What a supervisor is told to run.
#ifndef VELT_STANDALONE_SUPERVISE_DAEMON_ORDER_H
#define VELT_STANDALONE_SUPERVISE_DAEMON_ORDER_H

#include <string>
#include <string_view>
#include <vector>

namespace velt {

/// What became of the sessions of a daemon that was replaced or stopped; all of them count, logged in or not.
struct SessionCount {
    int ended = 0;
    int kept = 0;
    bool operator==(const SessionCount&) const = default;
};

/// One daemon, ready to be started in the foreground; it writes its reasons to standard error.
struct DaemonOrder {
    std::string configurationHash;      ///< equal hashes: a running daemon need not be started again
    std::vector<int> ports;             ///< TCP ports: the daemon is ready when it listens on all of them
    std::vector<std::string> arguments; ///< arguments[0] is an absolute path
    /// Its ports can be had by another one at the same time that says so, too: it then succeeds the former
    /// one without a moment in which nobody listens.
    bool sharesPorts = false;
    bool renew = false; ///< a running daemon gives way to a new one although the hashes are equal
};

/// Stands before the ports of such an order on the supervisor's command line.
inline constexpr std::string_view sharedPortsPrefix = "shared,";

} // namespace velt

#endif
