/* What a session tells of itself: its page (session_page.h) and its records (spool.h). For one session, which
 * may be several processes that descend from the one which began.
 *
 * Nothing here fails, waits, or touches what the session does otherwise: a page that cannot be made is not
 * seen, and a record that cannot be written is counted as lost. For one thread. */
#ifndef VELT_STANDALONE_ACTIVITY_SESSION_ACTIVITY_H
#define VELT_STANDALONE_ACTIVITY_SESSION_ACTIVITY_H

#include "standalone/activity/session_page.h"

#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* Texts may be NULL. */
struct velt_session {
    enum velt_protocol protocol;
    const char* security;
    const char* user;
    const char* account;
    const char* address;
    const char* configuration;
};

/* Numbers are negative where they do not apply, texts NULL. Paths are from the session's root directory on.
 */
struct velt_record {
    const char* kind;   /* as operation_record.h has them: "upload", "delete", ... */
    const char* result; /* "done", "incomplete", "refused" */
    const char* reason;
    const char* path;
    const char* new_path;
    const char* detail;
    int64_t octets;
    int64_t duration; /* microseconds */
};

/* Opens what is needed below this state root. As root, in the server's root directory; again does nothing. */
void velt_begin_activity(const char* state_root);

/* The descriptors that have to stay open, -1 for those that are not. */
enum {
    velt_activity_files = 3
};
void velt_list_activity_files(int descriptors[velt_activity_files]);

/* `kind` is "password", "configuration", "banned", "limit". */
void velt_login_was_refused(const struct velt_session* session, const char* kind);

/* Somebody is about to log in: makes the page, which nobody sees yet. As root; again does nothing. */
void velt_expect_session(void);

/* Other processes of the session will still tell of it when this one has told of its end. */
void velt_share_session(void);

/* Shows the page and records the login. */
void velt_session_opened(const struct velt_session* session);

/* Records the end of a session that was opened, once, and removes the page. Where this process may not do
 * that, it empties the page of a session that is not shared. Who ended the session, if somebody did, has
 * noted that in the page and counts more than `reason`. */
void velt_session_closed(const char* reason);

/* Begins a command; `path` may be NULL. */
void velt_command_began(const char* command, const char* path);
void velt_command_ended(void);

/* Shows this transfer in the page, in place of another. */
void velt_transfer_began(enum velt_transfer transfer, const char* path);

/* So many octets of it have been moved by now. */
void velt_transfer_moved(uint64_t octets);

/* Records the transfer that the page shows, and shows it no more. */
void velt_transfer_ended(const struct velt_record* record);

/* Records an operation, or a transfer that the page does not show. Of operations that are refused, a session
 * has records of ten at once, and of five a second from then on; how many were left out says its next record.
 */
void velt_record_operation(const struct velt_record* record);

/* Microseconds since 1970. */
int64_t velt_now(void);

#ifdef __cplusplus
}
#endif

#endif
