#include "standalone/login/path_rights.h"

#include "base/file.h"
#include "standalone/accounts/user_directory.h"
#include "standalone/core/error_number.h"
#include "standalone/login/file_rights.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/xattr.h>

#include <array>
#include <cerrno>
#include <cstdio>

namespace velt {
namespace {

std::string ownerOf(const struct stat& status) {
    const auto user = userById(status.st_uid);
    const auto group = groupById(status.st_gid);
    return (user ? user->name : std::to_string(status.st_uid)) + ":" +
           (group ? group->name : std::to_string(status.st_gid));
}

/// "which belongs to bob:staff, mode 0750, with an access control list".
std::string describe(const std::filesystem::path& path, const struct stat& status) {
    std::array<char, 8> mode{};
    std::snprintf(mode.data(), mode.size(), "%04o", status.st_mode & 07777U);
    const bool hasList = getxattr(path.c_str(), "system.posix_acl_access", nullptr, 0) > 0;
    return "which belongs to " + ownerOf(status) + ", mode " + mode.data() +
           (hasList ? ", with an access control list" : "");
}

/// An error when the kernel does not say.
Result<bool> may(const Identity& user, const std::filesystem::path& path, int mode) {
    const FileRightsOf rights(user);
    if (!rights.taken()) {
        return cannot("look at", path, EPERM);
    }
    if (syscall(SYS_faccessat2, AT_FDCWD, path.c_str(), mode, AT_EACCESS) == 0) {
        return true;
    }
    return errno == EACCES || errno == EPERM || errno == EROFS ? Result<bool>(false)
                                                               : cannot("look at", path);
}

Result<Access> accessAt(const Identity& user, const std::filesystem::path& path, bool isFolder) {
    VELT_ASSIGN_OR_RETURN(const bool readable, may(user, path, isFolder ? R_OK | X_OK : R_OK));
    VELT_ASSIGN_OR_RETURN(const bool writable, may(user, path, isFolder ? W_OK | X_OK : W_OK));
    // Who may write to a file and not read it gets nothing of it by most clients.
    return !readable ? Access::none : writable ? Access::write : Access::read;
}

/// The folder on the way that the user may not enter; "" for none.
Result<std::filesystem::path> closedFolder(const Identity& user, const std::filesystem::path& place) {
    std::filesystem::path way;
    for (const auto& part : place.parent_path()) {
        way /= part;
        VELT_ASSIGN_OR_RETURN(const bool enters, may(user, way, X_OK));
        if (!enters) {
            return way;
        }
    }
    return std::filesystem::path();
}

} // namespace

Result<PathRights> rightsOn(const Identity& user, const std::filesystem::path& path) {
    std::error_code error;
    PathRights rights{std::filesystem::canonical(path, error), Access::none, ""};
    if (error) {
        return cannot("open", path, error.value());
    }
    VELT_ASSIGN_OR_RETURN(const auto closed, closedFolder(user, rights.place));
    const auto& deciding = closed.empty() ? rights.place : closed;
    struct stat status {};
    if (stat(deciding.c_str(), &status) < 0) {
        return cannot("look at", deciding);
    }
    const std::string what = deciding.string() + ", " + describe(deciding, status) + ".";
    if (!closed.empty()) {
        rights.reason = user.name + " may not enter " + what;
        return rights;
    }
    VELT_ASSIGN_OR_RETURN(rights.access, accessAt(user, rights.place, S_ISDIR(status.st_mode)));
    rights.reason = user.name +
                    (rights.access == Access::none   ? " may not read "
                     : rights.access == Access::read ? " may read, but not change "
                                                     : " may read and change ") +
                    what;
    return rights;
}

} // namespace velt
