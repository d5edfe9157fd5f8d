#include "standalone/login/client_address.h"

static const uint8_t mapped_start[] = {0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0xff, 0xff};

int velt_read_address(const pr_netaddr_t* known, struct in6_addr* address) {
    const void* number = known != NULL ? pr_netaddr_get_inaddr(known) : NULL;

    if (number == NULL) {
        return FALSE;
    }
    if (pr_netaddr_get_family(known) == AF_INET6) {
        memcpy(address, number, sizeof(*address));
    } else {
        memcpy(address, mapped_start, sizeof(mapped_start));
        memcpy(address->s6_addr + sizeof(mapped_start), number, sizeof(struct in_addr));
    }
    return TRUE;
}
