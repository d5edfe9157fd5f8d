#include "tests/support/watched_calls.h"

#include <sys/syscall.h>

#include <algorithm>
#include <array>
#include <stdexcept>

namespace velt::test {
namespace {

using enum CallSubject;

constexpr std::array calls{
    WatchedCall{SYS_open, "open", path, EMFILE},
    WatchedCall{SYS_openat, "openat", pathAt, EMFILE},
    WatchedCall{SYS_openat2, "openat2", pathAt, EMFILE},
    WatchedCall{SYS_creat, "creat", path, ENOSPC},
    WatchedCall{SYS_read, "read", descriptor, EIO},
    WatchedCall{SYS_pread64, "pread64", descriptor, EIO},
    WatchedCall{SYS_readv, "readv", descriptor, EIO},
    WatchedCall{SYS_getdents64, "getdents64", descriptor, EIO},
    WatchedCall{SYS_write, "write", descriptor, ENOSPC},
    WatchedCall{SYS_pwrite64, "pwrite64", descriptor, ENOSPC},
    WatchedCall{SYS_writev, "writev", descriptor, ENOSPC},
    WatchedCall{SYS_fsync, "fsync", descriptor, EIO},
    WatchedCall{SYS_fdatasync, "fdatasync", descriptor, EIO},
    WatchedCall{SYS_ftruncate, "ftruncate", descriptor, EIO},
    WatchedCall{SYS_fallocate, "fallocate", descriptor, ENOSPC},
    WatchedCall{SYS_rename, "rename", path, EIO},
    WatchedCall{SYS_renameat, "renameat", pathAt, EIO},
    WatchedCall{SYS_renameat2, "renameat2", pathAt, EIO},
    WatchedCall{SYS_link, "link", path, ENOSPC},
    WatchedCall{SYS_linkat, "linkat", pathAt, ENOSPC},
    WatchedCall{SYS_symlink, "symlink", pathAtEnd, ENOSPC},
    WatchedCall{SYS_symlinkat, "symlinkat", none, ENOSPC},
    WatchedCall{SYS_unlink, "unlink", path, EROFS},
    WatchedCall{SYS_unlinkat, "unlinkat", pathAt, EROFS},
    WatchedCall{SYS_rmdir, "rmdir", path, EROFS},
    WatchedCall{SYS_mkdir, "mkdir", path, ENOSPC},
    WatchedCall{SYS_mkdirat, "mkdirat", pathAt, ENOSPC},
    WatchedCall{SYS_chmod, "chmod", path, EROFS},
    WatchedCall{SYS_fchmod, "fchmod", descriptor, EROFS},
    WatchedCall{SYS_fchmodat, "fchmodat", pathAt, EROFS},
    WatchedCall{SYS_chown, "chown", path, EPERM},
    WatchedCall{SYS_fchown, "fchown", descriptor, EPERM},
    WatchedCall{SYS_fchownat, "fchownat", pathAt, EPERM},
    WatchedCall{SYS_stat, "stat", path, EIO},
    WatchedCall{SYS_lstat, "lstat", path, EIO},
    WatchedCall{SYS_fstat, "fstat", descriptor, EIO},
    WatchedCall{SYS_newfstatat, "newfstatat", pathAt, EIO},
    WatchedCall{SYS_statx, "statx", pathAt, EIO},
    WatchedCall{SYS_access, "access", path, EIO},
    WatchedCall{SYS_faccessat, "faccessat", pathAt, EIO},
    WatchedCall{SYS_faccessat2, "faccessat2", pathAt, EIO},
    WatchedCall{SYS_readlink, "readlink", path, EIO},
    WatchedCall{SYS_readlinkat, "readlinkat", pathAt, EIO},
    WatchedCall{SYS_flock, "flock", descriptor, ENOLCK},
    WatchedCall{SYS_mount, "mount", pathAtEnd, EPERM},
    WatchedCall{SYS_umount2, "umount2", path, EPERM},
    WatchedCall{SYS_move_mount, "move_mount", none, EPERM},
    WatchedCall{SYS_open_tree, "open_tree", pathAt, EPERM},
    WatchedCall{SYS_mount_setattr, "mount_setattr", pathAt, EPERM},
    WatchedCall{SYS_fsopen, "fsopen", none, EPERM},
    WatchedCall{SYS_fsconfig, "fsconfig", none, EPERM},
    WatchedCall{SYS_fsmount, "fsmount", none, EPERM},
    WatchedCall{SYS_chroot, "chroot", path, EPERM},
    WatchedCall{SYS_chdir, "chdir", path, EIO},
    WatchedCall{SYS_unshare, "unshare", none, ENOSPC},
    WatchedCall{SYS_setns, "setns", descriptor, EPERM},
    WatchedCall{SYS_setgroups, "setgroups", none, EPERM},
    WatchedCall{SYS_setresuid, "setresuid", none, EAGAIN},
    WatchedCall{SYS_setresgid, "setresgid", none, EPERM},
    WatchedCall{SYS_setfsuid, "setfsuid", none, EPERM},
    WatchedCall{SYS_setfsgid, "setfsgid", none, EPERM},
    WatchedCall{SYS_socket, "socket", none, EMFILE},
    WatchedCall{SYS_socketpair, "socketpair", none, EMFILE},
    WatchedCall{SYS_bind, "bind", descriptor, EACCES},
    WatchedCall{SYS_listen, "listen", descriptor, EADDRINUSE},
    WatchedCall{SYS_connect, "connect", descriptor, ECONNREFUSED},
    WatchedCall{SYS_accept4, "accept4", descriptor, EMFILE},
    WatchedCall{SYS_accept, "accept", descriptor, EMFILE},
    WatchedCall{SYS_sendto, "sendto", descriptor, ENOBUFS},
    WatchedCall{SYS_sendmsg, "sendmsg", descriptor, ENOBUFS},
    WatchedCall{SYS_recvfrom, "recvfrom", descriptor, ECONNRESET},
    WatchedCall{SYS_recvmsg, "recvmsg", descriptor, ECONNRESET},
    WatchedCall{SYS_getsockopt, "getsockopt", descriptor, ENOBUFS},
    WatchedCall{SYS_pipe2, "pipe2", none, EMFILE},
    WatchedCall{SYS_dup2, "dup2", descriptor, EMFILE},
    WatchedCall{SYS_memfd_create, "memfd_create", none, EMFILE},
    WatchedCall{SYS_pidfd_open, "pidfd_open", none, EMFILE},
    WatchedCall{SYS_epoll_create1, "epoll_create1", none, EMFILE},
    WatchedCall{SYS_epoll_ctl, "epoll_ctl", descriptor, ENOMEM},
    WatchedCall{SYS_eventfd2, "eventfd2", none, EMFILE},
    WatchedCall{SYS_signalfd4, "signalfd4", none, EMFILE},
    WatchedCall{SYS_timerfd_create, "timerfd_create", none, EMFILE},
    WatchedCall{SYS_clone, "clone", none, EAGAIN},
    WatchedCall{SYS_clone3, "clone3", none, EAGAIN},
    WatchedCall{SYS_fork, "fork", none, EAGAIN},
    WatchedCall{SYS_vfork, "vfork", none, EAGAIN},
    WatchedCall{SYS_execve, "execve", path, EACCES},
};

} // namespace

std::span<const WatchedCall> watchedCalls() {
    return calls;
}

const WatchedCall& watchedCall(long number) {
    const auto* const found = std::ranges::find(calls, number, &WatchedCall::number);
    if (found == calls.end()) {
        throw std::logic_error("a call that is not watched");
    }
    return *found;
}

} // namespace velt::test
