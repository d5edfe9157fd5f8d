#include "standalone/login/login_program.h"

#include "standalone/activity/shown_places.h"
#include "standalone/login/told_places.h"

#include <errno.h>
#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <spawn.h>
#include <stdio.h>
#include <string.h>
#include <sys/mman.h>
#include <sys/wait.h>
#include <time.h>
#include <unistd.h>

/* What the program writes: why it refuses, and what the view shows. Without a place for that it has no
 * output, and refuses where the session must know of it. */
struct outputs {
    int errors;
    int facts;
};

/* Nothing but the outputs: the program must not get the client's connection or the server's keys. */
static int describe_files(posix_spawn_file_actions_t* files, const struct outputs* outputs) {
    int failure = posix_spawn_file_actions_adddup2(files, outputs->errors, STDERR_FILENO);

    if (failure == 0) {
        failure = posix_spawn_file_actions_addopen(files, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
    }
    if (failure == 0) {
        failure = outputs->facts >= 0 ? posix_spawn_file_actions_adddup2(files, outputs->facts, STDOUT_FILENO)
                                      : posix_spawn_file_actions_addclose(files, STDOUT_FILENO);
    }
    return failure != 0 ? failure : posix_spawn_file_actions_addclosefrom_np(files, STDERR_FILENO + 1);
}

/* The program starts with no signal blocked or ignored, whatever the daemon has set for itself. */
static int describe_signals(posix_spawnattr_t* attributes) {
    sigset_t signals;

    (void)sigfillset(&signals);
    (void)posix_spawnattr_setsigdefault(attributes, &signals);
    (void)sigemptyset(&signals);
    (void)posix_spawnattr_setsigmask(attributes, &signals);
    return posix_spawnattr_setflags(attributes, POSIX_SPAWN_SETSIGMASK | POSIX_SPAWN_SETSIGDEF);
}

static int spawn(char* const arguments[], const struct outputs* outputs, pid_t* child) {
    static char* const no_environment[] = {NULL};
    posix_spawn_file_actions_t files;
    posix_spawnattr_t attributes;

    int failure = posix_spawn_file_actions_init(&files);
    if (failure != 0) {
        return failure;
    }
    failure = posix_spawnattr_init(&attributes);
    if (failure != 0) {
        (void)posix_spawn_file_actions_destroy(&files);
        return failure;
    }
    failure = describe_files(&files, outputs);
    if (failure == 0) {
        failure = describe_signals(&attributes);
    }
    if (failure == 0) {
        failure = posix_spawn(child, arguments[0], &files, &attributes, arguments, no_environment);
    }
    (void)posix_spawnattr_destroy(&attributes);
    (void)posix_spawn_file_actions_destroy(&files);
    return failure;
}

static long long milliseconds(void) {
    struct timespec now;

    (void)clock_gettime(CLOCK_MONOTONIC, &now);
    return (long long)now.tv_sec * 1000 + now.tv_nsec / 1000000;
}

/* Reads until the program closes its end. 0 when that takes too long. */
static int read_words(int fd, long long deadline, char* words, size_t size) {
    char rest[256];
    size_t length = 0;

    for (;;) {
        struct pollfd wanted = {fd, POLLIN, 0};
        long long left = deadline - milliseconds();
        int full = length + 1 >= size;

        if (left <= 0) {
            return 0;
        }
        if (poll(&wanted, 1, (int)left) <= 0) {
            continue;
        }
        ssize_t got = full ? read(fd, rest, sizeof(rest)) : read(fd, words + length, size - 1 - length);
        if (got < 0 && errno != EINTR) {
            return 0;
        }
        if (got == 0) {
            return 1;
        }
        if (got > 0 && !full) {
            length += (size_t)got;
            words[length] = '\0';
        }
    }
}

static void make_printable(char* words) {
    size_t length = strlen(words);

    while (length > 0 && words[length - 1] == '\n') {
        words[--length] = '\0';
    }
    for (char* c = words; *c != '\0'; c++) {
        if ((unsigned char)*c < 0x20 || *c == 0x7f) {
            *c = ' ';
        }
    }
}

/* A program that has closed its standard error ends soon, unless it hangs. */
static int reap(pid_t child, long long deadline, int* status) {
    const struct timespec pause = {0, 1000000};

    for (;;) {
        pid_t ended = waitpid(child, status, WNOHANG);
        if (ended == child) {
            return 1;
        }
        if ((ended < 0 && errno != EINTR) || milliseconds() >= deadline) {
            return 0;
        }
        (void)nanosleep(&pause, NULL);
    }
}

static int await(pid_t child, int errors, int limit, char* words, size_t size) {
    long long deadline = milliseconds() + (long long)limit * 1000;
    int status = 0;

    if (!read_words(errors, deadline, words, size) || !reap(child, deadline, &status)) {
        (void)kill(child, SIGKILL);
        /* It may be stuck in the kernel, where no signal ends it. */
        (void)reap(child, milliseconds() + 100, &status);
        (void)snprintf(words, size, "no result within %d s", limit);
        return 0;
    }
    make_printable(words);
    if (!WIFEXITED(status) || WEXITSTATUS(status) != 0) {
        if (words[0] == '\0') {
            (void)snprintf(words, size, "failed without a reason");
        }
        return 0;
    }
    return 1;
}

/* If standard files are closed, it could have taken one of their numbers. */
static int move_away(int descriptor) {
    int moved = descriptor >= 0 ? fcntl(descriptor, F_DUPFD_CLOEXEC, STDERR_FILENO + 1) : -1;
    int reason = errno;

    if (descriptor >= 0) {
        (void)close(descriptor);
    }
    errno = reason;
    return moved;
}

static void close_output(int descriptor) {
    if (descriptor >= 0) {
        (void)close(descriptor);
    }
}

static int run(char* const arguments[], int limit, int facts, char* words, size_t size) {
    int ends[2] = {-1, -1};
    pid_t child = -1;

    if (pipe2(ends, O_CLOEXEC) < 0) {
        (void)snprintf(words, size, "%s", strerror(errno));
        return 0;
    }
    const struct outputs outputs = {move_away(ends[1]), facts};
    int failure = outputs.errors < 0 ? errno : spawn(arguments, &outputs, &child);
    close_output(outputs.errors);
    int good = 0;
    if (failure != 0) {
        (void)snprintf(words, size, "%s: %s", arguments[0], strerror(failure));
    } else {
        good = await(child, ends[0], limit, words, size);
    }
    (void)close(ends[0]);
    return good;
}

int velt_run_login_program(char* const arguments[], int limit, char* words, size_t size) {
    int facts = move_away(memfd_create("view", MFD_CLOEXEC));

    words[0] = '\0';
    int good = run(arguments, limit, facts, words, size);
    velt_note_shown_places(good ? facts : -1);
    if (good && velt_keep_told_places(facts) < 0) {
        (void)snprintf(words, size, "cannot read which folders rules lead to: %s", strerror(errno));
        good = 0;
    }
    close_output(facts);
    return good;
}
