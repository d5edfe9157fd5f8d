// Who may not connect to the services: elements of the table, each with the time after which it goes by
// itself.
#ifndef VELT_STANDALONE_FIREWALL_BANNED_SOURCES_H
#define VELT_STANDALONE_FIREWALL_BANNED_SOURCES_H

#include "base/ip_network.h"
#include "base/result.h"

#include <chrono>
#include <string>
#include <vector>

namespace velt {

struct BannedSource {
    IpNetwork source; ///< one address, or an IPv6 network of 64 bits
    std::chrono::seconds left{};
};

/// A script that adds them to a table that holds none of them.
std::string renderBannedSources(const std::vector<BannedSource>& sources);

/// Adds it to the rules in force, in the place of a former one of this source: new connections to the ports
/// on which services accept logins are dropped, those that there are go on. False where no rules of ours are
/// loaded. Safe from all threads and processes.
Result<bool> banSource(const BannedSource& source);

/// Takes it out again. False where no rules of ours are loaded.
Result<bool> admitSource(const IpNetwork& source);

/// Whether rules of ours are loaded, so that those who are banned are refused.
Result<bool> firewallRefuses();

} // namespace velt

#endif
