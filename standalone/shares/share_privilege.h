// What an account may do with a share.
#ifndef VELT_STANDALONE_SHARES_SHARE_PRIVILEGE_H
#define VELT_STANDALONE_SHARES_SHARE_PRIVILEGE_H

#include "standalone/shares/share_store.h"

#include <sys/types.h>

#include <optional>
#include <string>
#include <vector>

namespace velt {

/// The codes in which VELTShareUGPrivGetLocal answers.
enum class SharePrivilege {
    none = 0,      ///< the store says nothing about the account, or there is no such account
    readWrite = 1, ///< reading and writing
    readOnly = 2,
    denied = 4, ///< the store refuses, or the file system does not let the account in
};

/// What the store grants the user or, when there is no such user, group `account`, and the file system allows
/// it, whichever is less. An entry for the user decides before those for its groups; of these a refusal
/// counts first, then the right to write. A group is checked in the file system as a stranger who belongs to
/// it. Nothing, with the last error set, when the file system cannot be asked. Thread-safe.
std::optional<SharePrivilege> privilegeOn(const ShareEntry& share, const std::string& account);

/// The same for a user whose name and numbers are known already; `gids` has the primary group first.
std::optional<SharePrivilege> privilegeOfUser(const ShareEntry& share, const std::string& name, uid_t uid,
                                              const std::vector<gid_t>& gids);

} // namespace velt

#endif
