/* What a session's view shows: where on the server the folders are that it sees, and which shares they are.
 */
#ifndef VELT_STANDALONE_ACTIVITY_SHOWN_PLACES_H
#define VELT_STANDALONE_ACTIVITY_SHOWN_PLACES_H

#include <limits.h>
#include <stddef.h>

#ifdef __cplusplus
extern "C" {
#endif

struct velt_shown_place {
    char server_path[PATH_MAX]; /* "" when nothing is known of the place */
    const char* share;          /* "" for none */
    const char* share_path;     /* within server_path; "" for the share's own folder */
};

/* Takes the description that the program which makes the view wrote to this file, from its beginning: texts
 * ended by 0, three for each fact,
 *
 *     "view", the path in the view of a folder that it shows, "/" for all of it, and its path on the server
 *     "share", the name of a share in or around these folders, and its path on the server
 *
 * in place of what was known before. What is not of this form is left out, and without a file (-1) nothing is
 * known. */
void velt_note_shown_places(int file);

/* The place that has this path, from the session's root directory on and without links. Where nothing is
 * known, the server's root directory is the session's. */
void velt_find_shown_place(const char* path, struct velt_shown_place* place);

#ifdef __cplusplus
}
#endif

#endif
