#include "standalone/login/file_functions.h"

#include "standalone/login/access_files.h"
#include "standalone/login/place.h"

#include <sys/stat.h>

static int leave(struct velt_place* place, int result) {
    velt_close_place(place);
    return result;
}

static void end_session(void) {
    pr_log_pri(PR_LOG_NOTICE, "session of '%s' ended: the shares or rules have changed since its login",
               session.user);
    pr_response_send(R_421, "The shares or rules have changed: log in again.");
    pr_session_end(0);
}

/* For names that are made, moved or removed. A session that is older than a share knows nothing of the
 * folders on the way to it, and one of them, once moved, would show to later logins what they may not see. */
static int open_to_rename(struct velt_place* place, const char* path) {
    if (velt_access_files_changed()) {
        end_session();
        errno = EACCES;
        return -1;
    }
    return velt_open_place(place, path, velt_changes_name);
}

static int open_to_change(const char* path, int flags) {
    struct velt_place place;

    if (velt_open_place(&place, path, velt_changes_content) < 0) {
        return -1;
    }
    return leave(&place, openat(place.folder, place.name, flags | O_NOFOLLOW, PR_OPEN_MODE));
}

static int open_file(pr_fh_t* file, const char* path, int flags) {
    (void)file;
    if ((flags & (O_WRONLY | O_RDWR | O_CREAT | O_TRUNC | O_APPEND)) == 0) {
        return open(path, flags, PR_OPEN_MODE);
    }
    return open_to_change(path, flags);
}

static int cut_file(pr_fs_t* fs, const char* path, off_t length) {
    int file = open_to_change(path, O_WRONLY | O_NONBLOCK | O_CLOEXEC);

    (void)fs;
    if (file < 0) {
        return -1;
    }
    int result = ftruncate(file, length);
    int reason = errno;
    (void)close(file);
    errno = reason;
    return result;
}

static int make_folder(pr_fs_t* fs, const char* path, mode_t mode) {
    struct velt_place place;

    (void)fs;
    if (open_to_rename(&place, path) < 0) {
        return -1;
    }
    return leave(&place, mkdirat(place.folder, place.name, mode));
}

static int remove_place(const char* path, int flags) {
    struct velt_place place;

    if (open_to_rename(&place, path) < 0) {
        return -1;
    }
    return leave(&place, unlinkat(place.folder, place.name, flags));
}

static int remove_file(pr_fs_t* fs, const char* path) {
    (void)fs;
    return remove_place(path, 0);
}

static int remove_folder(pr_fs_t* fs, const char* path) {
    (void)fs;
    return remove_place(path, AT_REMOVEDIR);
}

/* After EXDEV the daemon copies a file and then removes it; where it cannot, the copy stays, and it speaks of
 * success. Only after all that could forbid the removal does the kernel say that a file is no folder. */
static void explain_failed_move(const struct velt_place* from) {
    struct stat status;

    if (errno == EXDEV && fstatat(from->folder, from->name, &status, AT_SYMLINK_NOFOLLOW) == 0 &&
        !S_ISDIR(status.st_mode) && unlinkat(from->folder, from->name, AT_REMOVEDIR) < 0 &&
        errno == ENOTDIR) {
        errno = EXDEV;
    }
}

static int move_file(pr_fs_t* fs, const char* from_path, const char* to_path) {
    struct velt_place from;
    struct velt_place to;

    (void)fs;
    if (open_to_rename(&from, from_path) < 0) {
        return -1;
    }
    int result = velt_open_place(&to, to_path, velt_changes_name);
    if (result == 0) {
        result = leave(&to, renameat(from.folder, from.name, to.folder, to.name));
        if (result < 0) {
            explain_failed_move(&from);
        }
    }
    return leave(&from, result);
}

static int forbids(mode_t mode) {
    if ((mode & (S_ISUID | S_ISGID)) != 0) {
        errno = EPERM;
        return TRUE;
    }
    return FALSE;
}

static int change_mode(pr_fs_t* fs, const char* path, mode_t mode) {
    struct velt_place place;

    (void)fs;
    if (forbids(mode) || velt_open_place(&place, path, velt_changes_content) < 0) {
        return -1;
    }
    return leave(&place, fchmodat(place.folder, place.name, mode, 0));
}

static int change_mode_of_open_file(pr_fh_t* file, int descriptor, mode_t mode) {
    (void)file;
    return forbids(mode) ? -1 : fchmod(descriptor, mode);
}

static int change_owner(pr_fs_t* fs, const char* path, uid_t user, gid_t group) {
    struct velt_place place;

    (void)fs;
    if (velt_open_place(&place, path, velt_changes_content) < 0) {
        return -1;
    }
    return leave(&place, fchownat(place.folder, place.name, user, group, AT_SYMLINK_NOFOLLOW));
}

static int change_times(pr_fs_t* fs, const char* path, struct timeval* times) {
    struct velt_place place;
    struct timespec both[2];

    (void)fs;
    if (velt_open_place(&place, path, velt_changes_content) < 0) {
        return -1;
    }
    for (int i = 0; i < 2; i++) {
        both[i].tv_sec = times[i].tv_sec;
        both[i].tv_nsec = times[i].tv_usec * 1000;
    }
    return leave(&place, utimensat(place.folder, place.name, both, AT_SYMLINK_NOFOLLOW));
}

static int make_no_link(pr_fs_t* fs, const char* target, const char* path) {
    (void)fs;
    (void)target;
    (void)path;
    errno = EPERM;
    return -1;
}

void velt_replace_file_functions(pr_fs_t* files) {
    files->open = open_file;
    files->truncate = cut_file;
    files->mkdir = make_folder;
    files->unlink = remove_file;
    files->rmdir = remove_folder;
    files->rename = move_file;
    files->chmod = change_mode;
    files->fchmod = change_mode_of_open_file;
    files->chown = change_owner;
    files->lchown = change_owner;
    files->utimes = change_times;
    files->link = make_no_link;
    files->symlink = make_no_link;
}
