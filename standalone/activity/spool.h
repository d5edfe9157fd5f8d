/* Where sessions write down what they did: a file below the state root that somebody else takes over from,
 * now or later. Each record is one line (record_line.h), written at once. */
#ifndef VELT_STANDALONE_ACTIVITY_SPOOL_H
#define VELT_STANDALONE_ACTIVITY_SPOOL_H

#include <stddef.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* Below the state root. Who takes over gives a file that has grown another name beside it, and removes it
 * when nobody has it locked any more. */
#define VELT_SPOOL_FOLDER "/var/lib/velt/transfers"
#define VELT_SPOOL_NAME "spool"

/* Opens the spool below this state root, makes it where it is missing, and keeps it locked (flock, shared)
 * for as long as the descriptor is open. The descriptor, or -1 with errno. */
int velt_open_spool(const char* state_root);

/* 0, or -1 with errno when the line was not written, or not wholly. Neither waits for anybody nor raises a
 * signal, whatever limits this process has. */
int velt_write_spool(int spool, const char* line, size_t length);

/* Below the state root: settings that administrators edit. */
#define VELT_ACTIVITY_SETTINGS "/etc/velt/transfers.conf"

/* Whether anything is to be written: unless that file has a line "record = 0". */
int velt_may_record(const char* state_root);

/* What could not be written, of all sessions since the machine began: a page of the file VELT_LOST_FILE. */
struct velt_lost_records {
    uint64_t count;
    int64_t last; /* when that was, microseconds since 1970 */
};

/* The count below this state root; NULL when there can be none. It stays for as long as the process lives. */
struct velt_lost_records* velt_open_lost(const char* state_root);

/* Counts one; `lost` may be NULL. */
void velt_count_lost(struct velt_lost_records* lost, int64_t now);

/* Makes the folder of the pages. A descriptor of it, or -1 with errno. */
int velt_open_sessions_folder(const char* state_root);

#ifdef __cplusplus
}
#endif

#endif
