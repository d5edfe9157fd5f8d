#include "standalone/login/access_files.h"

#include <errno.h>
#include <fcntl.h>
#include <limits.h>
#include <stdio.h>
#include <string.h>
#include <sys/stat.h>
#include <unistd.h>

enum {
    file_count = 2
};

static const char folder_name[] = "/etc/velt";
static const char* const file_names[file_count] = {"shares.json", "chroot_rules"};

/* What tells one content of a file from another: a file that is written anew is another one or has other
 * times. All zero when there is none. */
struct version {
    dev_t device;
    ino_t number;
    off_t size;
    struct timespec written;
    struct timespec changed;
};

static int folder = -1;
static struct version noted[file_count];

static int is_same_time(struct timespec one, struct timespec other) {
    return one.tv_sec == other.tv_sec && one.tv_nsec == other.tv_nsec;
}

static int is_same(const struct version* one, const struct version* other) {
    return one->device == other->device && one->number == other->number && one->size == other->size &&
           is_same_time(one->written, other->written) && is_same_time(one->changed, other->changed);
}

static int look(const char* name, struct version* found) {
    struct stat status;

    memset(found, 0, sizeof(*found));
    if (fstatat(folder, name, &status, AT_SYMLINK_NOFOLLOW) < 0) {
        return errno == ENOENT ? 0 : -1;
    }
    found->device = status.st_dev;
    found->number = status.st_ino;
    found->size = status.st_size;
    found->written = status.st_mtim;
    found->changed = status.st_ctim;
    return 0;
}

int velt_note_access_files(const char* state_root) {
    char path[PATH_MAX];

    if (folder >= 0) {
        (void)close(folder);
        folder = -1;
    }
    if (snprintf(path, sizeof(path), "%s%s", state_root, folder_name) >= (int)sizeof(path)) {
        errno = ENAMETOOLONG;
        return -1;
    }
    folder = open(path, O_PATH | O_DIRECTORY | O_CLOEXEC);
    if (folder < 0) {
        return -1;
    }
    for (int i = 0; i < file_count; i++) {
        if (look(file_names[i], &noted[i]) < 0) {
            return -1;
        }
    }
    return 0;
}

int velt_access_files_changed(void) {
    struct version now;

    for (int i = 0; i < file_count; i++) {
        if (look(file_names[i], &now) < 0 || !is_same(&now, &noted[i])) {
            return 1;
        }
    }
    return 0;
}
