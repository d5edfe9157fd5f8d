#include "standalone/login/own_files.h"

#include <errno.h>
#include <fcntl.h>
#include <limits.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <strings.h>
#include <sys/stat.h>
#include <unistd.h>

enum {
    most_homes = 2,
    most_links = 40,
    folder_flags = O_PATH | O_DIRECTORY | O_CLOEXEC
};

/* A star stands for the rest of a name. */
static const char* const own_names[] = {
    /* who may log in */
    ".ssh",
    ".rhosts",
    ".shosts",
    ".k5login",
    ".k5users",
    ".google_authenticator",
    ".yubico",
    /* what mail starts */
    ".forward*",
    ".procmailrc",
    ".mailfilter",
    ".qmail*",
    ".courier*",
    ".dovecot.sieve",
    /* what sessions and their services start */
    ".config",
    ".local",
    ".pam_environment",
    ".profile",
    ".login",
    ".logout",
    ".shrc",
    ".bashrc",
    ".bash_profile",
    ".bash_login",
    ".bash_logout",
    ".bash_aliases",
    ".cshrc",
    ".tcshrc",
    ".kshrc",
    ".mkshrc",
    ".zshrc",
    ".zshenv",
    ".zprofile",
    ".zlogin",
    ".zlogout",
    ".yashrc",
    ".yash_profile",
    ".lessfilter",
    ".vnc",
    ".inputrc",
    ".xprofile",
    ".xsession",
    ".xsessionrc",
    ".xinitrc",
    ".xserverrc",
    ".xinputrc",
    ".gnomerc",
    NULL,
};

static const char* const root_names[] = {"etc", "lib", NULL};

struct identity {
    dev_t device;
    ino_t number;
};

/* What stood at a kept place, or on the way to one, at the login. */
struct kept {
    struct identity object;
    int whole; /* else its name alone is kept, since other places depend on it */
};

static struct identity homes[most_homes];
static size_t home_count;
static struct kept* kept;
static size_t kept_count;
static int root_is_kept;

static struct identity identity_of(const struct stat* status) {
    struct identity found = {status->st_dev, status->st_ino};
    return found;
}

static int is(struct identity one, const struct stat* other) {
    return one.device == other->st_dev && one.number == other->st_ino;
}

static int keep(const struct stat* object, int whole) {
    struct kept* larger = realloc(kept, (kept_count + 1) * sizeof(*kept));
    if (larger == NULL) {
        return -1;
    }
    kept = larger;
    kept[kept_count].object = identity_of(object);
    kept[kept_count].whole = whole;
    kept_count++;
    return 0;
}

static int is_kept(const struct stat* object, int whole_only) {
    for (size_t i = 0; i < kept_count; i++) {
        if (is(kept[i].object, object) && (kept[i].whole || !whole_only)) {
            return 1;
        }
    }
    return 0;
}

/* Closes a folder that is only looked at, and leaves errno alone. */
static void leave(int folder) {
    int reason = errno;
    (void)close(folder);
    errno = reason;
}

static int exchange(int* folder, int next) {
    leave(*folder);
    *folder = next;
    return next < 0 ? -1 : 0;
}

/* A way to be walked: folder by folder, with what is left of the path. */
struct way {
    int folder;
    int links;
    char rest[PATH_MAX];
};

static int follow(struct way* way, const char* name, const char* rest) {
    char target[PATH_MAX];
    char joined[PATH_MAX];

    ssize_t length = readlinkat(way->folder, name, target, sizeof(target) - 1);
    if (length < 0) {
        return -1;
    }
    target[length] = '\0';
    int size = snprintf(joined, sizeof(joined), "%s/%s", target, rest);
    if (size >= (int)sizeof(joined) || ++way->links > most_links) {
        errno = ELOOP;
        return -1;
    }
    memcpy(way->rest, joined, (size_t)size + 1);
    return target[0] == '/' ? exchange(&way->folder, open("/", folder_flags)) : 0;
}

/* Keeps what stands at the first name of the way, and goes on there. `end` becomes what stands at the end of
 * the way. 1 while there is more of it, else 0, or -1 with errno. */
