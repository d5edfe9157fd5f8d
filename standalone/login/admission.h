/* Whom a new session serves at all. */
#ifndef VELT_STANDALONE_LOGIN_ADMISSION_H
#define VELT_STANDALONE_LOGIN_ADMISSION_H

#include "conf.h"

/* The directive "VeltSpared network", which may be there more than once. */
modret_t* velt_set_spared(cmd_rec* cmd);

/* At the session's start: ends it with 421 when its address has too many connections that are not logged in,
 * see stranger.h, unless that address is loopback or spared. When they cannot be counted, the session is
 * served. */
void velt_admit(void);

/* Somebody is known who may log in: the session counts no more. */
void velt_note_login(void);

#endif
