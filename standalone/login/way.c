#include "standalone/login/way.h"

#include <errno.h>
#include <fcntl.h>
#include <linux/openat2.h>
#include <stdio.h>
#include <string.h>
#include <sys/syscall.h>
#include <unistd.h>

enum {
    most_links = 40,
    folder_flags = O_PATH | O_DIRECTORY | O_CLOEXEC
};

/* Walked folder by folder, with what is left of the path. */
struct way {
    int folder;
    int links;
    char rest[PATH_MAX];
};

static int first_folder = -1;

/* Closes a folder that is only looked at, and leaves errno alone. */
static void leave(int folder) {
    int reason = errno;
    (void)close(folder);
    errno = reason;
}

int velt_begin_ways(void) {
    if (first_folder >= 0) {
        (void)close(first_folder);
    }
    first_folder = open("/", folder_flags);
    return first_folder < 0 ? -1 : 0;
}

int velt_way_descriptor(void) {
    return first_folder;
}

static int enter(struct way* way, int from, const char* name) {
    int next = openat(from, name, folder_flags);
    if (next < 0) {
        return -1;
    }
    leave(way->folder);
    way->folder = next;
    return 0;
}

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
    return target[0] == '/' ? enter(way, first_folder, ".") : 0;
}

/* The way may lead no further than to this name. */
static int stop(const struct way* way, const char* name, struct velt_way_end* end) {
    if (errno != ENOENT && errno != ENOTDIR) {
        return -1;
    }
    end->exists = 0;
    (void)snprintf(end->name, sizeof(end->name), "%s", name);
    return fstat(way->folder, &end->folder);
}

static int finish(const struct way* way, struct velt_way_end* end) {
    end->exists = 1;
    return fstat(way->folder, &end->what);
}

static int show(const struct way* way, velt_visit visit, const char* name, const struct stat* what,
                int is_end) {
    struct stat folder;
    const struct velt_way_step step = {&folder, name, what, is_end, way->links};

    return fstat(way->folder, &folder) < 0 ? -1 : visit(&step);
}

/* Goes on to the first name of what is left. 1 while there is more, else 0, or -1 with errno. */
static int step(struct way* way, velt_visit visit, struct velt_way_end* end) {
    char name[NAME_MAX + 1];
    const char* start = way->rest + strspn(way->rest, "/");
    size_t length = strcspn(start, "/");

    if (length == 0) {
        return finish(way, end);
    }
    if (length > NAME_MAX) {
        errno = ENAMETOOLONG;
        return -1;
    }
    (void)snprintf(name, sizeof(name), "%.*s", (int)length, start);
    const char* rest = start + length + strspn(start + length, "/");
    if (fstatat(way->folder, name, &end->what, AT_SYMLINK_NOFOLLOW) < 0) {
        return stop(way, name, end);
    }
    if (visit != NULL && show(way, visit, name, &end->what, *rest == '\0') < 0) {
        return -1;
    }
    if (S_ISLNK(end->what.st_mode)) {
        return follow(way, name, rest) < 0 ? -1 : 1;
    }
    if (*rest == '\0') {
        end->exists = 1;
        return 0;
    }
    memmove(way->rest, rest, strlen(rest) + 1);
    return enter(way, way->folder, name) < 0 ? stop(way, name, end) : 1;
}

int velt_walk_way(const char* path, const char* below, velt_visit visit, struct velt_way_end* end) {
    struct way way = {-1, 0, ""};
    int more = 1;

    if (snprintf(way.rest, sizeof(way.rest), "%s/%s", path, below) >= (int)sizeof(way.rest)) {
        errno = ENAMETOOLONG;
        return -1;
    }
    way.folder = openat(first_folder, ".", folder_flags);
    if (way.folder < 0) {
        return -1;
    }
    while (more > 0) {
        more = step(&way, visit, end);
    }
    leave(way.folder);
    return more;
}

int velt_open_way(const char* path, const char* below, int access) {
    char whole[PATH_MAX];
    struct open_how how;

    if (snprintf(whole, sizeof(whole), "%s/%s", path, below) >= (int)sizeof(whole)) {
        errno = ENAMETOOLONG;
        return -1;
    }
    memset(&how, 0, sizeof(how));
    how.flags = (unsigned long long)(access | O_DIRECTORY | O_CLOEXEC);
    how.resolve = RESOLVE_IN_ROOT | RESOLVE_NO_MAGICLINKS;
    /* The kernel gives up (EAGAIN) when folders are moved while it resolves the path. */
    for (int attempt = 0; attempt < 100; attempt++) {
        int folder = (int)syscall(SYS_openat2, first_folder, whole, &how, sizeof(how));
        if (folder >= 0 || errno != EAGAIN) {
            return folder;
        }
    }
    return -1;
}
