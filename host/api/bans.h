// /api/bans: lists and lifts the bans of addresses from which too many logins failed.
#ifndef VELT_HOST_API_BANS_H
#define VELT_HOST_API_BANS_H

#include "host/api/route.h"
#include "host/base/host_log.h"

#include <vector>

namespace velt::host {

/// The log outlives the routes.
std::vector<Route> banRoutes(HostLog& log);

} // namespace velt::host

#endif
