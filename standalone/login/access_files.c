#include "standalone/login/access_files.h"

#include "standalone/login/way.h"

#include <errno.h>
#include <fcntl.h>
#include <limits.h>
#include <stdio.h>
#include <sys/stat.h>
#include <unistd.h>

enum {
    file_count = 2
};

static const char folder_name[] = "/etc/velt";
static const char* const file_names[file_count] = {"shares.json", "chroot_rules"};

/* What tells whether the file is still the same, and still there: its times change with its content, and with
 * its name. */
struct version {
    dev_t device;
    ino_t number;
    nlink_t names;
    off_t size;
    struct timespec written;
    struct timespec changed;
};

struct noted {
    int file; /* open, so that no other gets its number; -1: there was none */
    struct version version;
};

static int folder = -1;
static char folder_path[PATH_MAX];
static struct noted noted[file_count] = {{-1, {0, 0, 0, 0, {0, 0}, {0, 0}}},
                                         {-1, {0, 0, 0, 0, {0, 0}, {0, 0}}}};

static void forget(int* file) {
    if (*file >= 0) {
        (void)close(*file);
    }
    *file = -1;
}

static int is_same_time(struct timespec one, struct timespec other) {
    return one.tv_sec == other.tv_sec && one.tv_nsec == other.tv_nsec;
}

static int is_same(const struct version* one, const struct version* other) {
    return one->device == other->device && one->number == other->number && one->names == other->names &&
           one->size == other->size && is_same_time(one->written, other->written) &&
           is_same_time(one->changed, other->changed);
}

/* What has the name now, also where something has been mounted over it. Where the user may not look into the
 * folder, the file that is known has to do. */
static int look(const char* name, int file, struct version* found) {
    struct stat status;

    if (fstatat(folder, name, &status, AT_SYMLINK_NOFOLLOW) < 0 &&
        (errno != EACCES || fstat(file, &status) < 0)) {
        return -1;
    }
    found->device = status.st_dev;
    found->number = status.st_ino;
    found->names = status.st_nlink;
    found->size = status.st_size;
    found->written = status.st_mtim;
    found->changed = status.st_ctim;
    return 0;
}

static int note(const char* name, struct noted* one) {
    one->file = openat(folder, name, O_PATH | O_NOFOLLOW | O_CLOEXEC);
    if (one->file < 0) {
        return errno == ENOENT ? 0 : -1;
    }
    return look(name, one->file, &one->version);
}

int velt_note_access_files(const char* state_root) {
    forget(&folder);
    for (int i = 0; i < file_count; i++) {
        forget(&noted[i].file);
    }
    if (snprintf(folder_path, sizeof(folder_path), "%s%s", state_root, folder_name) >=
        (int)sizeof(folder_path)) {
        errno = ENAMETOOLONG;
        return -1;
    }
    folder = open(folder_path, O_PATH | O_DIRECTORY | O_CLOEXEC);
    if (folder < 0 || velt_begin_ways() < 0) {
        return -1;
    }
    for (int i = 0; i < file_count; i++) {
        if (note(file_names[i], &noted[i]) < 0) {
            return -1;
        }
    }
    return 0;
}

static int is_unchanged(const char* name, const struct noted* one) {
    struct version now;
    struct stat status;

    if (one->file < 0) {
        return fstatat(folder, name, &status, AT_SYMLINK_NOFOLLOW) < 0 && errno == ENOENT;
    }
    return look(name, one->file, &now) == 0 && is_same(&now, &one->version);
}

/* The files of a folder that was exchanged stay as they were, but nobody reads them any more. Its own times
 * would not tell, since they change with the other files in it. */
static int is_folder_in_place(void) {
    struct velt_way_end end;
    struct stat status;

    return fstat(folder, &status) == 0 && velt_walk_way(folder_path, "", NULL, &end) == 0 && end.exists &&
           end.what.st_dev == status.st_dev && end.what.st_ino == status.st_ino;
}

int velt_access_files_changed(void) {
    if (!is_folder_in_place()) {
        return 1;
    }
    for (int i = 0; i < file_count; i++) {
        if (!is_unchanged(file_names[i], &noted[i])) {
            return 1;
        }
    }
    return 0;
}

size_t velt_access_descriptors(int* descriptors, size_t most) {
    size_t count = 0;

    if (folder >= 0 && count < most) {
        descriptors[count++] = folder;
    }
    for (int i = 0; i < file_count && count < most; i++) {
        if (noted[i].file >= 0) {
            descriptors[count++] = noted[i].file;
        }
    }
    return count;
}
