#include "standalone/shares/folder_access.h"

#include "base/ask_child.h"
#include "standalone/core/error_number.h"

#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

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

/// Runs in the child, where only system calls are safe.
int askKernel(const char* path, const Identity& who, bool changeIdentity) {
    if (changeIdentity && !takeIdentity(who)) {
        return cannotTell;
    }
    struct stat status {};
    const bool readable =
        stat(path, &status) == 0 && S_ISDIR(status.st_mode) && access(path, R_OK | X_OK) == 0;
    const bool writable = readable && access(path, W_OK) == 0;
    return static_cast<int>(writable ? Access::write : readable ? Access::read : Access::none);
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
    VELT_ASSIGN_OR_RETURN(const int answer,
                          askChild([&] { return askKernel(path.c_str(), who, changeIdentity); }));
    if (answer == cannotTell) {
        return cannotAsk(path, "cannot switch to the account");
    }
    return static_cast<Access>(answer);
}

} // namespace velt
