// The chroot users: those with a rule that confines them to their home.
//
// All of it works on the stored rules and may be called from any thread.
#ifndef VELT_STANDALONE_RULES_CHROOT_USERS_H
#define VELT_STANDALONE_RULES_CHROOT_USERS_H

#include "base/result.h"
#include "standalone/accounts/user_directory.h"

#include <string>
#include <vector>

namespace velt {

/// The names of the chroot users: first those whom the sources list, in their order, then the others (system
/// accounts, users of a domain that lists nobody) by name.
Result<std::vector<std::string>> chrootUsers(const UserFilter& filter);

/// The names of the listed users who are not chroot users.
Result<std::vector<std::string>> otherUsers(const UserFilter& filter);

/// Gives each of these users a rule for the home, in place of any other rule of the user. A name may come
/// twice. Nothing changes when one of the names is unknown.
Result<> addChrootUsers(const std::vector<std::string>& names);

/// Takes the rule for the home from each of these users; their other rules stay. As above otherwise.
Result<> deleteChrootUsers(const std::vector<std::string>& names);

} // namespace velt

#endif
