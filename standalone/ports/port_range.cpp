#include "standalone/ports/port_range.h"

#include "base/number_text.h"
#include "schema/settings_table.h"

namespace velt {
namespace {

std::optional<int> parsePort(std::string_view text) {
    const auto port = parseNumber(text);
    return port && *port >= 1 && *port <= schema::highestPort ? std::optional(static_cast<int>(*port))
                                                              : std::nullopt;
}

} // namespace

std::optional<VELT_FTP_PORT_RANGE> parsePortRange(std::string_view text) {
    const auto dash = text.find('-');
    const auto first = parsePort(text.substr(0, dash));
    const auto last = dash == std::string_view::npos ? first : parsePort(text.substr(dash + 1));
    if (!first || !last || *first > *last) {
        return std::nullopt;
    }
    return VELT_FTP_PORT_RANGE{*first, *last};
}

std::string joinPorts(const std::vector<int>& ports, std::string_view separator) {
    std::string text;
    for (const int port : ports) {
        text.append(text.empty() ? "" : separator).append(std::to_string(port));
    }
    return text;
}

std::string formatPortRange(const VELT_FTP_PORT_RANGE& range) {
    const std::string first = std::to_string(range.first);
    return range.first == range.last ? first : first + "-" + std::to_string(range.last);
}

} // namespace velt
