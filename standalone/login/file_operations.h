/* What a session does with files, over either protocol: all of it comes through here. */
#ifndef VELT_STANDALONE_LOGIN_FILE_OPERATIONS_H
#define VELT_STANDALONE_LOGIN_FILE_OPERATIONS_H

#include <sys/types.h>
#include <time.h>

enum velt_operation_kind {
    velt_opens_file,
    velt_cuts_file,
    velt_makes_folder,
    velt_removes_file,
    velt_removes_folder,
    velt_moves,
    velt_sets_mode,
    velt_sets_owner,
    velt_sets_times,
    velt_makes_link,
    velt_makes_symbolic_link,
    velt_operation_kinds
};

/* As the arguments of the system calls. */
struct velt_operation {
    enum velt_operation_kind kind;
    const char* path;             /* of an open file: by which it was opened, or NULL */
    const char* other;            /* the next name of what is moved or linked, or a symbolic link's target */
    int descriptor;               /* of an open file whose mode, owner or times are set; else -1 */
    int flags;                    /* for opening */
    mode_t mode;                  /* to be set, or of what is made */
    uid_t user;                   /* to be set */
    gid_t group;                  /* to be set */
    off_t length;                 /* to which a file is cut */
    const struct timespec* times; /* two, or NULL for now */
    int is_of_link;               /* mode, owner and times are the symbolic link's own, not its target's */
};

/* Does it, or fails with errno, as the system call would.
 * - What own_files.h keeps cannot be changed, EACCES; nor where the view is read-only, for the same reason as
 *   seen by the client.
 * - No file is made to run with the rights of its owner or group, EPERM.
 * - Where the files of access_files.h have changed, the session ends instead of making, moving or removing a
 *   name other than by opening a file.
 * - What cannot be moved since it would be to another mount, EXDEV, could be removed where it is. */
int velt_do(const struct velt_operation* operation);

/* What ends a session that is older than the files of access_files.h. It may return: the operation fails
 * then. To be told before the login. */
void velt_end_old_sessions_by(void (*end)(void));

#endif
