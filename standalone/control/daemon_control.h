// The two daemons and how they follow the stored settings.
#ifndef VELT_STANDALONE_CONTROL_DAEMON_CONTROL_H
#define VELT_STANDALONE_CONTROL_DAEMON_CONTROL_H

#include "standalone/supervise/service_state.h"

#include <optional>
#include <string>
#include <string_view>

namespace velt {

enum class Daemon {
    ftp,  ///< one process for FTP and FTPS
    sftp, ///< a listener and its sessions
};

/// "ftpd" or "sftp".
std::string daemonName(Daemon daemon);

/// The daemon behind a service name; nothing, with the last error set, for a name that is none of ours.
std::optional<Daemon> daemonOf(const char* service);

/// Makes the daemon run with the stored settings; the FTP daemon is stopped where they enable neither FTP nor
/// FTPS. A start, and a stop that no start follows, end with followWithFirewall. Like the following: negative
/// on failure, with the last error set; safe from all threads and processes.
int startDaemon(Daemon daemon);

/// Ends the daemon and its sessions.
int stopDaemon(Daemon daemon);

/// The same as the first half of a restart: refused, so that the former daemon serves on, when the ports of
/// the stored settings are held by another program, or when the daemon's own test refuses their
/// configuration.
int stopDaemonForRestart(Daemon daemon);

/// Ends the listener only.
int pauseDaemon(Daemon daemon);

/// Makes the firewall follow the stored settings. A daemon that does what was asked of it has not failed
/// because of its rules: a failure goes to syslog, and the last error stays as it was.
void followWithFirewall();

/// Whether the daemon's supervisor ended without having been asked to. One that was stopped, or could not
/// start its daemon, says so before its end; and a paused service waits for its resume, with or without one.
bool lostItsSupervisor(const ServiceState& state);

/// Brings a daemon that does not serve under a supervisor back to what the stored settings say: ends what a
/// lost supervisor left, and starts it when it is enabled.
int restoreDaemon(Daemon daemon);

ServiceState daemonState(Daemon daemon);

} // namespace velt

#endif
