/* Who has failed to log in too often. The firewall refuses new connections of theirs; this is for those that
 * were open before. */
#ifndef VELT_STANDALONE_LOGIN_BANNED_ADDRESS_H
#define VELT_STANDALONE_LOGIN_BANNED_ADDRESS_H

#include <netinet/in.h>
#include <time.h>

/* Whether the list of bans below this state root (standalone/bans/ban_list.h) has the address at this time;
 * an IPv4 address in its mapped form. No, too, when the list cannot be read. Called with the right to read
 * it. */
int velt_is_banned(const char* state_root, const struct in6_addr* address, time_t now);

#endif
