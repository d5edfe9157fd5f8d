// POST /api/restart: the services take up what their files say now.
#ifndef VELT_HOST_API_RESTART_H
#define VELT_HOST_API_RESTART_H

#include "host/api/route.h"
#include "host/base/host_log.h"

namespace velt::host {

/// A daemon that runs from another certificate, configuration or program than it would be started with gives
/// way to a new one; one that is on and down is started. The log outlives the route.
Route restartRoute(HostLog& log);

} // namespace velt::host

#endif
