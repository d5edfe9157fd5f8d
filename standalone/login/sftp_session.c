/* velt-sftp-session.so: shows each login over SFTP what it may see, and nothing else.
 *
 * The SFTP daemon is started with this library loaded before the C library, and with its configuration's
 * ChrootDirectory in VELT_SESSION_ROOT. When the process of a login is about to make that folder its root
 * directory, still with root's rights, it gets its own mount namespace, and the program velt-login-view makes
 * the folder show what the login may see. For everybody else the folder is empty, so a session that gets
 * there without this library sees nothing. When the program refuses, the connection ends.
 *
 * From then on sftp_files.c limits what the session may do there. The listener, and the process that has a
 * connection before its login, work as without the library.
 */
#include "standalone/login/sftp_session.h"

#include "standalone/activity/session_activity.h"
#include "standalone/login/access_files.h"
#include "standalone/login/file_operations.h"
#include "standalone/login/own_files.h"
#include "standalone/login/session_mounts.h"
#include "standalone/login/session_view.h"
#include "standalone/login/sftp_records.h"
#include "standalone/login/way.h"

#include <dlfcn.h>
#include <errno.h>
#include <fcntl.h>
#include <grp.h>
#include <limits.h>
#include <pwd.h>
#include <stdarg.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/socket.h>
#include <unistd.h>

enum {
    most_spared = 8 + velt_activity_files
};

static const char name_of_this[] = "velt-sftp-session";

/* From the environment, when the process begins: the daemon may take it down. */
static char* program;
static char* state_root;
static char* session_root;
static char* configuration; /* its hash; NULL: unknown */

static char user[256]; /* whose groups this process took last */
static int in_view = 0;
static int log_file = -1; /* of the daemon; a session's own error output goes to the client */

int velt_is_in_view(void) {
    return in_view;
}

void* velt_next_function(const char* name) {
    void* found = dlsym(RTLD_NEXT, name);
    if (found == NULL) {
        abort();
    }
    return found;
}

static char* copy_of_variable(const char* name) {
    const char* value = getenv(name);
    return value != NULL ? strdup(value) : NULL;
}

__attribute__((constructor)) static void begin(void) {
    program = copy_of_variable("VELT_SESSION_PROGRAM");
    state_root = copy_of_variable("VELT_SESSION_STATE");
    session_root = copy_of_variable("VELT_SESSION_ROOT");
    configuration = copy_of_variable("VELT_SESSION_CONFIGURATION");
}

static int is_configured(void) {
    return program != NULL && state_root != NULL && session_root != NULL;
}

/* One line, in one piece: lines of other processes may come at the same time. */
__attribute__((format(printf, 2, 3))) static void write_line(int file, const char* format, ...) {
    char line[1536];
    va_list parts;

    va_start(parts, format);
    int length = vsnprintf(line, sizeof(line) - 1, format, parts);
    va_end(parts);
    if (length >= (int)sizeof(line) - 1) {
        length = (int)sizeof(line) - 2;
    }
    line[length] = '\n';
    (void)!write(file, line, (size_t)length + 1);
}

/* The protocol has no words for it, and what this process says otherwise is not sent. */
static void end_old_session(void) {
    write_line(log_file, "%s: session of '%s' ended: the shares or rules have changed since its login",
               name_of_this, user);
    _exit(EXIT_FAILURE);
}

/* "1000,1000,27": the primary group, then all of this process, which are those of the login by now. NULL when
 * they cannot be told. */
static char* groups_text(void) {
    gid_t groups[NGROUPS_MAX];
    char* text = NULL;
    size_t size = 0;

    int count = getgroups(NGROUPS_MAX, groups);
    FILE* out = count < 0 ? NULL : open_memstream(&text, &size);
    if (out == NULL) {
        return NULL;
    }
    int good = fprintf(out, "%lu", (unsigned long)getegid()) > 0;
    for (int i = 0; i < count; i++) {
        good = fprintf(out, ",%lu", (unsigned long)groups[i]) > 0 && good;
    }
    if (fclose(out) != 0 || !good) {
        free(text);
        return NULL;
    }
    return text;
}

