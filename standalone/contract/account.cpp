#include "platform/account.h"

#include "standalone/accounts/user_directory.h"
#include "standalone/contract/boundary.h"

#include <limits>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <tuple>

namespace {

// Callers keep the records and release none. One that was handed out is therefore never altered or freed, and
// the same account in the same state is the same record again: there are never more of them than accounts
// that were looked up.
struct UserRecord {
    std::string name;
    std::string description;
    VELT_USER record{};
};

struct GroupRecord {
    std::string name;
    VELT_GROUP record{};
};

VELT_USER* internUser(velt::UserEntry user) {
    static std::mutex mutex;
    static std::map<std::tuple<std::string, std::string, uid_t>, std::unique_ptr<UserRecord>> records;
    const std::lock_guard lock(mutex);
    std::unique_ptr<UserRecord>& slot = records[{user.name, user.description, user.uid}];
    if (slot == nullptr) {
        slot = std::make_unique<UserRecord>();
        slot->name = std::move(user.name);
        slot->description = std::move(user.description);
        slot->record = {slot->name.c_str(), slot->description.c_str(), static_cast<int>(user.uid)};
    }
    return &slot->record;
}

VELT_GROUP* internGroup(velt::GroupEntry group) {
    static std::mutex mutex;
    static std::map<std::tuple<std::string, gid_t>, std::unique_ptr<GroupRecord>> records;
    const std::lock_guard lock(mutex);
    std::unique_ptr<GroupRecord>& slot = records[{group.name, group.gid}];
    if (slot == nullptr) {
        slot = std::make_unique<GroupRecord>();
        slot->name = std::move(group.name);
        slot->record = {slot->name.c_str(), static_cast<int>(group.gid)};
    }
    return &slot->record;
}

constexpr auto largestId = static_cast<unsigned>(std::numeric_limits<int>::max());

velt::Result<VELT_USER*> lookUpUser(const char* name) {
    VELT_ASSIGN_OR_RETURN(velt::UserEntry user, velt::findUser(name));
    if (user.uid > largestId) {
        return velt::Error(velt::ErrorNumber::invalid,
                           "The number of user \"" + user.name + "\" is too large.");
    }
    return internUser(std::move(user));
}

velt::Result<VELT_GROUP*> lookUpGroup(const char* name) {
    VELT_ASSIGN_OR_RETURN(velt::GroupEntry group, velt::findGroup(name));
    if (group.gid > largestId) {
        return velt::Error(velt::ErrorNumber::invalid,
                           "The number of group \"" + group.name + "\" is too large.");
    }
    return internGroup(std::move(group));
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
