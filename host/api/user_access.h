// /api/access: what the logins of a user would see, and why.
#ifndef VELT_HOST_API_USER_ACCESS_H
#define VELT_HOST_API_USER_ACCESS_H

#include "host/api/route.h"

#include <vector>

namespace velt::host {

std::vector<Route> accessRoutes();

} // namespace velt::host

#endif
