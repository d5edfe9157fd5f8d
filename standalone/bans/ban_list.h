// Who is banned: one list for all processes, in a file that does not outlive a boot.
#ifndef VELT_STANDALONE_BANS_BAN_LIST_H
#define VELT_STANDALONE_BANS_BAN_LIST_H

#include "base/ip_network.h"
#include "base/result.h"

#include <chrono>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace velt {

struct Ban {
    using Clock = std::chrono::system_clock;

    IpNetwork source;
    Clock::time_point until; ///< in whole seconds
    std::string service;     ///< that refused the logins: "ftp", "sftp" or "veltd"
    int failures = 0;        ///< after which the ban came

    bool operator==(const Ban&) const = default;
};

/// One line for each ban. Lines of another form are left out when the text is read.
std::string renderBans(const std::vector<Ban>& bans);
std::vector<Ban> parseBans(std::string_view text);

/// The bans in force at this time, in the order in which they end.
Result<std::vector<Ban>> bansAt(Ban::Clock::time_point now);

/// The ban that holds for this address.
std::optional<Ban> banOf(const IpNetwork& address, const std::vector<Ban>& bans);

/// Puts the ban in the place of a former one of the same source. Those that ended before `now` are dropped,
/// and of very many the one that ends first. To be called under the StateLock.
Result<> storeBan(const Ban& ban, Ban::Clock::time_point now);

/// False when there is none of this source. To be called under the StateLock.
Result<bool> removeBan(const IpNetwork& source, Ban::Clock::time_point now);

} // namespace velt

#endif
