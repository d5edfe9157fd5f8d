// The users and groups that this server knows, told apart by where they come from.
//
// Listing 100,000 users one look-up at a time takes minutes, so each source is enumerated once per change
// into a snapshot that nobody alters any more; look-ups and descriptions are served from it.
#ifndef VELT_STANDALONE_ACCOUNTS_USER_DIRECTORY_H
#define VELT_STANDALONE_ACCOUNTS_USER_DIRECTORY_H

#include "base/result.h"

#include <sys/types.h>

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace velt {

/// Where an account comes from; a union of them selects several.
inline constexpr int sourceLocal = 1;
inline constexpr int sourceDomain = 2;
inline constexpr int sourceLdap = 8;

struct UserEntry {
    std::string name;
    uid_t uid = 0;
    gid_t gid = 0;
    std::string home;
    std::string description; ///< the GECOS field up to its first comma; "" when there is none
    int source = sourceLocal;
};

struct GroupEntry {
    std::string name;
    gid_t gid = 0;
    int source = sourceLocal;
};

/// All people who have an account: the local ones from UID_MIN to UID_MAX of login.defs in the order of the
/// password file, then those of the domain, then those of LDAP, as far as these sources tell. "nobody" and
/// system accounts do not count as people. Never null. A domain or LDAP source is asked again after half a
/// minute; a change of the local files shows at once. Thread-safe, as everything here.
std::shared_ptr<const std::vector<UserEntry>> allUsers();

/// Any account, system accounts included. A name or number that more than one source knows is the local one.
std::optional<UserEntry> userByName(const std::string& name);
std::optional<UserEntry> userById(uid_t uid);
std::optional<GroupEntry> groupByName(const std::string& name);
std::optional<GroupEntry> groupById(gid_t gid);

/// An error when the local users could not be read when they were last asked for: one that was not found may
/// exist. The same of groups.
Result<> usersAreKnown();
Result<> groupsAreKnown();

/// As userByName and groupByName; a missing account is an error, and so is one that cannot be told.
Result<UserEntry> findUser(const std::string& name);
Result<GroupEntry> findGroup(const std::string& name);

/// The numbers of all groups that the user belongs to, the primary one first.
std::vector<gid_t> groupsOf(const UserEntry& user);

/// Which users of a listing are wanted.
struct UserFilter {
    int sources = sourceLocal;  ///< a union of sources
    std::string_view substring; ///< part of the name, without regard to the case of ASCII letters; "": any
    std::string_view domain;    ///< the "DOMAIN" of "DOMAIN\user" or "user@domain", likewise; "": any
};

bool matches(const UserEntry& user, const UserFilter& filter);

} // namespace velt

#endif
