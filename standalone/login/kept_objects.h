/* The files, folders and links that a session may not change, by what they are and not by their names. */
#ifndef VELT_STANDALONE_LOGIN_KEPT_OBJECTS_H
#define VELT_STANDALONE_LOGIN_KEPT_OBJECTS_H

#include "standalone/login/way.h"

#include <sys/stat.h>

int velt_is_same_object(const struct stat* one, const struct stat* other);

/* Keeps the object: with `whole` also what it contains, else its name alone, since other places depend on it.
 * 0, or -1 with errno. */
int velt_keep_object(const struct stat* object, int whole);

/* Keeps the name of the home, or of a folder on the way to it. */
int velt_keep_way_to_home(const struct stat* object, int is_end);

/* Keeps the name at which such a way ended, and nothing stands. */
int velt_keep_absent(const struct velt_way_end* end);

/* The names of objects, and names at which nothing stands, that other logins depend on. They stay kept when
 * those above are forgotten. 0, or -1 with errno. */
int velt_keep_told_object(const struct stat* object);
int velt_keep_told_absent(const struct velt_way_end* end);

void velt_forget_kept(void);
void velt_forget_told(void);

/* Whether the object is kept, or as a whole. */
int velt_is_kept(const struct stat* object, int whole_only);

int velt_is_around_home(const struct stat* object);

/* Whether a name at which nothing stood is kept in this folder, in any case. */
int velt_is_kept_absent(const struct stat* folder, const char* name);

#endif
