#include "host/base/account_names.h"

#include <grp.h>
#include <pwd.h>

#include <cerrno>
#include <vector>

namespace velt::host {

namespace {

constexpr std::size_t firstSize = 4096;
constexpr std::size_t largestSize = std::size_t{1} << 24U;

/// The field of the record that the function finds under the key. The record of a group lists all members, so
/// the buffer grows until it fits.
template<class Value, class Record, class Key, class Field>
std::optional<Value> lookUp(int (*function)(Key, Record*, char*, std::size_t, Record**), Key key,
                            Field Record::*field) {
    Record record{};
    Record* found = nullptr;
    int error = ERANGE;
    for (std::size_t size = firstSize; error == ERANGE && size <= largestSize; size *= 2) {
        std::vector<char> buffer(size);
        error = function(key, &record, buffer.data(), buffer.size(), &found);
        if (error == 0 && found != nullptr) {
            return record.*field;
        }
    }
    return std::nullopt;
}

} // namespace

std::string userName(uid_t uid) {
    return lookUp<std::string>(getpwuid_r, uid, &passwd::pw_name).value_or("uid " + std::to_string(uid));
}

std::string groupName(gid_t gid) {
    return lookUp<std::string>(getgrgid_r, gid, &group::gr_name).value_or("gid " + std::to_string(gid));
}

std::optional<gid_t> groupNamed(const std::string& name) {
    return lookUp<gid_t>(getgrnam_r, name.c_str(), &group::gr_gid);
}

} // namespace velt::host
