/* The daemon's addresses as those of the system. */
#ifndef VELT_STANDALONE_LOGIN_CLIENT_ADDRESS_H
#define VELT_STANDALONE_LOGIN_CLIENT_ADDRESS_H

#include "conf.h"

#include <netinet/in.h>

/* An IPv4 address in its mapped form. 1, or 0 when there is none. */
int velt_read_address(const pr_netaddr_t* known, struct in6_addr* address);

#endif
