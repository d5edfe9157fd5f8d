#include "host/base/account_names.h"

#include <grp.h>
#include <pwd.h>

#include <cerrno>
#include <vector>

namespace velt::host {

namespace {

constexpr std::size_t firstSize = 4096;
constexpr std::size_t largestSize = std::size_t{1} << 24U;

/// Repeats a look-up with a larger buffer until the record fits; that of a group lists all members.
template<class LookUp> int withRoom(std::vector<char>& buffer, const LookUp& lookUp) {
    buffer.resize(firstSize);
    int error = lookUp();
    while (error == ERANGE && buffer.size() < largestSize) {
        buffer.resize(buffer.size() * 2);
        error = lookUp();
    }
    return error;
}

} // namespace

std::string userName(uid_t uid) {
    std::vector<char> buffer;
    passwd record{};
    passwd* found = nullptr;
    const int error =
        withRoom(buffer, [&] { return getpwuid_r(uid, &record, buffer.data(), buffer.size(), &found); });
    return error == 0 && found != nullptr ? found->pw_name : "uid " + std::to_string(uid);
}

std::string groupName(gid_t gid) {
    std::vector<char> buffer;
    group record{};
    group* found = nullptr;
    const int error =
        withRoom(buffer, [&] { return getgrgid_r(gid, &record, buffer.data(), buffer.size(), &found); });
    return error == 0 && found != nullptr ? found->gr_name : "gid " + std::to_string(gid);
}

std::optional<gid_t> groupNamed(const std::string& name) {
    std::vector<char> buffer;
    group record{};
    group* found = nullptr;
    const int error = withRoom(
        buffer, [&] { return getgrnam_r(name.c_str(), &record, buffer.data(), buffer.size(), &found); });
    return error == 0 && found != nullptr ? std::optional(found->gr_gid) : std::nullopt;
}

} // namespace velt::host
