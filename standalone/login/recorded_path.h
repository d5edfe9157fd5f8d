/* How a path is written down: so that the same file always has the same one. */
#ifndef VELT_STANDALONE_LOGIN_RECORDED_PATH_H
#define VELT_STANDALONE_LOGIN_RECORDED_PATH_H

#include <limits.h>

/* The path from this process's root directory, without links on the way; with `follow`, one at its end stands
 * for its target. What does not exist, or cannot be looked at, stays as it was given. */
void velt_resolve_path(const char* path, int follow, char resolved[PATH_MAX]);

#endif
