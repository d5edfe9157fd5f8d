// Supervisors look after daemons; this looks after supervisors.
#ifndef VELT_STANDALONE_CONTROL_SERVICE_WATCH_H
#define VELT_STANDALONE_CONTROL_SERVICE_WATCH_H

#include "base/result.h"

namespace velt {

/// Looks, twice a second and on a thread of its own, whether the supervisors of the daemons live, and starts
/// what lost its supervisor again with the stored settings (ended, where these have switched it off): its
/// sessions are cut. A supervisor brings back a daemon that dies; killed itself, it cannot, and its daemon's
/// words go nowhere. Where systemd keeps the supervisors, it does this alone. A second call does nothing. No
/// process may fork a child that goes on with this library while it watches.
Result<> watchServices();

/// Ends the watch, if there is one, and waits for what it does at the moment. To be called before the process
/// ends.
void unwatchServices();

} // namespace velt

#endif
