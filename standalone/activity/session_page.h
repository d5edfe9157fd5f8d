/* The page of a session: a small file in memory in which the session keeps up to date what it does, for all
 * who ask. It costs nothing while nothing happens.
 *
 * The file is named after the session, see velt_name_session. The session holds a lock (flock) on it through
 * its mapping, so the lock goes with its last process, whatever ends that; a page without a lock belongs to
 * nobody any more, and so does an empty one. While it is there, nobody but its session changes its size.
 *
 * Texts end with 0 where they are shorter than their field, and may hold any octets: who reads the page
 * trusts nothing in it. */
#ifndef VELT_STANDALONE_ACTIVITY_SESSION_PAGE_H
#define VELT_STANDALONE_ACTIVITY_SESSION_PAGE_H

#include <stddef.h>
#include <stdint.h>
#include <sys/types.h>

#ifdef __cplusplus
extern "C" {
#endif

/* Below the state root. */
#define VELT_SESSIONS_FOLDER "/run/velt/sessions"
/* Beside the pages: how many records were lost, see spool.h. */
#define VELT_LOST_FILE "/run/velt/sessions/lost"

enum {
    velt_page_size = 4096,
    velt_page_form = 1, /* of struct velt_session_page */
    velt_session_name_size = 48,
    velt_closing_record = 0x7fffffff /* the number of a session's last record */
};

enum velt_protocol {
    velt_ftp,
    velt_ftps,
    velt_sftp
};

enum velt_transfer {
    velt_no_transfer,
    velt_upload,
    velt_download
};

/* Times are microseconds since 1970. */
struct velt_session_page {
    uint32_t form;
    uint32_t changes; /* odd while the session writes, and another number afterwards */
    uint32_t protocol;
    uint32_t busy;
    uint32_t next_record;     /* the number of the next record */
    uint32_t transfer_record; /* the number that the record of the running transfer will have */
    uint32_t transfer;        /* enum velt_transfer */
    uint32_t closed;          /* the closing record has been written */
    int64_t since;
    int64_t active;
    int64_t transfer_since;
    uint64_t transfer_octets;
    uint64_t octets_in;  /* without the running transfer */
    uint64_t octets_out; /* the same */
    uint64_t rate;
    char security[96];
    char user[256];
    char account[64];
    char address[64];
    char configuration[80]; /* the hash of the settings that it runs with */
    char command[40];
    char path[512];
    char transfer_path[1024];
    char transfer_server[1024]; /* the path on the server, */
    char transfer_share[256];   /* the share, */
    uint32_t transfer_within;   /* and where in the path on the server the one within the share begins */
    uint32_t unused;
    /* Written by who ends the session, before it does. */
    char ended_by[128];
    char end_reason[256];
    int64_t refused_until; /* of the rate at which refused operations are recorded: when it has rested */
    uint32_t left_out;     /* refused operations that no record has told of yet */
    uint32_t unused_too;
    char reserved[184];
};

/* "1z4-8rd2k-0f3a9c21": this process, the time of its start and the boot, so that no other session ever has
 * the same. 0, or -1 with errno. */
int velt_name_session(char name[velt_session_name_size]);

#ifdef __cplusplus
}
#endif

#endif
