#include "standalone/login/name_mode.h"

#include <errno.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

/* The same on all machines on which this system is built; the headers may be older than the kernel. */
#ifndef SYS_fchmodat2
#define SYS_fchmodat2 452
#endif

/* A FIFO without a partner is opened without waiting, and a terminal does not become the session's. */
static int open_anyhow(int folder, const char* name) {
    const int flags = O_NOFOLLOW | O_NONBLOCK | O_NOCTTY | O_CLOEXEC;
    int file = openat(folder, name, O_RDONLY | flags);

    return file < 0 && errno == EACCES ? openat(folder, name, O_WRONLY | flags) : file;
}

int velt_set_mode_by_opening(int folder, const char* name, mode_t mode) {
    int file = open_anyhow(folder, name);

    if (file < 0) {
        return -1;
    }
    int result = fchmod(file, mode);
    int reason = errno;
    (void)close(file);
    errno = reason;
    return result;
}

int velt_set_mode_at(int folder, const char* name, mode_t mode) {
    long result = syscall(SYS_fchmodat2, folder, name, mode, AT_SYMLINK_NOFOLLOW);

    /* The C library's own fchmodat() goes through /proc, which a session's view does not have. */
    return result < 0 && errno == ENOSYS ? velt_set_mode_by_opening(folder, name, mode) : (int)result;
}
