/* The files of the pages, in their folder. */
#ifndef VELT_STANDALONE_ACTIVITY_PAGE_FILE_H
#define VELT_STANDALONE_ACTIVITY_PAGE_FILE_H

#include "standalone/activity/session_page.h"

/* Makes the page of this name in the folder, all zero and with its lock, and maps it. `file` gets the
 * descriptor, or -1. NULL when it cannot be made. */
struct velt_session_page* velt_make_page(int folder, const char* name, int* file);

/* Sessions that may not remove their page leave it behind, closed. Removes some of these: called with each
 * login, it keeps them few also while nobody reads the pages. */
void velt_remove_ended_pages(int folder);

#endif
