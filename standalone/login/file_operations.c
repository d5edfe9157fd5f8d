#include "standalone/login/file_operations.h"

#include "standalone/login/access_files.h"
#include "standalone/login/name_mode.h"
#include "standalone/login/place.h"

#include <errno.h>
#include <fcntl.h>
#include <stddef.h>
#include <stdio.h>
#include <sys/stat.h>
#include <unistd.h>

static void (*end_session)(void) = NULL;

void velt_end_old_sessions_by(void (*end)(void)) {
    end_session = end;
}

static int leave(struct velt_place* place, int result) {
    velt_close_place(place);
    return result;
}

/* For names that are made, moved or removed. A session that is older than a share knows nothing of the
 * folders on the way to it, and one of them, once moved, would show to later logins what they may not see. */
static int open_to_rename(struct velt_place* place, const char* path) {
    if (velt_access_files_changed()) {
        if (end_session != NULL) {
            end_session();
        }
        errno = EACCES;
        return -1;
    }
    return velt_open_place(place, path, velt_changes_name);
}

/* What is changed of a link itself is changed of its name's place. */
static int open_to_set(struct velt_place* place, const struct velt_operation* operation) {
    return velt_open_place(place, operation->path,
                           operation->is_of_link ? velt_changes_name : velt_changes_content);
}

static int forbids(mode_t mode) {
    if ((mode & (S_ISUID | S_ISGID)) != 0) {
        errno = EPERM;
        return 1;
    }
    return 0;
}

static int open_to_change(const char* path, int flags, mode_t mode) {
    struct velt_place place;

    if (((flags & O_CREAT) != 0 && forbids(mode)) ||
        velt_open_place(&place, path, velt_changes_content) < 0) {
        return -1;
    }
    return leave(&place, openat(place.folder, place.name, flags | O_NOFOLLOW, mode));
}

static int open_file(const struct velt_operation* operation) {
    if ((operation->flags & (O_WRONLY | O_RDWR | O_CREAT | O_TRUNC | O_APPEND)) == 0) {
        return open(operation->path, operation->flags, operation->mode);
    }
    return open_to_change(operation->path, operation->flags, operation->mode);
}

static int cut_file(const struct velt_operation* operation) {
    int file = open_to_change(operation->path, O_WRONLY | O_NONBLOCK | O_CLOEXEC, 0);

    if (file < 0) {
        return -1;
    }
    int result = ftruncate(file, operation->length);
    int reason = errno;
    (void)close(file);
    errno = reason;
    return result;
}

static int make_folder(const struct velt_operation* operation) {
    struct velt_place place;

    if (open_to_rename(&place, operation->path) < 0) {
        return -1;
    }
    return leave(&place, mkdirat(place.folder, place.name, operation->mode));
}

static int remove_place(const struct velt_operation* operation) {
    struct velt_place place;

    if (open_to_rename(&place, operation->path) < 0) {
        return -1;
    }
    return leave(&place, unlinkat(place.folder, place.name,
                                  operation->kind == velt_removes_folder ? AT_REMOVEDIR : 0));
}

/* After EXDEV the daemon of FTP copies a file and then removes it; where it cannot, the copy stays, and it
 * speaks of success. Only after all that could forbid the removal does the kernel say that a file is no
 * folder. */
static void explain_failed_move(const struct velt_place* from) {
    struct stat status;

    if (errno == EXDEV && fstatat(from->folder, from->name, &status, AT_SYMLINK_NOFOLLOW) == 0 &&
        !S_ISDIR(status.st_mode) && unlinkat(from->folder, from->name, AT_REMOVEDIR) < 0 &&
        errno == ENOTDIR) {
        errno = EXDEV;
    }
}

static int rename_place(const struct velt_place* from, const struct velt_place* to) {
    int result = renameat(from->folder, from->name, to->folder, to->name);
    if (result < 0) {
        explain_failed_move(from);
    }
    return result;
}

