#include "standalone/shares/folder_access.h"

#include "base/ask_child.h"
#include "base/unique_fd.h"
#include "standalone/core/error_number.h"
#include "standalone/core/systemd.h"

#include <fcntl.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <climits>
#include <cstdio>
#include <cstring>

namespace velt {

namespace {

/// What the child answers when it cannot ask; else it answers an Access.
constexpr int cannotTell = -1;

// The system calls themselves: the C library's wrappers change every thread, for which they take locks that
// another thread may have held at the fork.
bool takeIdentity(const Identity& who) {
    return syscall(SYS_setgroups, who.gids.size(), who.gids.data()) == 0 &&
           syscall(SYS_setresgid, who.gids[0], who.gids[0], who.gids[0]) == 0 &&
           syscall(SYS_setresuid, who.uid, who.uid, who.uid) == 0;
}

int openBelow(int root, const char* path) {
    path += std::strspn(path, "/");
    return openat(root, *path == '\0' ? "." : path, O_PATH | O_DIRECTORY | O_CLOEXEC);
}

/// The folder as it is below that root. Absolute links on the way lead below this process's own, so the place
/// that they lead to is opened once more.
int openFolder(int root, const char* path) {
    const int found = openBelow(root, path);
    std::array<char, 32> link{};
    std::array<char, PATH_MAX> place{};
    std::snprintf(link.data(), link.size(), "/proc/self/fd/%d", found);
    const bool known = found >= 0 && readlink(link.data(), place.data(), place.size() - 1) > 0;
    return known ? openBelow(root, place.data()) : -1;
}

bool allows(int folder, int mode) {
    return syscall(SYS_faccessat2, folder, "", mode, AT_EMPTY_PATH) == 0;
}

/// Runs in the child, where only system calls are safe.
int askKernel(int root, const char* path, const Identity& who, bool changeIdentity) {
    if (changeIdentity && !takeIdentity(who)) {
        return cannotTell;
    }
    const int folder = openFolder(root, path);
    const bool readable = folder >= 0 && allows(folder, R_OK | X_OK);
    const bool writable = readable && allows(folder, W_OK);
    return static_cast<int>(writable ? Access::write : readable ? Access::read : Access::none);
}

/// The root below which the services find folders. The unit of this process makes mounts read-only, which
/// says nothing about theirs.
UniqueFd openServicesRoot() {
    const char* root = geteuid() == 0 && systemdKeepsSupervisors() ? "/proc/1/root" : "/";
    return UniqueFd(open(root, O_PATH | O_DIRECTORY | O_CLOEXEC));
}

Error cannotAsk(const std::string& path, const char* why) {
    return {ErrorNumber::invalid, "Cannot check the access to " + path + ": " + why + "."};
}

} // namespace

Result<Access> folderAccess(const std::string& path, const Identity& who) {
    const bool changeIdentity = geteuid() == 0;
    if (!changeIdentity && who.uid != geteuid()) {
        return cannotAsk(path, "only root can check it for another account");
    }
    if (who.gids.empty()) {
        return cannotAsk(path, "the account has no group");
    }
    const UniqueFd root = openServicesRoot();
    if (!root) {
        return cannotAsk(path, std::strerror(errno));
    }
    VELT_ASSIGN_OR_RETURN(const int answer,
                          askChild([&] { return askKernel(root.get(), path.c_str(), who, changeIdentity); }));
    if (answer == cannotTell) {
        return cannotAsk(path, "cannot switch to the account");
    }
    return static_cast<Access>(answer);
}

} // namespace velt
