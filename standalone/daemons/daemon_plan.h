// How the stored settings become a running daemon: what to start, and what it stands for.
#ifndef VELT_STANDALONE_DAEMONS_DAEMON_PLAN_H
#define VELT_STANDALONE_DAEMONS_DAEMON_PLAN_H

#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace velt {

/// One daemon, ready to be started in the foreground by its argument vector; it writes its reasons to
/// standard error.
struct DaemonPlan {
    std::vector<std::string>
        arguments; ///< arguments[0] is an absolute path; started with a clean environment
    std::filesystem::path
        executable;                ///< what runs in that process in the end (a wrapper replaces itself by it)
    std::string configurationHash; ///< equal hashes: a running daemon need not be started anew
    std::vector<int> listenPorts;  ///< TCP ports that the process listens on once it is ready
    std::filesystem::path
        folder; ///< holds what this configuration alone uses; its siblings are those of former ones
};

/// Renders, tests and writes the configuration that follows from the stored settings, and all that it needs:
/// certificate or host keys, the folder of logins. A configuration has a folder of its own, so that a
/// daemon which runs for a former one can be started again for that one; what all of them read at logins is
/// replaced atomically. So this may be called while the daemon runs. Nothing, with the last error set, when
/// the settings cannot be read, enable neither FTP nor FTPS, or are refused by the daemon's own test, or when
/// root may not make the mounts here that confine each session. Thread-safe.
std::optional<DaemonPlan> planFtpDaemon();

/// The same for SFTP, whatever the stored enable flag says.
std::optional<DaemonPlan> planSftpDaemon();

/// Removes what former configurations left beside the folder of this one. To be called when its daemon
/// serves, since before that the former one may be wanted again.
void removeFormerPlans(const DaemonPlan& plan);

} // namespace velt

#endif
