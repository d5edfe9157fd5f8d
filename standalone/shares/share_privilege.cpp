#include "standalone/shares/share_privilege.h"

#include "standalone/accounts/user_directory.h"
#include "standalone/shares/folder_access.h"

#include <algorithm>

namespace velt {

namespace {

// The kernel's own number for somebody who owns nothing.
constexpr uid_t stranger = 65534;

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

std::optional<ShareGrant> grantOfUser(const ShareEntry& share, const std::string& name,
                                      const std::vector<gid_t>& gids) {
    const auto entry = share.users.find(name);
    return entry != share.users.end() ? std::optional(entry->second) : grantOfGroups(share, gids);
}

std::optional<SharePrivilege> lesserOf(const std::optional<ShareGrant>& grant, const ShareEntry& share,
                                       uid_t uid, const std::vector<gid_t>& gids) {
    if (!grant) {
        return SharePrivilege::none;
    }
    if (*grant == ShareGrant::none) {
        return SharePrivilege::denied;
    }
    const std::optional<FolderAccess> allowed = folderAccess(share.path, uid, gids);
    if (!allowed) {
        return std::nullopt;
    }
    if (!allowed->read) {
        return SharePrivilege::denied;
    }
    return *grant == ShareGrant::write && allowed->write ? SharePrivilege::readWrite
                                                         : SharePrivilege::readOnly;
}

} // namespace

std::optional<SharePrivilege> privilegeOfUser(const ShareEntry& share, const std::string& name, uid_t uid,
                                              const std::vector<gid_t>& gids) {
    return lesserOf(grantOfUser(share, name, gids), share, uid, gids);
}

std::optional<SharePrivilege> privilegeOn(const ShareEntry& share, const std::string& account) {
    if (const std::optional<UserEntry> user = userByName(account)) {
        return privilegeOfUser(share, account, user->uid, groupsOf(*user));
    }
    if (const std::optional<GroupEntry> group = groupByName(account)) {
        return lesserOf(grantOfGroups(share, {group->gid}), share, stranger, {group->gid});
    }
    return SharePrivilege::none;
}

} // namespace velt
