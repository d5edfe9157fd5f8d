#include "standalone/shares/folder_access.h"

#include "standalone/core/last_error.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

namespace velt {

namespace {

constexpr unsigned char answerRead = 1;
constexpr unsigned char answerWrite = 2;
constexpr unsigned char answerFailed = 128;

// The system calls themselves: the C library's wrappers change every thread, for which they take locks that
// another thread may have held at the fork.
bool takeIdentity(uid_t uid, const std::vector<gid_t>& gids) {
    return syscall(SYS_setgroups, gids.size(), gids.data()) == 0 &&
           syscall(SYS_setresgid, gids[0], gids[0], gids[0]) == 0 &&
           syscall(SYS_setresuid, uid, uid, uid) == 0;
}

/// Runs in the child, where only system calls are safe.
unsigned char askKernel(const char* path, uid_t uid, const std::vector<gid_t>& gids, bool changeIdentity) {
    if (changeIdentity && !takeIdentity(uid, gids)) {
        return answerFailed;
    }
    struct stat status {};
    if (stat(path, &status) != 0 || !S_ISDIR(status.st_mode)) {
        return 0;
    }
    unsigned char answer = 0;
    if (access(path, R_OK | X_OK) == 0) {
        answer |= answerRead;
    }
    if (access(path, W_OK | X_OK) == 0) {
        answer |= answerWrite;
    }
    return answer;
}

void reap(pid_t child) {
    while (waitpid(child, nullptr, 0) < 0 && errno == EINTR) {
    }
}

std::optional<FolderAccess> cannotAsk(const std::string& path, const char* why) {
    fail(ErrorNumber::invalid, "What the file system allows on " + path + " cannot be asked: " + why + ".");
    return std::nullopt;
}

} // namespace

std::optional<FolderAccess> folderAccess(const std::string& path, uid_t uid, const std::vector<gid_t>& gids) {
    const bool changeIdentity = geteuid() == 0;
    if (!changeIdentity && uid != geteuid()) {
        return cannotAsk(path, "only root can take another account's identity");
    }
    if (gids.empty()) {
        return cannotAsk(path, "the account has no group");
    }
    int ends[2];
    if (pipe2(ends, O_CLOEXEC) != 0) {
        return cannotAsk(path, std::strerror(errno));
    }
    const pid_t child = fork();
    if (child == 0) {
        const unsigned char answer = askKernel(path.c_str(), uid, gids, changeIdentity);
        _exit(write(ends[1], &answer, 1) == 1 ? 0 : 1);
    }
    const int forkError = errno;
    close(ends[1]);
    // The answer comes by pipe: a process that ignores the end of its children gets no exit status.
    unsigned char answer = answerFailed;
    ssize_t got = -1;
    if (child > 0) {
        do {
            got = read(ends[0], &answer, 1);
        } while (got < 0 && errno == EINTR);
        reap(child);
    }
    close(ends[0]);
    if (child < 0) {
        return cannotAsk(path, std::strerror(forkError));
    }
    if (got != 1 || answer == answerFailed) {
        return cannotAsk(path, "the account's identity cannot be taken");
    }
    const bool read = (answer & answerRead) != 0;
    return FolderAccess{read, read && (answer & answerWrite) != 0};
}

} // namespace velt
