#include "standalone/shares/share_access.h"

#include "standalone/accounts/user_directory.h"
#include "standalone/shares/folder_access.h"

#include <algorithm>

namespace velt {

namespace {

// The kernel's number for somebody who owns nothing.
constexpr uid_t stranger = 65534;

GrantSource grantToGroups(const ShareEntry& share, const std::vector<gid_t>& gids) {
    GrantSource best;
    for (const auto& [name, grant] : share.groups) {
        const std::optional<GroupEntry> group = groupByName(name);
        const bool member = group && std::find(gids.begin(), gids.end(), group->gid) != gids.end();
        // Who belongs to a group that cannot be looked up is not known: a refusal of it holds for all.
        if (grant == Access::none && (member || !group)) {
            return {grant, name, group.has_value()};
        }
        if (member && (!best.access || *best.access < grant)) {
            best = {grant, name};
        }
    }
    return best;
}

/// The grant, or what the file system allows this account where that is less.
Result<std::optional<Access>> limited(std::optional<Access> grant, const ShareEntry& share,
                                      const Identity& who) {
    if (!grant || *grant == Access::none) {
        return grant;
    }
    VELT_ASSIGN_OR_RETURN(const Access allowed, folderAccess(share.path, who));
    return std::optional(std::min(*grant, allowed));
}

} // namespace

GrantSource grantSource(const Identity& user, const ShareEntry& share) {
    const auto entry = share.users.find(user.name);
    return entry != share.users.end() ? GrantSource{entry->second, ""} : grantToGroups(share, user.gids);
}

std::optional<Access> grantTo(const Identity& user, const ShareEntry& share) {
    return grantSource(user, share).access;
}

Result<std::optional<Access>> accessOf(const std::string& account, const ShareEntry& share) {
    if (const std::optional<UserEntry> user = userByName(account)) {
        const Identity self{account, user->uid, groupsOf(*user)};
        return limited(grantTo(self, share), share, self);
    }
    if (const std::optional<GroupEntry> group = groupByName(account)) {
        const Identity member{"", stranger, {group->gid}};
        return limited(grantToGroups(share, member.gids).access, share, member);
    }
    return std::optional<Access>();
}

} // namespace velt
