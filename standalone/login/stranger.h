/* How many connections of one address may be open and not logged in. Without a limit one client could hold
 * all that the daemon serves. */
#ifndef VELT_STANDALONE_LOGIN_STRANGER_H
#define VELT_STANDALONE_LOGIN_STRANGER_H

#include <netinet/in.h>

enum {
    velt_most_strangers = 100
};

/* Counts the caller among the strangers of this address, an IPv4 address in its mapped form. IPv6 counts by
 * networks of 64 bits, but for link-local addresses. All processes that name the same file, which is made
 * when it is missing, count together. A descriptor, with whose closing the caller, however it ends, is none
 * of them any more; or -1 with errno: EAGAIN when there are as many as there may be. */
int velt_count_stranger(const char* file, const struct in6_addr* address);

/* Whether the address is of the network, "192.0.2.0/24", "2001:db8::1" or such. */
int velt_is_in_network(const struct in6_addr* address, const char* network);

#endif
