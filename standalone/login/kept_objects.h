/* The files, folders and links that a session may not change: by what they are, and by the folders and names
 * in which they were found, since something else may stand there by now. */
#ifndef VELT_STANDALONE_LOGIN_KEPT_OBJECTS_H
#define VELT_STANDALONE_LOGIN_KEPT_OBJECTS_H

#include "standalone/login/way.h"

#include <sys/stat.h>

int velt_is_same_object(const struct stat* one, const struct stat* other);

/* Keeps the object: with `whole` also what it contains, else its name alone, since other places depend on it.
 * 0, or -1 with errno. */
int velt_keep_object(const struct stat* object, int whole);

/* Keeps the name of the home, or of a folder on the way to it. */
int velt_keep_way_to_home(const struct velt_way_step* step);

/* Keeps this name in the folder, in any case, and what comes to stand there in place of `object`, as a whole;
 * with `whole` the object, too. Without an object (NULL) nothing stands there yet. */
int velt_keep_name(const struct stat* folder, const char* name, const struct stat* object, int whole);

/* Keeps the name of the object, on which other logins depend, and its place as above; of what comes to stand
 * there the names alone. Stays kept when those above are forgotten. 0, or -1 with errno. */
int velt_keep_told_name(const struct stat* folder, const char* name, const struct stat* object);

void velt_forget_kept(void);
void velt_forget_told(void);

/* Whether the object is kept, or as a whole. */
int velt_is_kept(const struct stat* object, int whole_only);

int velt_is_around_home(const struct stat* object);

/* Whether what has this name in the folder is kept, or as a whole; `exists` tells whether anything has it. */
int velt_is_kept_name(const struct stat* folder, const char* name, int exists, int whole_only);

/* Whether what the child contains is kept, or as a whole, since the child stands at a name of this open
 * folder that is kept. 1, 0, or -1 with errno. */
int velt_is_kept_below(int folder, const struct stat* here, const struct stat* child, int whole_only);

#endif
