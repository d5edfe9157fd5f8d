#include "standalone/login/place.h"

#include <errno.h>
#include <fcntl.h>
#include <stdio.h>
#include <string.h>
#include <unistd.h>

enum {
    most_links = 40
};

/* Opens the folder of place->path. */
static int split(struct velt_place* place) {
    char* last = strrchr(place->path, '/');

    if (last == NULL) {
        place->name = place->path;
        place->folder = open(".", O_PATH | O_DIRECTORY | O_CLOEXEC);
        return place->folder;
    }
    *last = '\0';
    place->name = last[1] == '\0' ? "." : last + 1;
    place->folder = open(last == place->path ? "/" : place->path, O_PATH | O_DIRECTORY | O_CLOEXEC);
    return place->folder;
}

/* Where the place is a link, place->path becomes the link's target. 1 then, 0 when it is none, -1 with
 * errno. */
static int take_target(struct velt_place* place) {
    char target[PATH_MAX];
    char joined[PATH_MAX];

    ssize_t length = readlinkat(place->folder, place->name, target, sizeof(target) - 1);
    if (length < 0) {
        return errno == EINVAL || errno == ENOENT ? 0 : -1;
    }
    target[length] = '\0';
    /* split() ended the path before the name. */
    const char* folder = target[0] == '/' || place->name == place->path ? "" : place->path;
    const char* between = target[0] == '/' || place->name == place->path ? "" : "/";
    int size = snprintf(joined, sizeof(joined), "%s%s%s", folder, between, target);
    if (size >= (int)sizeof(joined)) {
        errno = ENAMETOOLONG;
        return -1;
    }
    memcpy(place->path, joined, (size_t)size + 1);
    return 1;
}

int velt_open_place(struct velt_place* place, const char* path, enum velt_change change) {
    int more = 1;

    if (velt_look_at_homes() < 0) {
        return -1;
    }
    if (snprintf(place->path, sizeof(place->path), "%s", path) >= (int)sizeof(place->path)) {
        errno = ENAMETOOLONG;
        return -1;
    }
    for (int links = 0; more > 0; links++) {
        if (links > most_links) {
            errno = ELOOP;
            return -1;
        }
        if (split(place) < 0) {
            return -1;
        }
        /* A link's own place counts, too: who obeys what stands there finds the target by it. */
        more = velt_may_change(place->folder, place->name, change);
        if (more == 0 && change == velt_changes_content) {
            more = take_target(place);
        }
        if (more != 0) {
            velt_close_place(place);
        }
    }
    return more;
}

void velt_close_place(struct velt_place* place) {
    int reason = errno;
    (void)close(place->folder);
    errno = reason;
}
