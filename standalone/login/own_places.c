#include "standalone/login/own_places.h"

#include "standalone/login/kept_objects.h"
#include "standalone/login/own_names.h"
#include "standalone/login/way.h"

#include <dirent.h>
#include <errno.h>
#include <fcntl.h>
#include <limits.h>
#include <stdio.h>
#include <string.h>
#include <sys/stat.h>
#include <unistd.h>

enum {
    deepest = 4, /* folders below one of the home's own, where links are looked for */
    /* That are looked at for that below one of the home's own, and in the home itself: those alone that a
     * session does not make, so nobody hides one behind others. */
    most_entries = 100000
};

/* A folder that is listed. */
struct listing {
    const char* home;
    const char* below; /* the home */
    int depth;         /* of the folder; 0 is the home itself */
    int is_linked;     /* whether a link leads there from the home's own name on */
    int* left;         /* entries that may still be looked at */
};

static char crowded[PATH_MAX + 64];

static int keep_folder(const struct listing* listing, int folder);

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

static int is_absent(int error) {
    return error == ENOENT || error == ENOTDIR || is_out_of_reach(error);
}

static int is_folder_itself(const char* name) {
    return strcmp(name, ".") == 0 || strcmp(name, "..") == 0;
}

/* What comes before the first link lies at its own name. */
static int keep_step(const struct velt_way_step* step) {
    if (velt_keep_object(step->what, step->is_end) < 0) {
        return -1;
    }
    return step->links == 0 || is_folder_itself(step->name)
               ? 0
               : velt_keep_name(step->folder, step->name, step->what, step->is_end);
}

/* Keeps what the link at this place below the home leads to. 1 when it is a folder that may hold more of
 * that, 0 when not, or -1 with errno. What cannot be reached is recognised by its name alone. Any other
 * failure may be over in a moment, and what it hid could be changed then. */
static int keep_behind_link(const char* home, const char* below) {
    struct velt_way_end end;

    if (velt_walk_way(home, below, NULL, &end) < 0) {
        return is_out_of_reach(errno) ? 0 : -1;
    }
    if (end.exists && velt_is_around_home(&end.what)) {
        return 0; /* a link to all of the home stands for none of its own files */
    }
    if (velt_walk_way(home, below, keep_step, &end) < 0) {
        return is_out_of_reach(errno) ? 0 : -1;
    }
    return end.exists ? S_ISDIR(end.what.st_mode) : velt_keep_name(&end.folder, end.name, NULL, 1);
}

/* "" where it cannot be read. */
static void read_target(int folder, const char* name, char target[PATH_MAX]) {
    const ssize_t length = readlinkat(folder, name, target, PATH_MAX - 1);

    target[length > 0 ? length : 0] = '\0';
}

/* Whether the link stays within its folder, as far as its text tells. */
static int leads_below(int folder, const char* name) {
    char target[PATH_MAX];

    read_target(folder, name, target);
    return target[0] != '\0' && target[0] != '/' && strncmp(target, "../", 3) != 0 &&
           strcmp(target, "..") != 0;
}

/* Whether a link in this folder leads to what is kept with the home's own name, where links are looked for.
 */
static int stays(const struct listing* listing, int folder, const char* name) {
    char target[PATH_MAX];
    const char* at = target;
    int depth = listing->depth;

    read_target(folder, name, target);
    for (; strncmp(at, "../", 3) == 0; at += 3) {
        depth--;
    }
    if (*at == '\0' || *at == '/' || depth < 1 || listing->is_linked || strstr(at, "..") != NULL) {
        return 0;
    }
    for (; *at != '\0'; at++) {
        depth += *at == '/';
    }
    return depth <= deepest;
}

/* What is listed there may hold links. Takes the folder, or -1 with errno. */
static int keep_within(const struct listing* listing, int folder) {
    if (folder < 0) {
        return is_absent(errno) ? 0 : -1;
    }
    return keep_folder(listing, folder);
}

