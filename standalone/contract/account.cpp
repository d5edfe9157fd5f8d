#include "platform/account.h"

#include "standalone/accounts/user_directory.h"
#include "standalone/contract/boundary.h"

#include <limits>
#include <map>
#include <mutex>
#include <string>
#include <tuple>

namespace {

// Callers keep the records and release none. One that was handed out is therefore never altered or freed, and
// the same account in the same state is the same record again: there are never more of them than accounts
// that were looked up.
VELT_USER* internUser(const velt::UserEntry& user) {
    static std::mutex mutex;
    static std::map<std::tuple<std::string, std::string, uid_t>, VELT_USER> records;
    const std::lock_guard lock(mutex);
    const auto [record, isNew] = records.try_emplace({user.name, user.description, user.uid});
    if (isNew) {
        const auto& [name, description, uid] = record->first;
        record->second = {name.c_str(), description.c_str(), static_cast<int>(uid)};
    }
    return &record->second;
}

VELT_GROUP* internGroup(const velt::GroupEntry& group) {
    static std::mutex mutex;
    static std::map<std::tuple<std::string, gid_t>, VELT_GROUP> records;
    const std::lock_guard lock(mutex);
    const auto [record, isNew] = records.try_emplace({group.name, group.gid});
    if (isNew) {
        const auto& [name, gid] = record->first;
        record->second = {name.c_str(), static_cast<int>(gid)};
    }
    return &record->second;
}

constexpr auto largestId = static_cast<unsigned>(std::numeric_limits<int>::max());

velt::Result<VELT_USER*> lookUpUser(const char* name) {
    VELT_ASSIGN_OR_RETURN(const velt::UserEntry user, velt::findUser(name));
    if (user.uid > largestId) {
        return velt::Error(velt::ErrorNumber::invalid, "The user ID of \"" + user.name + "\" is too large.");
    }
    return internUser(user);
}

velt::Result<VELT_GROUP*> lookUpGroup(const char* name) {
    VELT_ASSIGN_OR_RETURN(const velt::GroupEntry group, velt::findGroup(name));
    if (group.gid > largestId) {
        return velt::Error(velt::ErrorNumber::invalid,
                           "The group ID of \"" + group.name + "\" is too large.");
    }
    return internGroup(group);
}

template<class Record> int get(velt::Result<Record*> (&lookUp)(const char*), const char* name, Record** out) {
    return velt::atBoundary([&]() -> velt::Result<> {
        if (name == nullptr || out == nullptr) {
            return velt::Error(velt::ErrorNumber::invalid, "A look-up of an account needs a name.");
        }
        VELT_ASSIGN_OR_RETURN(*out, lookUp(name));
        return {};
    });
}

} // namespace

int VELTUserGet(const char* name, VELT_USER** out) {
    return get(lookUpUser, name, out);
}

int VELTGroupGet(const char* name, VELT_GROUP** out) {
    return get(lookUpGroup, name, out);
}
