// /api/sessions: who is logged in, and ending sessions.
#ifndef VELT_HOST_API_SESSIONS_H
#define VELT_HOST_API_SESSIONS_H

#include "host/api/route.h"
#include "host/base/host_log.h"

#include <vector>

namespace velt::host {

/// The log outlives the routes.
std::vector<Route> sessionRoutes(HostLog& log);

} // namespace velt::host

#endif
