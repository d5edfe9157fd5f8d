/* Commands that a session refuses before the daemon looks at them. */
#ifndef VELT_STANDALONE_LOGIN_REFUSED_COMMANDS_H
#define VELT_STANDALONE_LOGIN_REFUSED_COMMANDS_H

#include "conf.h"

/* Handlers, which refuse a command or decline it.
 *
 * Control characters before the login: the daemon writes the words of strangers to its log. The first is for
 * all commands before they are looked at, the second for when they would be done. */
modret_t* velt_look_at_characters(cmd_rec* cmd);
modret_t* velt_refuse_name(cmd_rec* cmd);

/* PORT and EPRT: data to the inside of this server, see data_address.h, where clients may name foreign
 * addresses. */
modret_t* velt_refuse_data_to_the_inside(cmd_rec* cmd);

/* STOU where nothing may be changed, since the daemon makes that file with no function that could be
 * replaced.
 */
modret_t* velt_refuse_unique_name(cmd_rec* cmd);

#endif
