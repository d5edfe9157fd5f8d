#include "standalone/accounts/account_snapshot.h"

#include <unordered_set>
#include <utility>

namespace velt {

namespace {

template<typename Map, typename Key> const std::size_t* find(const Map& map, const Key& key) {
    const auto found = map.find(key);
    return found == map.end() ? nullptr : &found->second;
}

bool isPerson(const UserEntry& user, UidRange range) {
    return user.uid >= range.first && user.uid <= range.last && user.name != "nobody";
}

} // namespace

UserTable::UserTable(std::vector<UserEntry> users) : users_(std::move(users)) {
    names_.reserve(users_.size());
    numbers_.reserve(users_.size());
    for (std::size_t i = 0; i < users_.size(); ++i) {
        names_.try_emplace(users_[i].name, i);
        numbers_.try_emplace(users_[i].uid, i);
    }
}

const UserEntry* UserTable::byName(std::string_view name) const {
    const std::size_t* index = find(names_, name);
    return index == nullptr ? nullptr : &users_[*index];
}

const UserEntry* UserTable::byId(uid_t uid) const {
    const std::size_t* index = find(numbers_, uid);
    return index == nullptr ? nullptr : &users_[*index];
}

std::shared_ptr<const UserSnapshot> UserSnapshot::make(std::vector<UserEntry> local,
                                                       const std::vector<UserEntry>& remote, UidRange range) {
    std::vector<UserEntry> people;
    std::vector<UserEntry> systemAccounts;
    std::unordered_set<std::string> localNames;
    people.reserve(local.size() + remote.size());
    // The names matter only to keep remote accounts apart from local ones.
    if (!remote.empty()) {
        for (const UserEntry& user : local) {
            localNames.insert(user.name);
        }
    }
    for (UserEntry& user : local) {
        (isPerson(user, range) ? people : systemAccounts).push_back(std::move(user));
    }
    for (const UserEntry& user : remote) {
        if (user.name != "nobody" && localNames.insert(user.name).second) {
            people.push_back(user);
        }
    }
    return std::shared_ptr<const UserSnapshot>(
        new UserSnapshot{UserTable(std::move(people)), UserTable(std::move(systemAccounts))});
}

GroupSnapshot::GroupSnapshot(std::vector<LocalGroup> groups) : groups_(std::move(groups)) {
    names_.reserve(groups_.size());
    numbers_.reserve(groups_.size());
    for (std::size_t i = 0; i < groups_.size(); ++i) {
        names_.try_emplace(groups_[i].entry.name, i);
        numbers_.try_emplace(groups_[i].entry.gid, i);
        for (const std::string& member : groups_[i].members) {
            memberships_[member].push_back(groups_[i].entry.gid);
        }
    }
}

const GroupEntry* GroupSnapshot::byName(std::string_view name) const {
    const std::size_t* index = find(names_, name);
    return index == nullptr ? nullptr : &groups_[*index].entry;
}

const GroupEntry* GroupSnapshot::byId(gid_t gid) const {
    const std::size_t* index = find(numbers_, gid);
    return index == nullptr ? nullptr : &groups_[*index].entry;
}

std::vector<gid_t> GroupSnapshot::groupsOf(std::string_view user) const {
    const auto found = memberships_.find(user);
    return found == memberships_.end() ? std::vector<gid_t>{} : found->second;
}

} // namespace velt
