// /api/keys: lists, adds and removes the public keys with which users log in over SFTP.
#ifndef VELT_HOST_API_USER_KEYS_H
#define VELT_HOST_API_USER_KEYS_H

#include "host/api/route.h"
#include "host/base/host_log.h"

#include <vector>

namespace velt::host {

/// The log outlives the routes.
std::vector<Route> keyRoutes(HostLog& log);

} // namespace velt::host

#endif
