#include "standalone/login/own_files.h"

#include "standalone/login/kept_objects.h"
#include "standalone/login/own_names.h"
#include "standalone/login/own_places.h"
#include "standalone/login/way.h"

#include <errno.h>
#include <fcntl.h>
#include <limits.h>
#include <stdio.h>
#include <string.h>
#include <strings.h>
#include <sys/stat.h>
#include <unistd.h>

enum {
    most_homes = 2,
    folder_flags = O_PATH | O_DIRECTORY | O_CLOEXEC
};

static const char* const root_names[] = {"etc", "lib", NULL};

struct home {
    char path[PATH_MAX];
    struct velt_way_end end; /* when its files were last kept */
    int is_known;            /* else they could not be */
};

static struct home homes[most_homes];
static size_t home_count;
static int root_is_kept;

/* Closes a folder that is only looked at, and leaves errno alone. */
static void leave(int folder) {
    int reason = errno;
    (void)close(folder);
    errno = reason;
}

/* Whether it is how things are, and not a failure of the moment. */
static int is_out_of_reach(int error) {
    return error == EACCES || error == EPERM || error == ELOOP || error == ENAMETOOLONG;
}

/* The name without its star. */
static const char* stem_of(const char* name, char* stem, size_t size) {
    (void)snprintf(stem, size, "%.*s", (int)strcspn(name, "*"), name);
    return stem;
}

static int keep_files(struct home* home) {
    struct velt_way_end root; /* which is visited on no way */
    const struct velt_way_step step = {&root.what, "", &root.what, 0, 0};

    if (velt_walk_way("/", "", NULL, &root) < 0 || velt_keep_way_to_home(&step) < 0 ||
        velt_walk_way(home->path, "", velt_keep_way_to_home, &home->end) < 0 ||
        (home->end.exists && velt_keep_own_places(home->path) < 0)) {
        return -1;
    }
    home->is_known = 1;
    return 0;
}

int velt_keep_home(const char* path) {
    struct home* home = &homes[home_count];

    if (home_count == most_homes) {
        errno = ENOSPC;
        return -1;
    }
    if (snprintf(home->path, sizeof(home->path), "%s", path) >= (int)sizeof(home->path)) {
        errno = ENAMETOOLONG;
        return -1;
    }
    home->is_known = 0;
    home_count++;
    return velt_begin_ways() < 0 ? -1 : keep_files(home);
}

void velt_forget_homes(void) {
    velt_forget_kept();
    velt_forget_told();
    home_count = 0;
}

/* Folders that have been made in it since are among its own, too. Where the file system does not count them,
 * any change may be such a one. */
static int has_same_folders(const struct stat* one, const struct stat* other) {
    return one->st_nlink == other->st_nlink &&
           (one->st_nlink > 1 ||
            (one->st_mtim.tv_sec == other->st_mtim.tv_sec && one->st_mtim.tv_nsec == other->st_mtim.tv_nsec));
}

static int is_same_end(const struct velt_way_end* one, const struct velt_way_end* other) {
    if (one->exists || other->exists) {
        return one->exists && other->exists && velt_is_same_object(&one->what, &other->what) &&
               has_same_folders(&one->what, &other->what);
    }
    return velt_is_same_object(&one->folder, &other->folder) && strcmp(one->name, other->name) == 0;
}

int velt_look_at_homes(void) {
    struct velt_way_end now;
    int changed = 0;

    for (size_t i = 0; i < home_count && !changed; i++) {
        if (!homes[i].is_known) {
            changed = 1;
        } else if (velt_walk_way(homes[i].path, "", NULL, &now) == 0) {
            changed = !is_same_end(&now, &homes[i].end);
        } else if (errno != EACCES) {
            return -1;
        }
        /* Where the user may not look, those who read such files with the user's rights find none. */
    }
    if (!changed) {
        return 0;
    }
    velt_forget_kept();
    for (size_t i = 0; i < home_count; i++) {
        homes[i].is_known = 0;
    }
    for (size_t i = 0; i < home_count; i++) {
        if (keep_files(&homes[i]) < 0) {
            return -1;
        }
    }
    return 0;
}

