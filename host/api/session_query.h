// Which sessions a request means, and how they are to be ended.
#ifndef VELT_HOST_API_SESSION_QUERY_H
#define VELT_HOST_API_SESSION_QUERY_H

#include "base/ip_network.h"
#include "host/api/problem.h"
#include "standalone/standalone.h"

#include <optional>
#include <string>
#include <variant>

namespace velt::host {

/// Sessions that have all of this; what is not set excludes none.
struct SessionFilter {
    std::optional<std::string> user;
    std::optional<IpNetwork> address; ///< one, or all of a network
    std::optional<SessionProtocol> protocol;

    bool empty() const { return !user && !address && !protocol; }
    bool matches(const OpenSession& session) const;
};

struct SessionQuery {
    SessionFilter filter;
    std::string reason; ///< why they are ended, may be ""
    bool dryRun = false;
};

/// What parameters a method has, beside those that it takes in any case.
enum class SessionMethod {
    list,    ///< the filter
    end,     ///< "reason" and "dry_run"
    endSome, ///< all of these
};

/// Reads "user=anna&address=192.0.2.0/24&reason=...". Or the parameter that is wrong.
std::variant<SessionQuery, FieldError> parseSessionQuery(const std::string& query, SessionMethod method);

} // namespace velt::host

#endif
