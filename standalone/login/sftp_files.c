/* The functions of the C library by which the SFTP daemon changes files: in a session's view they go by
 * file_operations.h. Which functions the daemon calls, uncovered_functions.h of the daemon's room compares
 * with those that are here. */

/* With checked calls the headers define some of these functions themselves. */
#undef _FORTIFY_SOURCE

#include "standalone/login/file_operations.h"
#include "standalone/login/opened_paths.h"
#include "standalone/login/sftp_records.h"
#include "standalone/login/sftp_session.h"

#include <errno.h>
#include <fcntl.h>
#include <stdarg.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/stat.h>
#include <sys/time.h>
#include <unistd.h>

/* What is called while an operation is done is ours, and done as it is. */
static int working = 0;

static int is_ours(void) {
    return velt_is_in_view() && !working;
}

static int do_it(const struct velt_operation* operation) {
    working = 1;
    int result = velt_do(operation);
    velt_note_file_operation(operation, result, errno);
    working = 0;
    return result;
}

static struct velt_operation operation_on(enum velt_operation_kind kind, const char* path) {
    struct velt_operation operation;

    memset(&operation, 0, sizeof(operation));
    operation.kind = kind;
    operation.path = path;
    operation.descriptor = -1;
    return operation;
}

static struct velt_operation operation_on_open(enum velt_operation_kind kind, int descriptor) {
    struct velt_operation operation = operation_on(kind, velt_path_of_opened(descriptor));

    operation.descriptor = descriptor;
    return operation;
}

static int open_in_view(const char* path, int flags, mode_t mode) {
    struct velt_operation operation = operation_on(velt_opens_file, path);

    operation.flags = flags;
    operation.mode = mode;
    int descriptor = do_it(&operation);
    if (descriptor >= 0) {
        velt_note_opened(descriptor, path);
    }
    return descriptor;
}

/* The mode is there when the flags make a file. */
#define MODE_OF(flags, mode)                                                                                 \
    mode_t mode = 0;                                                                                         \
    if (((flags) & (O_CREAT | O_TMPFILE)) != 0) {                                                            \
        va_list rest;                                                                                        \
        va_start(rest, flags);                                                                               \
        (mode) = va_arg(rest, mode_t);                                                                       \
        va_end(rest);                                                                                        \
    }

VELT_WRAPPER int open(const char* path, int flags, ...) {
    VELT_NEXT(open);
    MODE_OF(flags, mode)
    return is_ours() ? open_in_view(path, flags, mode) : next(path, flags, mode);
}

VELT_WRAPPER int open64(const char* path, int flags, ...) {
    VELT_NEXT(open64);
    MODE_OF(flags, mode)
    return is_ours() ? open_in_view(path, flags | O_LARGEFILE, mode) : next(path, flags, mode);
}

int __open_2(const char* path, int flags);
int __open64_2(const char* path, int flags);

VELT_WRAPPER int __open_2(const char* path, int flags) {
    VELT_NEXT(__open_2);
    return is_ours() ? open_in_view(path, flags, 0) : next(path, flags);
}

VELT_WRAPPER int __open64_2(const char* path, int flags) {
    VELT_NEXT(__open64_2);
    return is_ours() ? open_in_view(path, flags | O_LARGEFILE, 0) : next(path, flags);
}