static int link_place(const struct velt_place* from, const struct velt_place* to) {
    return linkat(from->folder, from->name, to->folder, to->name, 0);
}

/* A name that is kept gets no second one either, by which the file could be changed. */
static int give_name(const struct velt_operation* operation) {
    struct velt_place from;
    struct velt_place to;

    if (open_to_rename(&from, operation->path) < 0) {
        return -1;
    }
    int result = velt_open_place(&to, operation->other, velt_changes_name);
    if (result == 0) {
        result = leave(&to, (operation->kind == velt_moves ? rename_place : link_place)(&from, &to));
    }
    return leave(&from, result);
}

static int make_symbolic_link(const struct velt_operation* operation) {
    struct velt_place place;

    if (open_to_rename(&place, operation->path) < 0) {
        return -1;
    }
    return leave(&place, symlinkat(operation->other, place.folder, place.name));
}

/* Whether an open file may be changed in other ways than by its descriptor. What was opened for writing was
 * looked at then; the path of any other file has to lead to it still. */
static int may_change_open(const struct velt_operation* operation) {
    struct velt_place place;
    struct stat opened;
    struct stat found;
    int flags = fcntl(operation->descriptor, F_GETFL);

    if (flags < 0 || (flags & O_ACCMODE) != O_RDONLY) {
        return flags < 0 ? -1 : 0;
    }
    if (operation->path == NULL) {
        errno = EACCES;
        return -1;
    }
    if (fstat(operation->descriptor, &opened) < 0 ||
        velt_open_place(&place, operation->path, velt_changes_content) < 0) {
        return -1;
    }
    if (leave(&place, fstatat(place.folder, place.name, &found, AT_SYMLINK_NOFOLLOW)) < 0 ||
        found.st_dev != opened.st_dev || found.st_ino != opened.st_ino) {
        errno = EACCES;
        return -1;
    }
    return 0;
}

static int set_mode(const struct velt_operation* operation) {
    struct velt_place place;

    if (forbids(operation->mode)) {
        return -1;
    }
    if (operation->descriptor >= 0) {
        return may_change_open(operation) < 0 ? -1 : fchmod(operation->descriptor, operation->mode);
    }
    if (open_to_set(&place, operation) < 0) {
        return -1;
    }
    return leave(&place, velt_set_mode_at(place.folder, place.name, operation->mode));
}

static int set_owner(const struct velt_operation* operation) {
    struct velt_place place;

    if (operation->descriptor >= 0) {
        return may_change_open(operation) < 0
                   ? -1
                   : fchown(operation->descriptor, operation->user, operation->group);
    }
    if (open_to_set(&place, operation) < 0) {
        return -1;
    }
    return leave(&place,
                 fchownat(place.folder, place.name, operation->user, operation->group, AT_SYMLINK_NOFOLLOW));
}

static int set_times(const struct velt_operation* operation) {
    struct velt_place place;

    if (operation->descriptor >= 0) {
        return may_change_open(operation) < 0 ? -1 : futimens(operation->descriptor, operation->times);
    }
    if (open_to_set(&place, operation) < 0) {
        return -1;
    }
    return leave(&place, utimensat(place.folder, place.name, operation->times, AT_SYMLINK_NOFOLLOW));
}

int velt_do(const struct velt_operation* operation) {
    static int (*const functions[velt_operation_kinds])(const struct velt_operation*) = {
        [velt_opens_file] = open_file,
        [velt_cuts_file] = cut_file,
        [velt_makes_folder] = make_folder,
        [velt_removes_file] = remove_place,
        [velt_removes_folder] = remove_place,
        [velt_moves] = give_name,
        [velt_sets_mode] = set_mode,
        [velt_sets_owner] = set_owner,
        [velt_sets_times] = set_times,
        [velt_makes_link] = give_name,
        [velt_makes_symbolic_link] = make_symbolic_link,
    };
    int result = functions[operation->kind](operation);
    if (result < 0 && errno == EROFS) {
        errno = EACCES;
    }
    return result;
}
