/* What an SFTP session tells of itself: session_activity.h for the functions by which the daemon works with
 * files. Paths are the session's own. For one thread of each process. */
#ifndef VELT_STANDALONE_LOGIN_SFTP_RECORDS_H
#define VELT_STANDALONE_LOGIN_SFTP_RECORDS_H

#include "standalone/login/file_operations.h"

#include <sys/types.h>

/* A login whose view is about to be made: as root, in the server's root directory. `configuration` may be
 * NULL.
 */
void velt_expect_sftp_login(const char* state_root, const char* user, const char* configuration);

/* How it ended: before and after the change of the root directory. */
void velt_note_refused_sftp_login(void);
void velt_note_sftp_login(void);

/* An operation has been done, or has failed with this errno. Leaves errno alone. */
void velt_note_file_operation(const struct velt_operation* operation, int result, int reason);

/* A file that was opened by an operation: octets have been read or written (what the function returned), by
 * the latter the client sends them; it is about to be closed. Other descriptors are passed over. Leaves errno
 * alone. */
void velt_note_octets(int descriptor, ssize_t octets, int are_sent);
void velt_note_close(int descriptor);

/* This process is about to end. */
void velt_note_end_of_process(void);

#endif
