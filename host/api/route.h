// How a resource of the API is reached.
#ifndef VELT_HOST_API_ROUTE_H
#define VELT_HOST_API_ROUTE_H

#include "host/http/message.h"
#include "host/module/request_order.h"

#include <functional>
#include <string>
#include <vector>

namespace velt::host {

/// A request that was granted access.
struct Call {
    HttpRequest request;
    std::vector<std::string> path; ///< its segments
    Principal principal;
    std::string id;
};

/// One method of one path.
struct Route {
    std::string method;
    std::vector<std::string> path; ///< its segments; "*" stands for any one
    bool adminOnly;
    RequestOrder::Kind kind;
    std::function<HttpResponse(const Call&)> answer; ///< empty: the server makes it a stream of events
    bool takesLists = false; ///< so that an admin's body may be as large as the server allows
};

} // namespace velt::host

#endif
