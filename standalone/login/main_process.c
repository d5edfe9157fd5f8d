#include "standalone/login/main_process.h"

#include "conf.h"
#include "privs.h"

#include <errno.h>
#include <fcntl.h>
#include <signal.h>
#include <stdio.h>
#include <string.h>
#include <unistd.h>

static int name_of_kept(char* name, size_t size) {
    int length = snprintf(name, size, "%s.former", pr_get_scoreboard());

    return length > 0 && (size_t)length < size;
}

/* A daemon of another release may lay out the file in its own way. */
static int have_same_form(const char* one, const char* other) {
    pr_scoreboard_header_t headers[2];
    const char* const files[2] = {one, other};

    (void)memset(headers, 0, sizeof(headers));
    for (int i = 0; i < 2; i++) {
        int fd = open(files[i], O_RDONLY | O_NOFOLLOW | O_CLOEXEC);
        ssize_t got = fd >= 0 ? read(fd, &headers[i], sizeof(headers[i])) : -1;
        if (fd >= 0) {
            (void)close(fd);
        }
        if (got != (ssize_t)sizeof(headers[i])) {
            return FALSE;
        }
    }
    return headers[0].sch_magic == headers[1].sch_magic && headers[0].sch_version == headers[1].sch_version;
}

void velt_keep_scoreboard(void) {
    char kept[PR_TUNABLE_PATH_MAX];

    if (name_of_kept(kept, sizeof(kept))) {
        PRIVS_ROOT(void) unlink(kept);
        if (link(pr_get_scoreboard(), kept) < 0 && errno != ENOENT) {
            pr_log_pri(PR_LOG_NOTICE, "velt: cannot keep %s: %s", pr_get_scoreboard(), strerror(errno));
        }
        PRIVS_RELINQUISH
    }
}

void velt_restore_scoreboard(void) {
    char kept[PR_TUNABLE_PATH_MAX];

    if (name_of_kept(kept, sizeof(kept))) {
        PRIVS_ROOT
        if (!have_same_form(kept, pr_get_scoreboard()) || rename(kept, pr_get_scoreboard()) < 0) {
            (void)unlink(kept);
        }
        PRIVS_RELINQUISH
    }
}

/* Once in each round of the daemon's loop, before it waits. */
static void note_ended_sessions(void* a, void* b, void* c, void* d) {
    sigset_t child_ended;
    const pid_t* self = a;
    (void)b;
    (void)c;
    (void)d;

    if (*self != getpid()) { /* a session has the schedule as well */
        return;
    }
    (void)sigemptyset(&child_ended);
    (void)sigaddset(&child_ended, SIGCHLD);
    (void)sigprocmask(SIG_UNBLOCK, &child_ended, NULL);
    /* An interrupted call is what it would pause for. */
    errno = 0;
    pr_signals_handle();
    (void)sigprocmask(SIG_BLOCK, &child_ended, NULL);
    velt_note_ended_sessions_later();
}

void velt_note_ended_sessions_later(void) {
    static pid_t self = 0;

    self = getpid();
    schedule(note_ended_sessions, 0, &self, NULL, NULL, NULL);
}
