/* What a session may do to files, whatever command asks for it. */
#ifndef VELT_STANDALONE_LOGIN_FILE_FUNCTIONS_H
#define VELT_STANDALONE_LOGIN_FILE_FUNCTIONS_H

#include "conf.h"

/* Replaces the daemon's functions that change files. From then on
 * - what own_files.h keeps cannot be changed;
 * - no file is made to run with the rights of its owner or group, and no link is made;
 * - a file is moved to another mount only from where it can be removed;
 * - where the files of access_files.h have changed, the session ends instead of making, moving or removing a
 *   name. It still writes files. */
void velt_replace_file_functions(pr_fs_t* files);

#endif
