#include "standalone/activity/spool.h"

#include "standalone/activity/session_page.h"

#include <errno.h>
#include <fcntl.h>
#include <limits.h>
#include <signal.h>
#include <stdio.h>
#include <string.h>
#include <sys/file.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <time.h>
#include <unistd.h>

enum {
    most_tries = 10,
    longest_settings = 4096,
    passable_folder = 0755,
    private_folder = 0700,
    private_file = 0600
};

/* "/" as the state root is none at all. */
static int join(char path[PATH_MAX], const char* state_root, const char* below) {
    const char* root = strcmp(state_root, "/") == 0 ? "" : state_root;

    if (snprintf(path, PATH_MAX, "%s%s", root, below) >= PATH_MAX) {
        errno = ENAMETOOLONG;
        return -1;
    }
    return 0;
}

/* Makes what is missing of the path. */
static int open_folder_below(const char* state_root, const char* below) {
    char path[PATH_MAX];

    if (join(path, state_root, below) < 0) {
        return -1;
    }
    for (char* end = strchr(path + 1, '/'); end != NULL; end = strchr(end + 1, '/')) {
        *end = '\0';
        (void)mkdir(path, passable_folder);
        *end = '/';
    }
    (void)mkdir(path, private_folder);
    return open(path, O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC);
}

int velt_open_sessions_folder(const char* state_root) {
    return open_folder_below(state_root, VELT_SESSIONS_FOLDER);
}

/* One that was taken away between its opening and the lock is nobody's any more. */
static int open_locked(int folder) {
    for (int i = 0; i < most_tries; i++) {
        struct stat status;
        int file = openat(folder, VELT_SPOOL_NAME,
                          O_WRONLY | O_CREAT | O_APPEND | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC, private_file);
        if (file < 0) {
            return -1;
        }
        if (flock(file, LOCK_SH | LOCK_NB) == 0 && fstat(file, &status) == 0 && status.st_nlink > 0) {
            return file;
        }
        (void)close(file);
    }
    errno = EBUSY;
    return -1;
}

int velt_open_spool(const char* state_root) {
    int folder = open_folder_below(state_root, VELT_SPOOL_FOLDER);
    if (folder < 0) {
        return -1;
    }
    int spool = open_locked(folder);
    int reason = errno;
    (void)close(folder);
    errno = reason;
    return spool;
}

/* A limit of the size of files ends a process by a signal, which is for this write alone taken away. */
int velt_write_spool(int spool, const char* line, size_t length) {
    const struct timespec now = {0, 0};
    sigset_t exceeded;
    sigset_t former;
    sigset_t waiting;

    (void)sigemptyset(&exceeded);
    (void)sigaddset(&exceeded, SIGXFSZ);
    (void)sigprocmask(SIG_BLOCK, &exceeded, &former);
    ssize_t written = write(spool, line, length);
    int reason = errno;
    if (written < 0 && reason == EFBIG && sigpending(&waiting) == 0 && sigismember(&waiting, SIGXFSZ)) {
        (void)sigtimedwait(&exceeded, NULL, &now);
    }
    (void)sigprocmask(SIG_SETMASK, &former, NULL);
    errno = written >= 0 ? ENOSPC : reason;
    return written == (ssize_t)length ? 0 : -1;
}

struct velt_lost_records* velt_open_lost(const char* state_root) {
    char path[PATH_MAX];

    int folder = velt_open_sessions_folder(state_root);
    if (folder >= 0) {
        (void)close(folder);
    }
    if (join(path, state_root, VELT_LOST_FILE) < 0) {
        return NULL;
    }
    int file = open(path, O_RDWR | O_CREAT | O_NOFOLLOW | O_CLOEXEC, private_file);
    if (file < 0) {
        return NULL;
    }
    /* Without room for it, a write to the mapping would end this process. */
    void* lost = posix_fallocate(file, 0, velt_page_size) == 0
                     ? mmap(NULL, velt_page_size, PROT_READ | PROT_WRITE, MAP_SHARED, file, 0)
                     : MAP_FAILED;
    (void)close(file);
    return lost != MAP_FAILED ? lost : NULL;
}

void velt_count_lost(struct velt_lost_records* lost, int64_t now) {
    if (lost != NULL) {
        __atomic_store_n(&lost->last, now, __ATOMIC_RELAXED);
        (void)__atomic_add_fetch(&lost->count, 1, __ATOMIC_RELAXED);
    }
}

/* What follows this text, and the blanks around it; NULL where the line begins with another. */
static const char* behind(const char* line, const char* text) {
    if (line == NULL) {
        return NULL;
    }
    line += strspn(line, " \t");
    return strncmp(line, text, strlen(text)) == 0 ? line + strlen(text) : NULL;
}

static int says_no(const char* line) {
    const char* rest = behind(behind(behind(line, "record"), "="), "0");

    return rest != NULL && strchr(" \t\r\n#", *rest) != NULL;
}

int velt_may_record(const char* state_root) {
    char path[PATH_MAX];
    char text[longest_settings];
    ssize_t length = -1;

    int file = join(path, state_root, VELT_ACTIVITY_SETTINGS) < 0 ? -1 : open(path, O_RDONLY | O_CLOEXEC);
    if (file >= 0) {
        length = read(file, text, sizeof(text) - 1);
        (void)close(file);
    }
    text[length > 0 ? length : 0] = '\0';
    for (const char* line = text; line != NULL; line = strchr(line, '\n')) {
        line += *line == '\n';
        if (says_no(line)) {
            return 0;
        }
    }
    return 1;
}
