/* The view of a login, made for the process that serves it. */
#ifndef VELT_STANDALONE_LOGIN_SESSION_VIEW_H
#define VELT_STANDALONE_LOGIN_SESSION_VIEW_H

#include <stddef.h>

/* Where the words of velt-login-view's command line stand, see main.cpp. */
enum {
    velt_view_program,
    velt_view_state,
    velt_view_kind,
    velt_view_root,
    velt_view_user,
    velt_view_uid,
    velt_view_gids,
    velt_view_home,
    velt_view_file, /* or NULL */
    velt_view_end,  /* NULL */
    velt_view_words
};

/* Gives this process mounts of its own, keeps what own_files.h and access_files.h keep, and runs the program:
 * if that goes well, `root` shows what the login may see. Not with the kind "server", by which everything may
 * be seen: then there are no own mounts. Called with root's rights where the daemon has them.
 *
 * 1, or 0 when the login must be refused. `words` is as velt_run_login_program leaves it. */
int velt_make_session_view(char* const arguments[velt_view_words], char* words, size_t size);

#endif
