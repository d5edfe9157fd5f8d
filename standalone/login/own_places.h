/* What stands at the own names of a home, and what symbolic links there, and within what is known to be
 * obeyed, lead to. */
#ifndef VELT_STANDALONE_LOGIN_OWN_PLACES_H
#define VELT_STANDALONE_LOGIN_OWN_PLACES_H

/* Keeps it (kept_objects.h), of the home at this path, which is there, and around which all is kept already.
 * 0, or -1 with errno: E2BIG when it is too much to look at all of it, see velt_crowded_place. */
int velt_keep_own_places(const char* home);

/* "more than 100000 entries in PATH", of the last E2BIG. */
const char* velt_crowded_place(void);

#endif