static int walk_step(struct way* way, int whole, struct stat* end) {
    char name[NAME_MAX + 1];

    const char* start = way->rest + strspn(way->rest, "/");
    size_t length = strcspn(start, "/");
    if (length == 0) {
        return 0;
    }
    if (length > NAME_MAX) {
        errno = ENAMETOOLONG;
        return -1;
    }
    (void)snprintf(name, sizeof(name), "%.*s", (int)length, start);
    const char* rest = start + length + strspn(start + length, "/");
    if (fstatat(way->folder, name, end, AT_SYMLINK_NOFOLLOW) < 0 || keep(end, whole && *rest == '\0') < 0) {
        return -1;
    }
    if (S_ISLNK(end->st_mode)) {
        return follow(way, name, rest) < 0 ? -1 : 1;
    }
    if (*rest == '\0') {
        return 0;
    }
    memmove(way->rest, rest, strlen(rest) + 1);
    return exchange(&way->folder, openat(way->folder, name, folder_flags)) < 0 ? -1 : 1;
}

/* Keeps the folders and links on the way to folder/name, and what stands at its end. 1 when something does,
 * 0 when nothing does, -1 with errno. */
static int keep_way(const char* folder, const char* name, int whole, struct stat* end) {
    struct way way = {-1, 0, ""};
    int more = 1;

    if (snprintf(way.rest, sizeof(way.rest), "%s/%s", folder, name) >= (int)sizeof(way.rest)) {
        errno = ENAMETOOLONG;
        return -1;
    }
    way.folder = open("/", folder_flags);
    if (way.folder < 0 || fstat(way.folder, end) < 0) {
        more = -1;
    }
    while (more > 0) {
        more = walk_step(&way, whole, end);
    }
    if (way.folder >= 0) {
        leave(way.folder);
    }
    return more == 0 ? 1 : errno == ENOENT || errno == ENOTDIR ? 0 : -1;
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

int velt_keep_home(const char* home) {
    char stem[NAME_MAX + 1];
    struct stat status;

    int exists = keep_way(home, "", 0, &status);
    if (exists <= 0) {
        return exists;
    }
    if (home_count == most_homes) {
        errno = ENOSPC;
        return -1;
    }
    homes[home_count++] = identity_of(&status);
    for (const char* const* name = own_names; *name != NULL; name++) {
        /* What cannot be reached with root's rights either is recognised by its name alone. Any other failure
         * may be over in a moment, and what it hid could be changed then. */
        if (keep_way(home, stem_of(*name, stem, sizeof(stem)), 1, &status) < 0 && !is_out_of_reach(errno)) {
            return -1;
        }
    }
    return 0;
}

void velt_forget_homes(void) {
    free(kept);
    kept = NULL;
    kept_count = 0;
    home_count = 0;
}

void velt_keep_root(void) {
    root_is_kept = 1;
}

/* In any case: some file systems know no difference. */
static int is_named(const char* const* names, const char* name) {
    for (; *names != NULL; names++) {
        size_t length = strcspn(*names, "*");
        if (strncasecmp(*names, name, length) == 0 && ((*names)[length] == '*' || name[length] == '\0')) {
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
            if (is(identity_of(child), &status)) {
                return 1;
            }
        } else if (errno != ENOENT && errno != ENOTDIR && !is_out_of_reach(errno)) {
            return -1;
        }
    }
    return 0;
}

/* One folder on the way up from a place: `name` is the place's name when this is its own folder, else NULL,
 * and `child` is the folder from which the way came. 1, 0 or -1 as below. */
static int keeps(int folder, const struct stat* here, int at_root, const char* name,
                 const struct stat* child) {
    const char* const* tables[most_homes + 1];
    size_t count = 0;

    for (size_t i = 0; i < home_count; i++) {
        if (is(homes[i], here)) {
            tables[count++] = own_names;
        }
    }
    if (root_is_kept && at_root) {
        tables[count++] = root_names;
    }
    for (size_t i = 0; i < count; i++) {
        int stands = name != NULL ? is_named(tables[i], name) : stands_at(tables[i], folder, child);
        if (stands != 0) {
            return stands;
        }
    }
    return is_kept(here, 1);
}

/* 1 when the place may not be changed, 0 when it may, -1 with errno. Closes the folder. */
static int is_within_kept(int folder, const char* name) {
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
        int at_root = result == 0 && is(identity_of(&here), &above);
        if (result == 0) {
            result = keeps(folder, &here, at_root, name, &child);
        }
        (void)exchange(&folder, up);
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
    int refused = exists && is_kept(&status, change == velt_changes_content);
    if (!refused) {
        int copy = fcntl(folder, F_DUPFD_CLOEXEC, 0);
        refused = copy < 0 ? -1 : is_within_kept(copy, name);
    }
    if (refused > 0) {
        errno = EACCES;
    }
    return refused == 0 ? 0 : -1;
}
