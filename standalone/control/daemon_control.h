// Starting and stopping daemons so that they follow the stored settings. All of it is safe from all threads
// and processes.
#ifndef VELT_STANDALONE_CONTROL_DAEMON_CONTROL_H
#define VELT_STANDALONE_CONTROL_DAEMON_CONTROL_H

#include "base/result.h"
#include "standalone/daemons/daemon.h"
#include "standalone/supervise/daemon_state.h"

namespace velt {

/// Makes the daemon run with the stored settings, or stops it where they give no plan. A daemon that runs
/// with others hands over: its sessions go on or end as the thread's request says, else by the change. A
/// start, and a stop that no start follows, end with followWithFirewall.
Result<> startDaemon(const Daemon& daemon);

/// The same, and one that runs with the stored settings already gives way to a new one, too: it may be stuck.
Result<> renewDaemon(const Daemon& daemon);

/// Ends the daemon and its sessions. Within a request (service_request.h), this, the next and a pause wait
/// for its end or a start, while the daemon serves and is on by the stored settings.
Result<> stopDaemon(const Daemon& daemon);

/// The same as the first half of a restart: refused, so that the former daemon serves on, when the ports of
/// the stored settings are held by another program, or when the daemon's own test refuses their
/// configuration.
Result<> stopDaemonForRestart(const Daemon& daemon);

/// Ends the listener of a daemon that is off from now on, and leaves its sessions to go on to their end. A
/// start takes them over.
Result<> closeDaemon(const Daemon& daemon);

/// Whether a start could succeed, as far as that can be told without one: fails when its ports are held by
/// another program, or the daemon's own test refuses the stored settings. Changes nothing.
Result<> checkStart(const Daemon& daemon);

/// Ends the listener only. Refused for a daemon whose sessions end with it.
Result<> pauseDaemon(const Daemon& daemon);

/// Whether the daemon's supervisor ended without having been asked to. One that was stopped, or could not
/// start its daemon, says so before its end; and a paused service waits for its resume, with or without one.
bool lostItsSupervisor(const DaemonState& state);

/// Brings a daemon that does not serve under a supervisor back to what the stored settings say: ends what a
/// lost supervisor left, and starts it when it is enabled.
Result<> restoreDaemon(const Daemon& daemon);

} // namespace velt

#endif
