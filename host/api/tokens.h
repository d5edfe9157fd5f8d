// /api/tokens: lists, makes and removes tokens.
#ifndef VELT_HOST_API_TOKENS_H
#define VELT_HOST_API_TOKENS_H

#include "host/api/events.h"
#include "host/api/route.h"
#include "host/api/token_store.h"
#include "host/base/host_log.h"

namespace velt::host {

/// The store, the hub and the log outlive the routes.
std::vector<Route> tokenRoutes(TokenStore& store, EventHub& events, HostLog& log);

} // namespace velt::host

#endif