/* These are called all the time, for the connection as well. */
#define VELT_FREQUENT_NEXT(name)                                                                             \
    static __typeof__(&(name)) next = NULL;                                                                  \
    if (next == NULL) {                                                                                      \
        *(void**)(&next) = velt_next_function(#name);                                                        \
    }

static ssize_t note_octets(int descriptor, ssize_t octets, int are_sent) {
    if (is_ours()) {
        working = 1;
        velt_note_octets(descriptor, octets, are_sent);
        working = 0;
    }
    return octets;
}

VELT_WRAPPER ssize_t read(int descriptor, void* octets, size_t size) {
    VELT_FREQUENT_NEXT(read)
    return note_octets(descriptor, next(descriptor, octets, size), 0);
}

VELT_WRAPPER ssize_t write(int descriptor, const void* octets, size_t size) {
    VELT_FREQUENT_NEXT(write)
    return note_octets(descriptor, next(descriptor, octets, size), 1);
}

VELT_WRAPPER int close(int descriptor) {
    VELT_FREQUENT_NEXT(close)
    if (is_ours()) {
        working = 1;
        velt_note_close(descriptor);
        working = 0;
    }
    return next(descriptor);
}

VELT_WRAPPER void _exit(int status) {
    VELT_FREQUENT_NEXT(_exit)
    if (is_ours()) {
        working = 1;
        velt_note_end_of_process();
    }
    next(status);
    abort();
}

__attribute__((destructor)) static void note_end(void) {
    if (is_ours()) {
        working = 1;
        velt_note_end_of_process();
    }
}

/* A session reads files in this way, those of the system; it writes none. */
static int may_open_stream(const char* mode) {
    if (is_ours() && strpbrk(mode, "wa+") != NULL) {
        errno = EACCES;
        return 0;
    }
    return 1;
}

VELT_WRAPPER FILE* fopen(const char* path, const char* mode) {
    VELT_NEXT(fopen);
    return may_open_stream(mode) ? next(path, mode) : NULL;
}

VELT_WRAPPER FILE* fopen64(const char* path, const char* mode) {
    VELT_NEXT(fopen64);
    return may_open_stream(mode) ? next(path, mode) : NULL;
}

static int cut(const char* path, off_t length) {
    struct velt_operation operation = operation_on(velt_cuts_file, path);

    operation.length = length;
    return do_it(&operation);
}

VELT_WRAPPER int truncate(const char* path, off_t length) {
    VELT_NEXT(truncate);
    return is_ours() ? cut(path, length) : next(path, length);
}

VELT_WRAPPER int truncate64(const char* path, off64_t length) {
    VELT_NEXT(truncate64);
    return is_ours() ? cut(path, (off_t)length) : next(path, length);
}

/* Whoever may write to an open file may cut it, too. */
static int note_cut(int descriptor, off_t length, int result) {
    if (is_ours()) {
        struct velt_operation operation = operation_on_open(velt_cuts_file, descriptor);
        operation.length = length;
        working = 1;
        velt_note_file_operation(&operation, result, errno);
        working = 0;
    }
    return result;
}

VELT_WRAPPER int ftruncate(int descriptor, off_t length) {
    VELT_NEXT(ftruncate);
    return note_cut(descriptor, length, next(descriptor, length));
}

VELT_WRAPPER int ftruncate64(int descriptor, off64_t length) {
    VELT_NEXT(ftruncate64);
    return note_cut(descriptor, (off_t)length, next(descriptor, length));
}

VELT_WRAPPER int mkdir(const char* path, mode_t mode) {
    VELT_NEXT(mkdir);
    struct velt_operation operation = operation_on(velt_makes_folder, path);

    operation.mode = mode;
    return is_ours() ? do_it(&operation) : next(path, mode);
}

VELT_WRAPPER int unlink(const char* path) {
    VELT_NEXT(unlink);
    struct velt_operation operation = operation_on(velt_removes_file, path);

    return is_ours() ? do_it(&operation) : next(path);
}

VELT_WRAPPER int rmdir(const char* path) {
    VELT_NEXT(rmdir);
    struct velt_operation operation = operation_on(velt_removes_folder, path);

    return is_ours() ? do_it(&operation) : next(path);
}

VELT_WRAPPER int rename(const char* from, const char* to) {
    VELT_NEXT(rename);
    struct velt_operation operation = operation_on(velt_moves, from);

    operation.other = to;
    return is_ours() ? do_it(&operation) : next(from, to);
}

VELT_WRAPPER int link(const char* from, const char* to) {
    VELT_NEXT(link);
    struct velt_operation operation = operation_on(velt_makes_link, from);

    operation.other = to;
    return is_ours() ? do_it(&operation) : next(from, to);
}

VELT_WRAPPER int symlink(const char* target, const char* path) {
    VELT_NEXT(symlink);
    struct velt_operation operation = operation_on(velt_makes_symbolic_link, path);

    operation.other = target;
    return is_ours() ? do_it(&operation) : next(target, path);
}

VELT_WRAPPER int chmod(const char* path, mode_t mode) {
    VELT_NEXT(chmod);
    struct velt_operation operation = operation_on(velt_sets_mode, path);

    operation.mode = mode;
    return is_ours() ? do_it(&operation) : next(path, mode);
}

VELT_WRAPPER int fchmod(int descriptor, mode_t mode) {
    VELT_NEXT(fchmod);
    struct velt_operation operation = operation_on_open(velt_sets_mode, descriptor);

    operation.mode = mode;
    return is_ours() ? do_it(&operation) : next(descriptor, mode);
}

/* Of the functions that take a folder, the daemon calls these, for paths of the working directory. */
static int is_working_directory(int folder) {
    if (folder != AT_FDCWD) {
        errno = EACCES;
    }
    return folder == AT_FDCWD;
}

VELT_WRAPPER int fchmodat(int folder, const char* path, mode_t mode, int flags) {
    VELT_NEXT(fchmodat);
    struct velt_operation operation = operation_on(velt_sets_mode, path);

    if (!is_ours()) {
        return next(folder, path, mode, flags);
    }
    operation.mode = mode;
    operation.is_of_link = (flags & AT_SYMLINK_NOFOLLOW) != 0;
    return is_working_directory(folder) ? do_it(&operation) : -1;
}

static int set_owner(const char* path, uid_t owner, gid_t group, int is_of_link) {
    struct velt_operation operation = operation_on(velt_sets_owner, path);

    operation.user = owner;
    operation.group = group;
    operation.is_of_link = is_of_link;
    return do_it(&operation);
}

VELT_WRAPPER int chown(const char* path, uid_t owner, gid_t group) {
    VELT_NEXT(chown);
    return is_ours() ? set_owner(path, owner, group, 0) : next(path, owner, group);
}

VELT_WRAPPER int lchown(const char* path, uid_t owner, gid_t group) {
    VELT_NEXT(lchown);
    return is_ours() ? set_owner(path, owner, group, 1) : next(path, owner, group);
}

VELT_WRAPPER int fchown(int descriptor, uid_t owner, gid_t group) {
    VELT_NEXT(fchown);
    struct velt_operation operation = operation_on_open(velt_sets_owner, descriptor);

    operation.user = owner;
    operation.group = group;
    return is_ours() ? do_it(&operation) : next(descriptor, owner, group);
}

VELT_WRAPPER int fchownat(int folder, const char* path, uid_t owner, gid_t group, int flags) {
    VELT_NEXT(fchownat);
    if (!is_ours()) {
        return next(folder, path, owner, group, flags);
    }
    return is_working_directory(folder) ? set_owner(path, owner, group, (flags & AT_SYMLINK_NOFOLLOW) != 0)
                                        : -1;
}

static int set_times(struct velt_operation operation, const struct timeval* times) {
    struct timespec both[2];

    for (int i = 0; times != NULL && i < 2; i++) {
        both[i].tv_sec = times[i].tv_sec;
        both[i].tv_nsec = times[i].tv_usec * 1000;
    }
    operation.times = times != NULL ? both : NULL;
    return do_it(&operation);
}

VELT_WRAPPER int utimes(const char* path, const struct timeval times[2]) {
    VELT_NEXT(utimes);
    return is_ours() ? set_times(operation_on(velt_sets_times, path), times) : next(path, times);
}

VELT_WRAPPER int futimes(int descriptor, const struct timeval times[2]) {
    VELT_NEXT(futimes);
    return is_ours() ? set_times(operation_on_open(velt_sets_times, descriptor), times)
                     : next(descriptor, times);
}

VELT_WRAPPER int futimens(int descriptor, const struct timespec times[2]) {
    VELT_NEXT(futimens);
    struct velt_operation operation = operation_on_open(velt_sets_times, descriptor);

    operation.times = times;
    return is_ours() ? do_it(&operation) : next(descriptor, times);
}

VELT_WRAPPER int utimensat(int folder, const char* path, const struct timespec times[2], int flags) {
    VELT_NEXT(utimensat);
    struct velt_operation operation = operation_on(velt_sets_times, path);

    if (!is_ours()) {
        return next(folder, path, times, flags);
    }
    operation.times = times;
    operation.is_of_link = (flags & AT_SYMLINK_NOFOLLOW) != 0;
    return is_working_directory(folder) ? do_it(&operation) : -1;
}
