// What runs a daemon: a supervisor of its own, which systemd looks after where it is in charge of the
// machine.
#ifndef VELT_STANDALONE_CONTROL_SERVICE_BACKEND_H
#define VELT_STANDALONE_CONTROL_SERVICE_BACKEND_H

#include "standalone/daemons/daemon_plan.h"
#include "standalone/supervise/service_state.h"

#include <memory>
#include <string>

namespace velt {

/// Runs one daemon. Every operation returns a negative number on failure, with the last error set. Operations
/// that change something come one at a time; state() may be asked any time.
class ServiceBackend {
public:
    virtual ~ServiceBackend() = default;

    /// Makes the daemon run as planned. Does nothing when one with the same configuration serves already;
    /// otherwise probes the ports, ends the listener that runs, and returns when the new one listens, or
    /// within 5 s with the daemon's reason.
    virtual int start(const DaemonPlan& plan) = 0;

    /// Ends the listener only, and waits for its end. One that does not run is no failure.
    virtual int pause() = 0;

    /// Ends the listener and its sessions, and waits for their end. One that does not run is no failure.
    virtual int stop() = 0;

    virtual ServiceState state() const = 0;
};

/// Whether systemd starts a supervisor again that was killed.
bool systemdKeepsSupervisors();

/// The backend for the daemon "ftpd" or "sftp" on this machine.
std::unique_ptr<ServiceBackend> makeServiceBackend(const std::string& daemon);

/// The folder of the files about running daemons, which is made when it is missing; empty, with the last
/// error set, when it cannot be made.
std::filesystem::path runDirectory();

/// "The FTP daemon", "The SFTP daemon": how sentences begin.
std::string daemonTitle(const std::string& daemon);

/// Fails with the sentence that the daemon does not start, and why.
int failedToStart(const std::string& daemon, std::string reason);

} // namespace velt

#endif
