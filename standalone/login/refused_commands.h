/* Commands that a session refuses before the daemon looks at them. */
#ifndef VELT_STANDALONE_LOGIN_REFUSED_COMMANDS_H
#define VELT_STANDALONE_LOGIN_REFUSED_COMMANDS_H

#include "conf.h"

/* The module's table of command handlers. They refuse STOU where nothing may be changed, since the daemon makes
 * that file with no function that could be replaced. */
extern cmdtable velt_refused_commands[];

#endif
