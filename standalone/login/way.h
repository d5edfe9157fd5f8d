/* Where a path of the server leads, also asked from a session whose root directory is another one. */
#ifndef VELT_STANDALONE_LOGIN_WAY_H
#define VELT_STANDALONE_LOGIN_WAY_H

#include <limits.h>
#include <sys/stat.h>

struct velt_way_end {
    int exists;
    struct stat what;        /* where it exists */
    struct stat folder;      /* else the last folder on the way, */
    char name[NAME_MAX + 1]; /* and the name there at which no folder stands */
};

/* A folder, file or link on the way, found by this name. */
struct velt_way_step {
    const struct stat* folder; /* in which it lies */
    const char* name;
    const struct stat* what;
    int is_end; /* at the last name, of a link's target too */
    int links;  /* that have been followed before */
};

/* Told of each step. 0, or -1 with errno, which ends the walk. */
typedef int (*velt_visit)(const struct velt_way_step* step);

/* Begins all ways from now on at this process's root directory, whatever that becomes. 0, or -1 with errno.
 */
int velt_begin_ways(void);

/* Which descriptor that root directory has; -1 without one. */
int velt_way_descriptor(void);

/* Walks `path` and then `below`, which is "" or a name. `visit` may be NULL. 0 also where nothing stands at
 * the end, or -1 with errno. */
int velt_walk_way(const char* path, const char* below, velt_visit visit, struct velt_way_end* end);

/* Opens the folder at the end of such a way, with O_PATH or for listing with O_RDONLY. A descriptor, or -1
 * with errno. */
int velt_open_way(const char* path, const char* below, int access);

#endif
