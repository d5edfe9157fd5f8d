#include "standalone/bans/ban_list.h"

#include "base/file.h"
#include "base/number_text.h"
#include "base/text.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"

#include <algorithm>
#include <cstdint>

namespace velt {
namespace {

constexpr std::size_t mostBans = 4096;
constexpr std::int64_t lastSecond = 9'000'000'000; ///< in the year 2255; a clock counts nanoseconds
constexpr mode_t mode = 0600;

std::optional<Ban> parseBan(std::string_view line) {
    const auto source = parseIpNetwork(cut(line, ' '));
    const auto until = parseNumber(cut(line, ' '));
    const std::string service(cut(line, ' '));
    const auto failures = parseNumber(line);
    const bool known = service == "ftp" || service == "sftp" || service == "veltd";
    if (!source || !until || *until < 0 || *until > lastSecond || !known || !failures || *failures < 1 ||
        *failures > INT32_MAX) {
        return std::nullopt;
    }
    return Ban{*source, Ban::Clock::time_point(std::chrono::seconds(*until)), service,
               static_cast<int>(*failures)};
}

Result<> store(std::vector<Ban> bans) {
    std::ranges::sort(bans, {}, &Ban::until);
    if (bans.size() > mostBans) {
        bans.erase(bans.begin(), bans.end() - mostBans);
    }
    return replaceFile(statePath(paths::bans), renderBans(bans), mode);
}

} // namespace

std::string renderBans(const std::vector<Ban>& bans) {
    std::string text;
    for (const Ban& ban : bans) {
        const auto until = std::chrono::floor<std::chrono::seconds>(ban.until).time_since_epoch().count();
        text += toText(ban.source) + ' ' + std::to_string(until) + ' ' + ban.service + ' ' +
                std::to_string(ban.failures) + '\n';
    }
    return text;
}

std::vector<Ban> parseBans(std::string_view text) {
    std::vector<Ban> bans;
    while (!text.empty()) {
        if (const auto ban = parseBan(cut(text, '\n'))) {
            bans.push_back(*ban);
        }
    }
    return bans;
}

Result<std::vector<Ban>> bansAt(Ban::Clock::time_point now) {
    VELT_ASSIGN_OR_RETURN(const auto text, readOptionalFile(statePath(paths::bans)));
    std::vector<Ban> bans = parseBans(text.value_or(""));
    std::erase_if(bans, [now](const Ban& ban) { return ban.until <= now; });
    std::ranges::sort(bans, {}, &Ban::until);
    return bans;
}

std::optional<Ban> banOf(const IpNetwork& address, const std::vector<Ban>& bans) {
    const auto found =
        std::ranges::find_if(bans, [&](const Ban& ban) { return ban.source.contains(address); });
    return found == bans.end() ? std::nullopt : std::optional(*found);
}

Result<> storeBan(const Ban& ban, Ban::Clock::time_point now) {
    VELT_ASSIGN_OR_RETURN(auto bans, bansAt(now));
    std::erase_if(bans, [&ban](const Ban& each) { return each.source == ban.source; });
    bans.push_back(ban);
    return store(std::move(bans));
}

Result<bool> removeBan(const IpNetwork& source, Ban::Clock::time_point now) {
    VELT_ASSIGN_OR_RETURN(auto bans, bansAt(now));
    if (std::erase_if(bans, [&source](const Ban& each) { return each.source == source; }) == 0) {
        return false;
    }
    VELT_RETURN_IF_ERROR(store(std::move(bans)));
    return true;
}

} // namespace velt
