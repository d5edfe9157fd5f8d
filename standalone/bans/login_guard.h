// Refuses addresses from which logins fail again and again, for a while.
//
// Each process counts the failures that it hears of; who is banned is the same for all of them. The firewall
// refuses new connections to FTP and SFTP where it has rules of ours; veltd refuses its requests itself. All
// functions are thread-safe.
#ifndef VELT_STANDALONE_BANS_LOGIN_GUARD_H
#define VELT_STANDALONE_BANS_LOGIN_GUARD_H

#include "base/result.h"
#include "standalone/bans/ban_list.h"
#include "standalone/firewall/banned_sources.h"

#include <optional>
#include <string>
#include <vector>

namespace velt {

/// Counts a failed login at "ftp", "sftp" or "veltd" from this address, and bans its source when there were
/// too many. A source that is banned already keeps its ban, and nothing is logged. Waits for the state lock
/// then. What goes wrong is in syslog.
void noteFailedLogin(const std::string& service, const IpNetwork& address);

/// The same for an address as text; one that is none is passed over.
void noteFailedLogin(const std::string& service, const std::string& address);

/// Whose failures are counted together with those of this address, as text; "" for a text that is no address.
std::string sourceOfLogin(const std::string& address);

struct CurrentBans {
    std::vector<Ban> bans; ///< in the order in which they end
    bool firewall = false; ///< whether the firewall refuses them; else only veltd does
};

Result<CurrentBans> currentBans();

/// The ban that holds for this address now. Nothing, too, when the list cannot be read: nobody is shut out
/// for that.
std::optional<Ban> currentBanOf(const std::string& address);

/// Lifts the ban of an address or source on behalf of the calling thread's actor. False when there is none.
Result<bool> liftBan(const std::string& addressOrSource);

/// All who are banned, for the rules of the firewall.
Result<std::vector<BannedSource>> sourcesToRefuse();

} // namespace velt

#endif
