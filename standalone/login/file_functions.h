/* What an FTP session may do to files, whatever command asks for it. */
#ifndef VELT_STANDALONE_LOGIN_FILE_FUNCTIONS_H
#define VELT_STANDALONE_LOGIN_FILE_FUNCTIONS_H

#include "conf.h"

/* Replaces the daemon's functions that change files: from then on they go by file_operations.h, and no link
 * is made. */
void velt_replace_file_functions(pr_fs_t* files);

#endif
