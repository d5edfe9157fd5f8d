// The chroot users of the contract (ftp/ftp_library.h): the users with a rule that names their own home.
#include "ftp/ftp_library.h"
#include "standalone/accounts/user_directory.h"
#include "standalone/core/boundary.h"
#include "standalone/core/last_error.h"
#include "standalone/core/state_lock.h"
#include "standalone/rules/rule_store.h"

#include <algorithm>
#include <unordered_map>
#include <unordered_set>

namespace velt {
namespace {

bool confinesToHome(const ChrootRule& rule) {
    return rule.isUser && rule.path == homePath;
}

std::unordered_set<uid_t> chrootUserIds(const std::vector<ChrootRule>& rules) {
    std::unordered_set<uid_t> ids;
    std::unordered_set<uid_t> seen;
    for (const auto& rule : rules) {
        // A second rule of a user has no effect.
        if (rule.isUser && seen.insert(rule.id).second && confinesToHome(rule)) {
            ids.insert(rule.id);
        }
    }
    return ids;
}

int pushNames(VLIBCSzList** list, const std::vector<std::string>& names) {
    for (const auto& name : names) {
        if (VLIBCSzListPush(list, name.c_str()) < 0) {
            return -1;
        }
    }
    return 0;
}

UserFilter filterOf(int source, const char* substr, const char* domain) {
    return {source, substr != nullptr ? substr : "", domain != nullptr ? domain : ""};
}

int enumerateChrootUsers(VLIBCSzList** list, const UserFilter& filter) {
    const auto rules = loadRules();
    if (!rules) {
        return -1;
    }
    auto ids = chrootUserIds(*rules);
    std::vector<std::string> names;
    const auto users = allUsers();
    for (const auto& user : *users) {
        if (ids.contains(user.uid) && matches(user, filter)) {
            names.push_back(user.name);
        }
    }
    for (const auto& user : *users) {
        ids.erase(user.uid);
    }
    // Those that no source lists: system accounts, and users of a domain that does not enumerate them.
    const std::vector<uid_t> unlisted(ids.begin(), ids.end());
    const auto listed = static_cast<std::ptrdiff_t>(names.size());
    for (const uid_t uid : unlisted) {
        const auto user = userById(uid);
        if (user && matches(*user, filter)) {
            names.push_back(user->name);
        }
    }
    std::sort(names.begin() + listed, names.end());
    return pushNames(list, names);
}

int enumerateOthers(VLIBCSzList** list, const UserFilter& filter) {
    const auto rules = loadRules();
    if (!rules) {
        return -1;
    }
    const auto ids = chrootUserIds(*rules);
    const auto users = allUsers();
    for (const auto& user : *users) {
        if (!ids.contains(user.uid) && matches(user, filter) &&
            VLIBCSzListPush(list, user.name.c_str()) < 0) {
            return -1;
        }
    }
    return 0;
}

// The numbers of the named users, without repetition, in their order.
std::optional<std::vector<uid_t>> idsOf(const VLIBCSzList* list) {
    const auto users = allUsers();
    std::unordered_map<std::string_view, uid_t> byName;
    // Of two users with one name the first is the one who logs in.
    for (const auto& user : *users) {
        byName.try_emplace(user.name, user.uid);
    }
    std::vector<uid_t> ids;
    std::unordered_set<uid_t> seen;
    for (int i = 0; list != nullptr && i < list->count; i++) {
        const std::string name = VLIBCSzListGet(list, i);
        std::optional<uid_t> uid;
        if (const auto found = byName.find(name); found != byName.end()) {
            uid = found->second;
        } else if (const auto user = userByName(name)) {
            uid = user->uid;
        } else {
            fail(ErrorNumber::notFound, "There is no user \"" + name + "\".");
            return std::nullopt;
        }
        if (seen.insert(*uid).second) {
            ids.push_back(*uid);
        }
    }
    return ids;
}

// A user has one rule: it takes the place of one that confined the user to a share.
void addRules(std::vector<ChrootRule>& rules, const std::vector<uid_t>& ids) {
    const std::unordered_set<uid_t> wanted(ids.begin(), ids.end());
    std::unordered_set<uid_t> done;
    std::vector<ChrootRule> changed;
    for (auto& rule : rules) {
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
        if (!done.contains(uid)) {
            changed.push_back({true, uid, std::string(homePath)});
        }
    }
    rules = std::move(changed);
}

void deleteRules(std::vector<ChrootRule>& rules, const std::vector<uid_t>& ids) {
    const std::unordered_set<uid_t> wanted(ids.begin(), ids.end());
    std::erase_if(rules,
                  [&](const ChrootRule& rule) { return confinesToHome(rule) && wanted.contains(rule.id); });
}

int change(const VLIBCSzList* list, void (*apply)(std::vector<ChrootRule>&, const std::vector<uid_t>&)) {
    const auto ids = idsOf(list);
    if (!ids) {
        return -1;
    }
    const StateLock lock;
    auto rules = lock ? loadRules() : std::nullopt;
    if (!rules) {
        return -1;
    }
    const auto before = *rules;
    apply(*rules, *ids);
    return *rules == before ? 0 : saveRules(*rules);
}

} // namespace
} // namespace velt

int VELTFTPChrootUserEnum(VLIBCSzList** list, int source, const char* substr, const char* domain) {
    return velt::atBoundary(
        [&] { return velt::enumerateChrootUsers(list, velt::filterOf(source, substr, domain)); });
}

int VELTFTPNonChrootUserEnum(VLIBCSzList** list, int source, const char* substr, const char* domain) {
    return velt::atBoundary(
        [&] { return velt::enumerateOthers(list, velt::filterOf(source, substr, domain)); });
}

int VELTFTPAddChrootUser(VLIBCSzList* list) {
    return velt::atBoundary([&] { return velt::change(list, velt::addRules); });
}

int VELTFTPDeleteChrootUser(VLIBCSzList* list) {
    return velt::atBoundary([&] { return velt::change(list, velt::deleteRules); });
}
