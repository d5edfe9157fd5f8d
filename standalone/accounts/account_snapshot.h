// All accounts of one moment, indexed; never altered once made.
#ifndef VELT_STANDALONE_ACCOUNTS_ACCOUNT_SNAPSHOT_H
#define VELT_STANDALONE_ACCOUNTS_ACCOUNT_SNAPSHOT_H

#include "standalone/accounts/account_files.h"
#include "standalone/accounts/user_directory.h"

#include <cstddef>
#include <memory>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

namespace velt {

/// Users with an index of their names and numbers. Of two with the same name the first one counts.
class UserTable {
public:
    explicit UserTable(std::vector<UserEntry> users);
    UserTable(const UserTable&) = delete;
    UserTable& operator=(const UserTable&) = delete;

    const std::vector<UserEntry>& users() const { return users_; }
    const UserEntry* byName(std::string_view name) const;
    const UserEntry* byId(uid_t uid) const;

private:
    std::vector<UserEntry> users_;
    std::unordered_map<std::string_view, std::size_t> names_;
    std::unordered_map<uid_t, std::size_t> numbers_;
};

struct UserSnapshot {
    UserTable people;         ///< the local ones, then `remote` without those whose name is a local one
    UserTable systemAccounts; ///< local accounts that do not belong to people

    static std::shared_ptr<const UserSnapshot> make(std::vector<UserEntry> local,
                                                    const std::vector<UserEntry>& remote, UidRange range);
};

class GroupSnapshot {
public:
    explicit GroupSnapshot(std::vector<LocalGroup> groups);
    GroupSnapshot(const GroupSnapshot&) = delete;
    GroupSnapshot& operator=(const GroupSnapshot&) = delete;

    const GroupEntry* byName(std::string_view name) const;
    const GroupEntry* byId(gid_t gid) const;

    /// The groups that list the user as a member, in the file's order.
    std::vector<gid_t> groupsOf(std::string_view user) const;

private:
    std::vector<LocalGroup> groups_;
    std::unordered_map<std::string_view, std::size_t> names_;
    std::unordered_map<gid_t, std::size_t> numbers_;
    std::unordered_map<std::string_view, std::vector<gid_t>> memberships_;
};

} // namespace velt

#endif