static int keep_deeper(const struct listing* listing, int folder, const char* name, int is_link) {
    char below[PATH_MAX];
    const int flags = O_RDONLY | O_NONBLOCK;

    if (snprintf(below, sizeof(below), "%s/%s", listing->below, name) >= (int)sizeof(below)) {
        return 0;
    }
    const int holds_more = is_link ? keep_behind_link(listing->home, below) : 1;
    if (holds_more <= 0 || listing->depth == deepest) {
        return holds_more < 0 ? -1 : 0;
    }
    const struct listing deeper = {listing->home, below, listing->depth + 1, listing->is_linked || is_link,
                                   listing->left};
    return keep_within(&deeper, is_link ? velt_open_way(listing->home, below, flags)
                                        : openat(folder, name, flags | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
}

static unsigned char type_of(int folder, const struct dirent* entry) {
    struct stat status;

    if (entry->d_type != DT_UNKNOWN || fstatat(folder, entry->d_name, &status, AT_SYMLINK_NOFOLLOW) < 0) {
        return entry->d_type;
    }
    return (unsigned char)IFTODT(status.st_mode);
}

static int keep_listed(const struct listing* listing, int folder, const struct dirent* entry) {
    const unsigned char type = type_of(folder, entry);

    if (type == DT_LNK && !stays(listing, folder, entry->d_name)) {
        return keep_deeper(listing, folder, entry->d_name, 1);
    }
    return type == DT_DIR ? keep_deeper(listing, folder, entry->d_name, 0) : 0;
}

/* Keeps what stands at one of the home's own names, and looks for links in what programs are known to obey,
 * which may be kept anywhere, such as on another disk. The rest of the dot names is kept for caution, which
 * is not to close folders that have other uses. 0, or -1 with errno. */
static int keep_own(const char* home, int folder, const char* name, int is_obeyed) {
    struct stat status;
    int left = most_entries;
    struct listing listing = {home, name, 1, 0, &left};

    if (fstatat(folder, name, &status, AT_SYMLINK_NOFOLLOW) < 0) {
        return is_absent(errno) ? 0 : -1;
    }
    listing.is_linked = S_ISLNK(status.st_mode);
    if (listing.is_linked && !is_obeyed && !leads_below(folder, name)) {
        return 0;
    }
    int holds_more = S_ISDIR(status.st_mode);
    if (listing.is_linked) {
        holds_more = keep_behind_link(home, name);
    } else if (velt_is_around_home(&status)) {
        holds_more = 0;
    } else if (velt_keep_object(&status, 1) < 0) {
        holds_more = -1;
    }
    return holds_more <= 0 || !is_obeyed
               ? (holds_more < 0 ? -1 : 0)
               : keep_within(&listing, velt_open_way(home, name, O_RDONLY | O_NONBLOCK));
}

/* The name without its star. */
static const char* stem_of(const char* name, char* stem, size_t size) {
    (void)snprintf(stem, size, "%.*s", (int)strcspn(name, "*"), name);
    return stem;
}

static int is_stem(const char* name) {
    for (const char* const* own = velt_own_names; *own != NULL; own++) {
        const size_t length = strcspn(*own, "*");
        if (strncmp(*own, name, length) == 0 && name[length] == '\0') {
            return 1;
        }
    }
    return 0;
}

/* What a session may make there is not looked at, and does not count. 0, or -1 with errno. */
static int keep_entry(const struct listing* listing, int folder, const struct dirent* entry) {
    const char* name = entry->d_name;
    const int is_in_home = listing->depth == 0;

    if (is_folder_itself(name) ||
        (is_in_home && (name[0] != '.' || !velt_is_own_name(name) || is_stem(name)))) {
        return 0;
    }
    if ((*listing->left)-- == 0) {
        (void)snprintf(crowded, sizeof(crowded), "more than %d entries in %s/%.*s", most_entries,
                       listing->home, (int)strcspn(listing->below, "/"), listing->below);
        errno = E2BIG;
        return -1;
    }
    return is_in_home ? keep_own(listing->home, folder, name, velt_is_listed_own_name(name))
                      : keep_listed(listing, folder, entry);
}

/* Closes the folder. */
static int keep_folder(const struct listing* listing, int folder) {
    const struct dirent* entry = NULL;
    int result = 0;

    DIR* list = fdopendir(folder);
    if (list == NULL) {
        leave(folder);
        return -1;
    }
    do {
        errno = 0;
        entry = readdir(list);
        if (entry != NULL) {
            result = keep_entry(listing, folder, entry);
        } else if (errno != 0 && !is_out_of_reach(errno)) {
            result = -1;
        }
    } while (entry != NULL && result == 0);
    int reason = errno;
    (void)closedir(list);
    errno = reason;
    return result;
}

/* By name, whatever else lies there. */
static int keep_known_names(const char* home) {
    char stem[NAME_MAX + 1];
    int result = 0;

    const int folder = velt_open_way(home, "", O_PATH);
    if (folder < 0) {
        return is_absent(errno) ? 0 : -1;
    }
    for (const char* const* name = velt_own_names; result == 0 && *name != NULL; name++) {
        result = keep_own(home, folder, stem_of(*name, stem, sizeof(stem)), 1);
    }
    leave(folder);
    return result;
}

int velt_keep_own_places(const char* home) {
    int left = most_entries;
    const struct listing all = {home, "", 0, 0, &left};

    if (keep_known_names(home) < 0) {
        return -1;
    }
    return keep_within(&all, velt_open_way(home, "", O_RDONLY | O_NONBLOCK));
}

const char* velt_crowded_place(void) {
    return crowded;
}
