/* By which paths a session opened the files that it has open. For one thread. */
#ifndef VELT_STANDALONE_LOGIN_OPENED_PATHS_H
#define VELT_STANDALONE_LOGIN_OPENED_PATHS_H

/* In place of what was noted of this descriptor before. Where there is no memory, nothing is noted. */
void velt_note_opened(int descriptor, const char* path);

/* Nothing need be noted when a file is closed: the next one that gets its descriptor has its own path. NULL
 * when none is known. Good until the next note. */
const char* velt_path_of_opened(int descriptor);

#endif
