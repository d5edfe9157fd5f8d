/* The files that say who may see what: the shares with their grants, and the chroot rules. What a session
 * sees was made from them once, at its login. A session that knows an older world could move folders on which
 * the views of later logins depend. */
#ifndef VELT_STANDALONE_LOGIN_ACCESS_FILES_H
#define VELT_STANDALONE_LOGIN_ACCESS_FILES_H

#include <stddef.h>

/* Notes what these files below the state root are now, in place of what was noted before. Called before the
 * view is made, and before the root directory changes. 0, or -1 with errno. */
int velt_note_access_files(const char* state_root);

/* Whether they are others than those that were noted: written, replaced, made or removed since, also with
 * their folder or one on the way to it, or impossible to look at. Works in any root directory and without
 * rights to the files; but this process must be allowed to search the folders on the way to theirs, and, to
 * see that there is still no file, theirs too. Else it says that they are others. */
int velt_access_files_changed(void);

/* The descriptors by which these files and their folder are known, at most `most` of them and never more than
 * three. Returns how many. */
size_t velt_access_descriptors(int* descriptors, size_t most);

#endif
