// A daemon under velt-supervise: one supervisor for each daemon, which systemd looks after where it runs the
// machine.
#ifndef VELT_STANDALONE_CONTROL_SUPERVISED_DAEMON_H
#define VELT_STANDALONE_CONTROL_SUPERVISED_DAEMON_H

#include "base/result.h"
#include "standalone/control/supervisor_launcher.h"
#include "standalone/daemons/daemon.h"
#include "standalone/supervise/control_channel.h"
#include "standalone/supervise/daemon_state.h"

#include <filesystem>
#include <memory>
#include <string>
#include <string_view>

namespace velt {

/// Speaks to the daemon's supervisor, and has the launcher start one where none runs. Its operations come one
/// at a time.
class SupervisedDaemon {
public:
    /// With the launcher that suits this machine.
    explicit SupervisedDaemon(const Daemon& daemon);
    SupervisedDaemon(const Daemon& daemon, std::unique_ptr<SupervisorLauncher> launcher);

    /// Makes the daemon run as ordered. One with the same configuration that serves already is left alone;
    /// otherwise probes the ports, and returns when the new listener has taken the place of the one that
    /// runs. Sessions go on, unless they are to end; they have ended then. Fails within 5 s with the
    /// daemon's reason; a listener that ran then runs on where that can be.
    Result<SessionCount> start(const DaemonOrder& order, bool endSessions = false);

    /// Ends the listener only, and waits for its end. Does nothing when it does not run.
    Result<SessionCount> pause();

    /// Ends the listener and its sessions, and waits for their end. Does nothing when it does not run.
    Result<SessionCount> stop();

    /// Ends the listener, and lets its sessions go on to their end, with which the supervisor ends as well.
    /// Does nothing when it does not run.
    Result<SessionCount> close();

private:
    Result<SessionCount> launch(const std::filesystem::path& folder, const DaemonOrder& order);
    Result<SessionCount> handOver(const std::filesystem::path& folder, const ProcessId& supervisor,
                                  const ControlRequest& request);
    Result<DaemonState> knownState(const std::string& what) const;
    Error failure(const std::string& what, std::string_view reason,
                  SourcePlace where = SourcePlace::current()) const;

    const Daemon& daemon_;
    std::string name_;
    std::unique_ptr<SupervisorLauncher> launcher_;
};

/// What is known about the daemon now. May be asked at any time.
DaemonState daemonState(const Daemon& daemon);

/// The folder of the files about running daemons, which is made when it is missing.
Result<std::filesystem::path> runFolder();

} // namespace velt

#endif
