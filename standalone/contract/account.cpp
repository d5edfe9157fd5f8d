#include "platform/account.h"

#include "base/plain_text.h"
#include "standalone/accounts/user_directory.h"
#include "standalone/core/boundary.h"
#include "standalone/core/last_error.h"

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

} // namespace

int VELTUserGet(const char* name, VELT_USER** out) {
    return velt::atBoundary([&] {
        if (name == nullptr || out == nullptr) {
            return velt::fail(velt::ErrorNumber::invalid, "A user look-up needs a name.");
        }
        std::optional<velt::UserEntry> user = velt::userByName(name);
        if (!user) {
            return velt::fail(velt::ErrorNumber::notFound,
                              "There is no user \"" + velt::plainText(name, 120) + "\".");
        }
        if (user->uid > largestId) {
            return velt::fail(velt::ErrorNumber::invalid,
                              "The number of user \"" + velt::plainText(name, 120) + "\" is too large.");
        }
        *out = internUser(std::move(*user));
        return 0;
    });
}

int VELTGroupGet(const char* name, VELT_GROUP** out) {
    return velt::atBoundary([&] {
        if (name == nullptr || out == nullptr) {
            return velt::fail(velt::ErrorNumber::invalid, "A group look-up needs a name.");
        }
        std::optional<velt::GroupEntry> group = velt::groupByName(name);
        if (!group) {
            return velt::fail(velt::ErrorNumber::notFound,
                              "There is no group \"" + velt::plainText(name, 120) + "\".");
        }
        if (group->gid > largestId) {
            return velt::fail(velt::ErrorNumber::invalid,
                              "The number of group \"" + velt::plainText(name, 120) + "\" is too large.");
        }
        *out = internGroup(std::move(*group));
        return 0;
    });
}
