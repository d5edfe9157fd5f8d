/* What the daemon's own process does otherwise than it would: it succeeds one that still runs, and does not
 * keep clients waiting because a session has ended. For mod_velt_login, in that process alone. */
#ifndef VELT_STANDALONE_LOGIN_MAIN_PROCESS_H
#define VELT_STANDALONE_LOGIN_MAIN_PROCESS_H

/* At its start the daemon removes the scoreboard, the list of sessions by which it limits the connections of
 * an address, and begins a new one. The first of these functions, called before that, keeps the former one by
 * another name, the second puts it back, so that the sessions of all daemons are in one list. Neither can
 * fail: without it the new list is used. */
void velt_keep_scoreboard(void);
void velt_restore_scoreboard(void);

/* Takes note of sessions that have ended when a connection comes, or after half a minute. At once, it would
 * pause for 0.2 seconds after each, and accept nobody meanwhile. */
void velt_note_ended_sessions_later(void);

#endif
