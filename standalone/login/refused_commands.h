/* Commands that a session refuses before the daemon looks at them. */
#ifndef VELT_STANDALONE_LOGIN_REFUSED_COMMANDS_H
#define VELT_STANDALONE_LOGIN_REFUSED_COMMANDS_H

#include "conf.h"

/* The module's table of command handlers. They refuse
 * - control characters before the login: the daemon writes the words of strangers to its log;
 * - data to the inside of this server, see data_address.h, where clients may name foreign addresses;
 * - STOU where nothing may be changed, since the daemon makes that file with no function that could be
 *   replaced. */
extern cmdtable velt_refused_commands[];

#endif
