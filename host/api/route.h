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
    std::function<HttpResponse(const Call&)> answer;
    bool takesLists = false; ///< so that an admin's body may be as large as the server allows
    /// Whether the server makes a stream of events of a request with this query, instead of asking for an
    /// answer; empty: never.
    std::function<bool(const std::string& query)> isStream{};
};

} // namespace velt::host

#endif
