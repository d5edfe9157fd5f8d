#include "standalone/login/file_functions.h"

#include "standalone/login/file_operations.h"

static void end_session(void) {
    pr_log_pri(PR_LOG_NOTICE, "session of '%s' ended: the shares or rules have changed since its login",
               session.user);
    pr_response_send(R_421, "The shares or rules have changed: log in again.");
    pr_session_end(0);
}

static struct velt_operation operation_on(enum velt_operation_kind kind, const char* path) {
    struct velt_operation operation;

    memset(&operation, 0, sizeof(operation));
    operation.kind = kind;
    operation.path = path;
    operation.descriptor = -1;
    return operation;
}

static int open_file(pr_fh_t* file, const char* path, int flags) {
    struct velt_operation operation = operation_on(velt_opens_file, path);

    (void)file;
    operation.flags = flags;
    operation.mode = PR_OPEN_MODE;
    return velt_do(&operation);
}

static int cut_file(pr_fs_t* fs, const char* path, off_t length) {
    struct velt_operation operation = operation_on(velt_cuts_file, path);

    (void)fs;
    operation.length = length;
    return velt_do(&operation);
}

static int make_folder(pr_fs_t* fs, const char* path, mode_t mode) {
    struct velt_operation operation = operation_on(velt_makes_folder, path);

    (void)fs;
    operation.mode = mode;
    return velt_do(&operation);
}

static int remove_file(pr_fs_t* fs, const char* path) {
    struct velt_operation operation = operation_on(velt_removes_file, path);

    (void)fs;
    return velt_do(&operation);
}

static int remove_folder(pr_fs_t* fs, const char* path) {
    struct velt_operation operation = operation_on(velt_removes_folder, path);

    (void)fs;
    return velt_do(&operation);
}

static int move_file(pr_fs_t* fs, const char* from, const char* to) {
    struct velt_operation operation = operation_on(velt_moves, from);

    (void)fs;
    operation.other = to;
    return velt_do(&operation);
}

static int change_mode(pr_fs_t* fs, const char* path, mode_t mode) {
    struct velt_operation operation = operation_on(velt_sets_mode, path);

    (void)fs;
    operation.mode = mode;
    return velt_do(&operation);
}

static int change_mode_of_open_file(pr_fh_t* file, int descriptor, mode_t mode) {
    struct velt_operation operation = operation_on(velt_sets_mode, file->fh_path);

    operation.descriptor = descriptor;
    operation.mode = mode;
    return velt_do(&operation);
}

static int change_owner(pr_fs_t* fs, const char* path, uid_t user, gid_t group) {
    struct velt_operation operation = operation_on(velt_sets_owner, path);

    (void)fs;
    operation.user = user;
    operation.group = group;
    return velt_do(&operation);
}

static int change_times(pr_fs_t* fs, const char* path, struct timeval* times) {
    struct velt_operation operation = operation_on(velt_sets_times, path);
    struct timespec both[2];

    (void)fs;
    for (int i = 0; i < 2; i++) {
        both[i].tv_sec = times[i].tv_sec;
        both[i].tv_nsec = times[i].tv_usec * 1000;
    }
    operation.times = both;
    return velt_do(&operation);
}

static int make_no_link(pr_fs_t* fs, const char* target, const char* path) {
    (void)fs;
    (void)target;
    (void)path;
    errno = EPERM;
    return -1;
}

void velt_replace_file_functions(pr_fs_t* files) {
    velt_end_old_sessions_by(end_session);
    files->open = open_file;
    files->truncate = cut_file;
    files->mkdir = make_folder;
    files->unlink = remove_file;
    files->rmdir = remove_folder;
    files->rename = move_file;
    files->chmod = change_mode;
    files->fchmod = change_mode_of_open_file;
    files->chown = change_owner;
    files->lchown = change_owner;
    files->utimes = change_times;
    files->link = make_no_link;
    files->symlink = make_no_link;
}
