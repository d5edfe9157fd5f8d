// What an account may do with a share.
#ifndef VELT_STANDALONE_SHARES_SHARE_ACCESS_H
#define VELT_STANDALONE_SHARES_SHARE_ACCESS_H

#include "base/result.h"
#include "standalone/shares/access.h"
#include "standalone/shares/share_entry.h"

#include <optional>
#include <string>

namespace velt {

/// A grant, and whose entry it is.
struct GrantSource {
    std::optional<Access> access;
    std::string group;   ///< "" for an entry of the user
    bool isKnown = true; ///< else the group cannot be looked up, and its refusal holds for everybody
};

/// What the store grants this user, whatever the file system allows. An entry for the user comes before those
/// for groups; among these a refusal comes first, then the right to write. Nothing when the store says
/// nothing about the user. Thread-safe.
GrantSource grantSource(const Identity& user, const ShareEntry& share);
std::optional<Access> grantTo(const Identity& user, const ShareEntry& share);

/// What the store grants the user or, when there is no such user, the group of this name, or what the file
/// system allows, whichever is less. For a group, the file system is asked about a member who owns nothing.
/// Nothing also when there is no such account. Thread-safe.
Result<std::optional<Access>> accessOf(const std::string& account, const ShareEntry& share);

} // namespace velt

#endif
