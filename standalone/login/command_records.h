/* What an FTP session tells of itself: session_activity.h for the commands of the daemon. */
#ifndef VELT_STANDALONE_LOGIN_COMMAND_RECORDS_H
#define VELT_STANDALONE_LOGIN_COMMAND_RECORDS_H

#include "conf.h"

/* The directive "VeltConfiguration hash": which settings the daemon runs with. */
modret_t* velt_set_configuration(cmd_rec* cmd);

/* At the session's start. */
int velt_watch_session(module* owner);

/* A login is about to be decided, while the root directory is still the server's: opens what is written to.
 */
void velt_expect_login(void);

/* The login will succeed, as far as that is known: the last moment with the rights to make the page. */
void velt_expect_success(void);

/* `kind` as velt_login_was_refused has it. */
void velt_note_refused_login(const char* kind);

/* Handlers for all commands, which decline them: before a command is looked at, as the last before it is
 * done, and after it, when the client has been answered. */
modret_t* velt_note_command(cmd_rec* cmd);
modret_t* velt_note_start(cmd_rec* cmd);
modret_t* velt_note_success(cmd_rec* cmd);
modret_t* velt_note_failure(cmd_rec* cmd);

#endif
