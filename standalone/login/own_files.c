#include "standalone/login/own_files.h"

#include "standalone/login/way.h"

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
    folder_flags = O_PATH | O_DIRECTORY | O_CLOEXEC
};

/* A star stands for the rest of a name. What lies in a folder, or stands behind a link, is found by the name
 * without its star only. */
static const char* const own_names[] = {
    /* who may log in */
    ".ssh",
    ".lsh",
    ".rhosts",
    ".shosts",
    ".klogin",
    ".k5login",
    ".k5users",
    ".eid",
    ".monkeysphere",
    ".google_authenticator",
    ".yubico",
    ".otpw",
    ".pamusb",
    /* what logins and their services start or mount */
    ".pam_environment",
    ".pam_mount.conf.xml",
    ".ecryptfs",
    ".config",
    ".local",
    ".byobu",
    ".gnupg",
    ".keychain",
    ".pulse",
    ".asoundrc",
    /* what mail starts */
    ".forward*",
    ".procmail",
    ".procmailrc",
    ".mailfilter*",
    ".mailfilters",
    ".maildelivery",
    ".mailrc",
    ".msmtprc",
    ".qmail*",
    ".courier*",
    ".dovecot*",
    ".dovecot.sieve",
    /* what shells read; zsh prefers a compiled file beside one that it sources */
    ".profile",
    ".profile.zwc",
    ".shrc",
    ".bashrc*",
    ".bash_profile*",
    ".bash_login*",
    ".bash_logout*",
    ".bash_aliases*",
    ".bash_completion*",
    ".login",
    ".logout",
    ".cshrc",
    ".cshdirs",
    ".tcshrc",
    ".kshrc*",
    ".mkshrc*",
    ".zshrc*",
    ".zshenv*",
    ".zprofile*",
    ".zlogin*",
    ".zlogout*",
    ".zcompdump*",
    ".yashrc",
    ".yash_profile",
    ".rcrc",
    ".esrc",
    ".aliasrc",
    ".xonshrc",
    ".inputrc",
    ".lessfilter",
    /* where shells look for programs first */
    "bin",
    /* what gives or extends a login that serves repositories alone */
    "git-shell-commands",
    ".gitconfig",
    ".gitolite*",
    ".hgrc",
    ".bazaar",
    /* what desktops start */
    ".vnc",
    ".xpra",
    "startwm.sh",
    ".xprofile",
    ".xsession",
    ".xsessionrc",
    ".xinitrc",
    ".xserverrc",
    ".xinputrc",
    ".xbindkeysrc*",
    ".gnomerc",
    NULL,
};

static const char* const root_names[] = {"etc", "lib", NULL};

struct identity {
    dev_t device;
    ino_t number;
};

/* What stands at a kept place, or on the way to one. */
struct kept {
    struct identity object;
    int whole; /* else its name alone is kept, since other places depend on it */
};

struct home {
    char path[PATH_MAX];
    struct velt_way_end end; /* when its files were last kept */
    int is_known;            /* else they could not be */
};

static struct home homes[most_homes];
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

static int keep_name(const struct stat* object, int is_end) {
    (void)is_end;
    return keep(object, 0);
}

static void forget_kept(void) {
    free(kept);
    kept = NULL;
    kept_count = 0;
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
    char stem[NAME_MAX + 1];
    struct velt_way_end end;

    if (velt_walk_way(home->path, "", keep_name, &home->end) < 0) {
        return -1;
    }
    for (const char* const* name = own_names; home->end.exists && *name != NULL; name++) {
        /* What cannot be reached is recognised by its name alone. Any other failure
         * may be over in a moment, and what it hid could be changed then. */
        if (velt_walk_way(home->path, stem_of(*name, stem, sizeof(stem)), keep, &end) < 0 &&
            !is_out_of_reach(errno)) {
            return -1;
        }
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
    forget_kept();
    home_count = 0;
}

static int is_same_end(const struct velt_way_end* one, const struct velt_way_end* other) {
    if (one->exists || other->exists) {
        return one->exists && other->exists && is(identity_of(&one->what), &other->what);
    }
    return is(identity_of(&one->folder), &other->folder) && strcmp(one->name, other->name) == 0;
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
    forget_kept();
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
        const struct velt_way_end* end = &homes[i].end;
        if (!end->exists && name != NULL && is(identity_of(&end->folder), here) &&
            strcasecmp(end->name, name) == 0) {
            return 1;
        }
        if (end->exists && is(identity_of(&end->what), here)) {
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
