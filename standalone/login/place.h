/* Where a session changes something. */
#ifndef VELT_STANDALONE_LOGIN_PLACE_H
#define VELT_STANDALONE_LOGIN_PLACE_H

#include "standalone/login/own_files.h"

#include <limits.h>

/* The change is made in the folder that was looked at, whatever its path means by now. */
struct velt_place {
    int folder;
    const char* name; /* within the folder */
    char path[PATH_MAX];
};

/* Opens the place for this change. 0, or -1 with errno: EACCES where own_files.h forbids the change, of the
 * homes as they are now. */
int velt_open_place(struct velt_place* place, const char* path, enum velt_change change);

/* Leaves errno alone. */
void velt_close_place(struct velt_place* place);

#endif
