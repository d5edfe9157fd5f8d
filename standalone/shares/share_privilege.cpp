#include "standalone/shares/share_privilege.h"

#include "standalone/accounts/user_directory.h"
#include "standalone/shares/folder_access.h"

#include <algorithm>

namespace velt {

namespace {

// The kernel's own number for somebody who owns nothing.
constexpr uid_t stranger = 65534;

struct Identity {
    uid_t uid = stranger;
    std::vector<gid_t> gids;
};

std::optional<ShareGrant> grantOfGroups(const ShareEntry& share, const std::vector<gid_t>& gids) {
    std::optional<ShareGrant> best;
    for (const auto& [name, grant] : share.groups) {
        const std::optional<GroupEntry> group = groupByName(name);
        if (!group || std::find(gids.begin(), gids.end(), group->gid) == gids.end()) {
            continue;
        }
        if (grant == ShareGrant::none) {
            return grant;
        }
        best = best ? std::max(*best, grant) : grant;
    }
    return best;
}

/// Looks the account up, and what the store grants it; nothing when there is no such account.
std::optional<Identity> identify(const ShareEntry& share, const std::string& account,
                                 std::optional<ShareGrant>& grant) {
    if (const std::optional<UserEntry> user = userByName(account)) {
        Identity identity{user->uid, groupsOf(*user)};
        const auto entry = share.users.find(account);
        grant =
            entry != share.users.end() ? std::optional(entry->second) : grantOfGroups(share, identity.gids);
        return identity;
    }
    if (const std::optional<GroupEntry> group = groupByName(account)) {
        grant = grantOfGroups(share, {group->gid});
        return Identity{stranger, {group->gid}};
    }
    return std::nullopt;
}

} // namespace

std::optional<SharePrivilege> privilegeOn(const ShareEntry& share, const std::string& account) {
    std::optional<ShareGrant> grant;
    const std::optional<Identity> identity = identify(share, account, grant);
    if (!identity || !grant) {
        return SharePrivilege::none;
    }
    if (*grant == ShareGrant::none) {
        return SharePrivilege::denied;
    }
    const std::optional<FolderAccess> allowed = folderAccess(share.path, identity->uid, identity->gids);
    if (!allowed) {
        return std::nullopt;
    }
    if (!allowed->read) {
        return SharePrivilege::denied;
    }
    return *grant == ShareGrant::write && allowed->write ? SharePrivilege::readWrite
                                                         : SharePrivilege::readOnly;
}

} // namespace velt
