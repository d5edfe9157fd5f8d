// The query of a request's target.
#ifndef VELT_HOST_BASE_QUERY_TEXT_H
#define VELT_HOST_BASE_QUERY_TEXT_H

#include <optional>
#include <string>
#include <vector>

namespace velt::host {

struct QueryParameter {
    std::string key;
    std::optional<std::string> value; ///< decoded; nothing when it is no percent-encoded UTF-8
};

/// Reads "since=2026-11-21&limit=3", in its order. A parameter without "=" has the value "".
std::vector<QueryParameter> queryParameters(const std::string& query);

/// A key that comes more than once, so that nobody can tell which value counts; nothing when there is none.
std::optional<std::string> repeatedKey(const std::vector<QueryParameter>& parameters);

/// What is expected of such a key.
inline constexpr const char* oneValue = "one value, not several";

} // namespace velt::host

#endif