void velt_keep_root(void) {
    root_is_kept = 1;
}

static int is_root_name(const char* name) {
    for (const char* const* each = root_names; *each != NULL; each++) {
        if (strcasecmp(*each, name) == 0) {
            return 1;
        }
    }
    return 0;
}

/* 1 when the child stands at one of these names, 0 when it does not, -1 with errno. */
static int stands_at(const char* const* names, int folder, const struct stat* child) {
    char stem[NAME_MAX + 1];
    struct stat status;

    for (; *names != NULL; names++) {
        if (fstatat(folder, stem_of(*names, stem, sizeof(stem)), &status, 0) == 0) {
            if (velt_is_same_object(child, &status)) {
                return 1;
            }
        } else if (errno != ENOENT && errno != ENOTDIR && !is_out_of_reach(errno)) {
            return -1;
        }
    }
    return 0;
}

static int keeps_in_home(int folder, const char* name, const struct stat* child) {
    return name != NULL ? velt_is_own_name(name) : stands_at(velt_own_names, folder, child);
}

static int keeps_in_root(int folder, const char* name, const struct stat* child) {
    return name != NULL ? is_root_name(name) : stands_at(root_names, folder, child);
}

/* What is to be changed. */
struct place {
    const char* name;
    int exists;
    int whole_only; /* its content is to be changed, so that it counts what is kept as a whole */
};

/* One folder on the way up from a place: `name` is the place's name when this is its own folder, else NULL,
 * and `child` is the folder from which the way came. 1, 0 or -1 as below. */
static int keeps(int folder, const struct stat* here, int at_root, const struct place* place,
                 const char* name, const struct stat* child) {
    int result = name != NULL ? velt_is_kept_name(here, name, place->exists, place->whole_only)
                              : velt_is_kept_below(folder, here, child, place->whole_only);

    for (size_t i = 0; i < home_count && result == 0; i++) {
        const struct velt_way_end* end = &homes[i].end;
        if (!end->exists) {
            result =
                name != NULL && velt_is_same_object(&end->folder, here) && strcasecmp(end->name, name) == 0;
        } else if (velt_is_same_object(&end->what, here)) {
            result = keeps_in_home(folder, name, child);
        }
    }
    if (result == 0 && root_is_kept && at_root) {
        result = keeps_in_root(folder, name, child);
    }
    return result != 0 ? result : velt_is_kept(here, 1);
}

/* 1 when the place may not be changed, 0 when it may, -1 with errno. Closes the folder. */
static int is_within_kept(int folder, const struct place* place) {
    const char* name = place->name;
    struct stat here;
    struct stat above;
    struct stat child;
    int result = fstat(folder, &here);

    memset(&child, 0, sizeof(child));
    while (result == 0) {
        int up = openat(folder, "..", folder_flags);
        if (up < 0 || fstat(up, &above) < 0) {
            result = -1;
        }
        int at_root = result == 0 && velt_is_same_object(&here, &above);
        if (result == 0) {
            result = keeps(folder, &here, at_root, place, name, &child);
        }
        leave(folder);
        folder = up;
        if (at_root) {
            break;
        }
        child = here;
        here = above;
        name = NULL;
    }
    if (folder >= 0) {
        leave(folder);
    }
    return result;
}

int velt_may_change(int folder, const char* name, enum velt_change change) {
    struct stat status;

    if (home_count == 0 && !root_is_kept) {
        return 0;
    }
    int exists = fstatat(folder, name, &status, AT_SYMLINK_NOFOLLOW) == 0;
    if (!exists && errno != ENOENT && !is_out_of_reach(errno)) {
        return -1;
    }
    const struct place place = {name, exists, change == velt_changes_content};
    int refused = exists && velt_is_kept(&status, place.whole_only);
    if (!refused) {
        int copy = fcntl(folder, F_DUPFD_CLOEXEC, 0);
        refused = copy < 0 ? -1 : is_within_kept(copy, &place);
    }
    if (refused > 0) {
        errno = EACCES;
    }
    return refused == 0 ? 0 : -1;
}
