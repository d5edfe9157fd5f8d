// Percent-encoding, as paths and queries use it.
#ifndef VELT_HOST_BASE_PERCENT_ENCODING_H
#define VELT_HOST_BASE_PERCENT_ENCODING_H

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace velt::host {

/// Nothing when an escape is none, or the decoded text is no UTF-8.
std::optional<std::string> percentDecoded(std::string_view text);

/// The decoded segments of a path: "/api/a%2Fb/" is "api", "a/b" and "". Nothing as above.
std::optional<std::vector<std::string>> pathSegments(std::string_view path);

} // namespace velt::host

#endif
