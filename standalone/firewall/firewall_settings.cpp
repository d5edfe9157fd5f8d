#include "standalone/firewall/firewall_settings.h"

#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/core/strict_file.h"
#include "standalone/ports/port_range.h"

#include <algorithm>
#include <array>
#include <sstream>

namespace velt {
namespace {

/// In the order of FirewallMode.
constexpr std::array<std::string_view, 3> modes{"off", "accept", "drop"};

FirewallMode readMode(StrictFile& file, FirewallMode fallback) {
    const auto text = file.value("mode", optionalKey);
    if (!text) {
        return fallback;
    }
    const auto* const known = std::ranges::find(modes, *text);
    if (known == modes.end()) {
        file.refuse("mode", "off, accept or drop");
        return fallback;
    }
    return static_cast<FirewallMode>(known - modes.begin());
}

std::vector<VELT_FTP_PORT_RANGE> readPorts(StrictFile& file) {
    std::vector<VELT_FTP_PORT_RANGE> ports;
    std::istringstream words(file.value("ports", optionalKey).value_or(""));
    for (std::string word; words >> word;) {
        const auto range = parsePortRange(word);
        if (!range) {
            file.refuse("ports", "ports and port ranges separated by spaces, such as 22 8000-8010");
            return {};
        }
        ports.push_back(*range);
    }
    return ports;
}

} // namespace

Result<FirewallSettings> loadFirewallSettings() {
    VELT_ASSIGN_OR_RETURN(StrictFile file, StrictFile::load(statePath(paths::firewallSettings)));
    FirewallSettings settings;
    settings.mode = readMode(file, settings.mode);
    settings.furtherPorts = readPorts(file);
    settings.force = file.number("force", 0, 1, 0, optionalKey) == 1;
    VELT_RETURN_IF_ERROR(file.finish());
    return settings;
}

} // namespace velt
