// Counts failed logins by where they come from.
#ifndef VELT_STANDALONE_BANS_FAILURE_COUNTER_H
#define VELT_STANDALONE_BANS_FAILURE_COUNTER_H

#include "base/ip_network.h"
#include "standalone/bans/ban_settings.h"

#include <array>
#include <chrono>
#include <cstddef>
#include <deque>
#include <map>

namespace velt {

/// Whose failures are counted together: those of one IPv4 address, or of one IPv6 network of 64 bits, which
/// is what a single customer has. All machines of a link share the 64 bits of its own addresses, so there
/// each address counts for itself.
IpNetwork sourceOf(const IpNetwork& address);

/// Whether nobody bans this source: loopback, and what the settings name. A network of which they name a part
/// is spared, too.
bool isSpared(const IpNetwork& source, const BanSettings& settings);

/// Not thread-safe.
class FailureCounter {
public:
    using Clock = std::chrono::steady_clock;

    /// More than this are not remembered: the one that was quiet for longest is forgotten.
    static constexpr std::size_t mostSources = 4096;

    /// Counts a failure. True when the source has as many within the time as the settings allow none; it then
    /// begins at nothing.
    bool count(const IpNetwork& source, const BanSettings& settings, Clock::time_point now);

    /// How many sources are remembered.
    std::size_t size() const { return failures_.size(); }

private:
    void makeRoom();

    std::map<std::array<unsigned char, 16>, std::deque<Clock::time_point>> failures_; ///< none is empty
};

} // namespace velt

#endif
