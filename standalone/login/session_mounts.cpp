#include "standalone/login/session_mounts.h"

#include "base/unique_fd.h"
#include "standalone/core/last_error.h"

#include <fcntl.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

namespace velt {
namespace {

/// Runs in the child, where only system calls are safe.
int tryMounts() {
    if (unshare(CLONE_NEWNS) < 0 || mount(nullptr, "/", nullptr, MS_REC | MS_SLAVE, nullptr) < 0) {
        return errno;
    }
    return 0;
}

int refuse(int error) {
    return fail(ErrorNumber::daemon,
                std::string("The FTP service cannot confine its sessions here: mounts of their own are not "
                            "possible (") +
                    std::strerror(error) + ").");
}

} // namespace

int checkSessionMounts() {
    int ends[2];
    if (pipe2(ends, O_CLOEXEC) < 0) {
        return refuse(errno);
    }
    const UniqueFd from(ends[0]);
    UniqueFd to(ends[1]);
    const pid_t child = fork();
    if (child == 0) {
        const int error = tryMounts();
        _exit(write(to.get(), &error, sizeof error) == sizeof error ? 0 : 1);
    }
    if (child < 0) {
        return refuse(errno);
    }
    to.reset();
    // The answer comes by pipe: a process that ignores the end of its children gets no exit status.
    int error = EIO;
    while (read(from.get(), &error, sizeof error) < 0 && errno == EINTR) {
    }
    while (waitpid(child, nullptr, 0) < 0 && errno == EINTR) {
    }
    return error == 0 ? 0 : refuse(error);
}

} // namespace velt
