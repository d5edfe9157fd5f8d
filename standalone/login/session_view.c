#include "standalone/login/session_view.h"

#include "standalone/login/access_files.h"
#include "standalone/login/login_program.h"
#include "standalone/login/own_files.h"
#include "standalone/login/own_places.h"

#include <errno.h>
#include <pwd.h>
#include <sched.h>
#include <stdio.h>
#include <string.h>
#include <unistd.h>

/* In seconds: far more than a login takes, and less than clients wait. */
static const int longest_run = 20;

/* Without root's rights all sessions work as the daemon's own user, so that user's home counts, too. */
static int keep_homes(const char* home) {
    const struct passwd* self = geteuid() != 0 ? getpwuid(geteuid()) : NULL;

    velt_forget_homes();
    return velt_keep_home(home) == 0 && (self == NULL || velt_keep_home(self->pw_dir) == 0);
}

int velt_make_session_view(char* const arguments[velt_view_words], char* words, size_t size) {
    int isolated = strcmp(arguments[velt_view_kind], "server") != 0;

    if (isolated && strcmp(arguments[velt_view_root], "/") == 0) {
        (void)snprintf(words, size, "the folder for the view is missing from the configuration");
    } else if (isolated && unshare(CLONE_NEWNS) < 0) {
        (void)snprintf(words, size, "cannot make a mount namespace: %s", strerror(errno));
    } else if (!keep_homes(arguments[velt_view_home])) {
        (void)snprintf(words, size, "cannot look at the home: %s",
                       errno == E2BIG ? velt_crowded_place() : strerror(errno));
    } else if (velt_note_access_files(arguments[velt_view_state]) < 0) {
        (void)snprintf(words, size, "cannot look at the shares and rules: %s", strerror(errno));
    } else {
        return velt_run_login_program(arguments, longest_run, words, size);
    }
    return 0;
}
