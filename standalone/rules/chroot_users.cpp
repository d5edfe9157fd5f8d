#include "standalone/rules/chroot_users.h"

#include "standalone/core/state_lock.h"
#include "standalone/rules/rule_store.h"

#include <algorithm>
#include <unordered_set>

namespace velt {
namespace {

using Ids = std::unordered_set<uid_t>;
using Rules = std::vector<ChrootRule>;

bool confinesToHome(const ChrootRule& rule) {
    return rule.isUser && rule.path == homePath;
}

Result<Ids> chrootUserIds() {
    VELT_ASSIGN_OR_RETURN(const auto rules, loadRules());
    Ids ids;
    Ids seen;
    for (const ChrootRule& rule : rules) {
        // A second rule of a user has no effect.
        if (rule.isUser && seen.insert(rule.id).second && confinesToHome(rule)) {
            ids.insert(rule.id);
        }
    }
    return ids;
}

/// The names of the listed users whose number is one of these or, with `among` false, is none of them.
std::vector<std::string> listedNames(const std::vector<UserEntry>& listed, const UserFilter& filter,
                                     const Ids& ids, bool among) {
    std::vector<std::string> names;
    for (const UserEntry& user : listed) {
        if (ids.contains(user.uid) == among && matches(user, filter)) {
            names.push_back(user.name);
        }
    }
    return names;
}

/// The names of those that no source lists: system accounts, and users of a domain that lists nobody.
std::vector<std::string> unlistedNames(Ids ids, const std::vector<UserEntry>& listed,
                                       const UserFilter& filter) {
    for (const UserEntry& user : listed) {
        ids.erase(user.uid);
    }
    std::vector<std::string> names;
    for (const uid_t uid : ids) {
        const auto user = userById(uid);
        if (user && matches(*user, filter)) {
            names.push_back(user->name);
        }
    }
    std::ranges::sort(names);
    return names;
}

Result<std::vector<uid_t>> idsOf(const std::vector<std::string>& names) {
    std::vector<uid_t> ids;
    for (const std::string& name : names) {
        VELT_ASSIGN_OR_RETURN(const auto user, findUser(name));
        ids.push_back(user.uid);
    }
    return ids;
}

// A user has one rule: it takes the place of one that confined the user to a share.
void addRules(Rules& rules, const std::vector<uid_t>& ids) {
    const Ids wanted(ids.begin(), ids.end());
    Ids done;
    Rules changed;
    for (ChrootRule& rule : rules) {
        const bool ofWanted = rule.isUser && wanted.contains(rule.id);
        if (ofWanted && !done.insert(rule.id).second) {
            continue;
        }
        if (ofWanted) {
            rule.path = homePath;
        }
        changed.push_back(std::move(rule));
    }
    for (const uid_t uid : ids) {
        if (done.insert(uid).second) {
            changed.push_back({true, uid, std::string(homePath)});
        }
    }
    rules = std::move(changed);
}

void deleteRules(Rules& rules, const std::vector<uid_t>& ids) {
    const Ids wanted(ids.begin(), ids.end());
    std::erase_if(rules,
                  [&](const ChrootRule& rule) { return confinesToHome(rule) && wanted.contains(rule.id); });
}

Result<> change(const std::vector<std::string>& names, void (*apply)(Rules&, const std::vector<uid_t>&)) {
    VELT_ASSIGN_OR_RETURN(const auto ids, idsOf(names));
    VELT_ASSIGN_OR_RETURN(const auto lock, StateLock::take());
    VELT_ASSIGN_OR_RETURN(auto rules, loadRules());
    const Rules before = rules;
    apply(rules, ids);
    return rules == before ? Result<>() : storeRules(rules);
}

} // namespace

Result<std::vector<std::string>> chrootUsers(const UserFilter& filter) {
    VELT_ASSIGN_OR_RETURN(const auto ids, chrootUserIds());
    const auto users = allUsers();
    VELT_RETURN_IF_ERROR(usersAreKnown());
    auto names = listedNames(*users, filter, ids, true);
    std::ranges::move(unlistedNames(ids, *users, filter), std::back_inserter(names));
    return names;
}

Result<std::vector<std::string>> otherUsers(const UserFilter& filter) {
    VELT_ASSIGN_OR_RETURN(const auto ids, chrootUserIds());
    const auto users = allUsers();
    VELT_RETURN_IF_ERROR(usersAreKnown());
    return listedNames(*users, filter, ids, false);
}

Result<> addChrootUsers(const std::vector<std::string>& names) {
    return change(names, addRules);
}

Result<> deleteChrootUsers(const std::vector<std::string>& names) {
    return change(names, deleteRules);
}

} // namespace velt
