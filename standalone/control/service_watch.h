// Supervisors look after daemons; this looks after supervisors, and tells what happens to both.
#ifndef VELT_STANDALONE_CONTROL_SERVICE_WATCH_H
#define VELT_STANDALONE_CONTROL_SERVICE_WATCH_H

#include "base/result.h"

namespace velt {

/// Looks after the daemons, on a thread of its own:
/// - Twice a second, whether their supervisors live. What lost its supervisor is started again with the
///   stored settings (ended, where these have switched it off): its sessions are cut. A supervisor brings
///   back a daemon that dies; killed itself, it cannot, and its daemon's words go nowhere. Where systemd
///   keeps the supervisors, it does this itself.
/// - A service that is switched on and whose start failed is tried again, see start_retry.h.
/// - A daemon that came back with former settings, or a former certificate, is handed over to what is stored.
/// - Daemons that die, come back, or are started and stopped by other programs get entries in the
///   administrator log and events.
///
/// A second call does nothing. No process may fork a child that goes on with this library while it watches.
Result<> watchServices();

/// From the first to the last of these, which come in pairs, no failed start is tried again: a change is
/// under way that may be about to do it.
void holdServiceWatch();
void releaseServiceWatch();

/// Ends the watch, if there is one, and waits for what it does at the moment. To be called before the process
/// ends.
void unwatchServices();

} // namespace velt

#endif
