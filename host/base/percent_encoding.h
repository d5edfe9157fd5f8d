// Percent-encoding in paths and queries.
#ifndef VELT_HOST_BASE_PERCENT_ENCODING_H
#define VELT_HOST_BASE_PERCENT_ENCODING_H

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace velt::host {

/// Nothing when an escape is malformed or the decoded text is not UTF-8.
std::optional<std::string> percentDecoded(std::string_view text);

/// The decoded segments of a path: "api", "a/b" and "" for "/api/a%2Fb/". Nothing as above.
std::optional<std::vector<std::string>> pathSegments(std::string_view path);

} // namespace velt::host

#endif
