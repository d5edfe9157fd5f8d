#include "standalone/bans/ban_settings.h"

#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/core/strict_file.h"

#include <sstream>

namespace velt {
namespace {

constexpr int mostFailures = 1000;
constexpr int longestWindow = 86400;
constexpr int longestBan = 30 * 86400;
constexpr std::size_t longestList = 4096;

std::vector<IpNetwork> readNetworks(StrictFile& file) {
    std::vector<IpNetwork> networks;
    std::istringstream words(file.text("never", longestList, "", optionalKey));
    for (std::string word; words >> word;) {
        const auto network = parseIpNetwork(word);
        if (!network) {
            file.refuse("never", "addresses and networks separated by spaces, such as 192.0.2.0/24");
            return {};
        }
        networks.push_back(*network);
    }
    return networks;
}

} // namespace

Result<BanSettings> loadBanSettings() {
    VELT_ASSIGN_OR_RETURN(StrictFile file, StrictFile::load(statePath(paths::banSettings)));
    BanSettings settings;
    const auto seconds = [&file](std::string_view key, int most, std::chrono::seconds fallback) {
        return std::chrono::seconds(file.number(key, 1, most, fallback.count(), optionalKey));
    };
    settings.enabled = file.boolean("enabled", settings.enabled, optionalKey);
    settings.failures =
        static_cast<int>(file.number("failures", 1, mostFailures, settings.failures, optionalKey));
    settings.window = seconds("window_seconds", longestWindow, settings.window);
    settings.ban = seconds("ban_seconds", longestBan, settings.ban);
    settings.never = readNetworks(file);
    VELT_RETURN_IF_ERROR(file.finish());
    return settings;
}

} // namespace velt