static int make_view(const struct passwd* account, char* groups, char* words, size_t size) {
    char kind[] = "stored";
    char uid[16];

    (void)snprintf(uid, sizeof(uid), "%lu", (unsigned long)account->pw_uid);
    char* const arguments[velt_view_words] = {
        [velt_view_program] = program,   [velt_view_state] = state_root,      [velt_view_kind] = kind,
        [velt_view_root] = session_root, [velt_view_user] = account->pw_name, [velt_view_uid] = uid,
        [velt_view_gids] = groups,       [velt_view_home] = account->pw_dir,
    };
    return velt_make_session_view(arguments, words, size);
}

/* Makes the folder show what the login may see. 1, or 0 when the login must be refused. */
static int show_view(void) {
    char words[1024] = "cannot look up the account or its groups";
    const struct passwd* account = user[0] != '\0' ? getpwnam(user) : NULL;
    char* groups = account != NULL && account->pw_uid != 0 ? groups_text() : NULL;

    int good = groups != NULL && make_view(account, groups, words, sizeof(words));
    free(groups);
    if (!good) {
        write_line(STDERR_FILENO, "%s: login of '%s' refused: %s", name_of_this, user, words);
    } else if (words[0] != '\0') {
        write_line(STDERR_FILENO, "%s: login of '%s': %s", name_of_this, user, words);
    }
    return good;
}

VELT_WRAPPER int initgroups(const char* name, gid_t group) {
    VELT_NEXT(initgroups);
    /* A name that is too long for us is nobody's. */
    if (snprintf(user, sizeof(user), "%s", name) >= (int)sizeof(user)) {
        user[0] = '\0';
    }
    return next(name, group);
}

VELT_WRAPPER int chroot(const char* path) {
    VELT_NEXT(chroot);
    if (!is_configured() || in_view || strcmp(path, session_root) != 0) {
        return next(path);
    }
    log_file = fcntl(STDERR_FILENO, F_DUPFD_CLOEXEC, STDERR_FILENO + 1);
    velt_expect_sftp_login(state_root, user, configuration);
    if (!show_view()) {
        velt_note_refused_sftp_login();
        errno = EACCES;
        return -1;
    }
    /* The folder's path leads to what has been mounted there. */
    int result = next(path);
    if (result == 0) {
        velt_end_old_sessions_by(end_old_session);
        velt_keep_root();
        velt_note_sftp_login();
        in_view = 1;
    }
    return result;
}

/* The daemon is about to serve. Where no session can have mounts of its own, it would start well, and refuse
 * every login. */
VELT_WRAPPER int listen(int descriptor, int backlog) {
    VELT_NEXT(listen);
    int error = is_configured() && !in_view && geteuid() == 0 ? velt_try_session_mounts() : 0;
    if (error != 0) {
        write_line(STDERR_FILENO, "SFTP sessions cannot be confined here: cannot make a mount namespace: %s",
                   strerror(error));
        _exit(EXIT_FAILURE);
    }
    return next(descriptor, backlog);
}

static int compare(const void* one, const void* other) {
    return *(const int*)one - *(const int*)other;
}

/* Those that a session needs to the end, lowest first. */
static size_t spared(int descriptors[most_spared]) {
    size_t count = velt_access_descriptors(descriptors, most_spared - velt_activity_files - 2);

    descriptors[count++] = velt_way_descriptor();
    descriptors[count++] = log_file;
    velt_list_activity_files(descriptors + count);
    count += velt_activity_files;
    qsort(descriptors, count, sizeof(*descriptors), compare);
    return count;
}

VELT_WRAPPER int close_range(unsigned first, unsigned last, int flags) {
    VELT_NEXT(close_range);
    int descriptors[most_spared];
    size_t count = in_view ? spared(descriptors) : 0;
    int result = 0;

    for (size_t i = 0; i < count && result == 0; i++) {
        const unsigned kept = (unsigned)descriptors[i];
        if (descriptors[i] >= 0 && kept >= first && kept <= last) {
            result = kept > first ? next(first, kept - 1, flags) : 0;
            first = kept + 1;
        }
    }
    return result == 0 && first <= last ? next(first, last, flags) : result;
}

VELT_WRAPPER void closefrom(int first) {
    (void)close_range(first < 0 ? 0 : (unsigned)first, UINT_MAX, 0);
}
