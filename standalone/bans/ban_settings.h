// How many failed logins an address has, and what comes then.
#ifndef VELT_STANDALONE_BANS_BAN_SETTINGS_H
#define VELT_STANDALONE_BANS_BAN_SETTINGS_H

#include "base/ip_network.h"
#include "base/result.h"

#include <chrono>
#include <vector>

namespace velt {

struct BanSettings {
    bool enabled = true;
    int failures = 10;                ///< so many failed logins
    std::chrono::seconds window{600}; ///< within this time
    std::chrono::seconds ban{600};    ///< are answered with a ban of this time
    std::vector<IpNetwork> never;     ///< who is never banned, beside loopback
};

/// The settings of the file
///
///     version = 1
///     enabled = 1
///     failures = 10
///     window_seconds = 600
///     ban_seconds = 600
///     never = "192.0.2.0/24 2001:db8::/32"
///
/// in which each key may be left out; or the defaults without a file. Thread-safe.
Result<BanSettings> loadBanSettings();

} // namespace velt

#endif
