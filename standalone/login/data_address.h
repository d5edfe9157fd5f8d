/* Where a client may have the server send data, when it may name another address than its own. */
#ifndef VELT_STANDALONE_LOGIN_DATA_ADDRESS_H
#define VELT_STANDALONE_LOGIN_DATA_ADDRESS_H

#include <netinet/in.h>

/* The address in the argument of PORT ("10,0,0,1,4,1") and EPRT ("|2|2001:db8::1|1025|"), an IPv4 address in
 * its mapped form. Stricter than the daemon: what is read here the daemon reads as the same. 1, or 0 when it
 * cannot be read. */
int velt_read_port(const char* argument, struct in6_addr* address);
int velt_read_eprt(const char* argument, struct in6_addr* address);

/* Whether this is an address that leads to this server itself or to nobody in particular: loopback,
 * link-local, multicast, unspecified or reserved, one that the kernel takes for this server's, or `external`,
 * under which it is known outside (NULL for none); or an IPv6 address that a gateway would translate into
 * such a one. An IPv4 address in its mapped form. When the kernel cannot be asked, every address is inside.
 */
int velt_is_inside(const struct in6_addr* address, const struct in6_addr* external);

#endif
