#include "standalone/login/data_address.h"

#include <arpa/inet.h>
#include <ifaddrs.h>
#include <stdint.h>
#include <string.h>

static void map(uint32_t ipv4, struct in6_addr* address) {
    memset(address, 0, sizeof(*address));
    address->s6_addr[10] = 0xff;
    address->s6_addr[11] = 0xff;
    ipv4 = htonl(ipv4);
    memcpy(address->s6_addr + 12, &ipv4, sizeof(ipv4));
}

/* Up to 255, in digits without more ado; the text after it, or NULL. */
static const char* read_octet(const char* text, unsigned* octet) {
    size_t length = strspn(text, "0123456789");

    if (length == 0 || length > 3) {
        return NULL;
    }
    *octet = 0;
    for (size_t i = 0; i < length; i++) {
        *octet = *octet * 10 + (unsigned)(text[i] - '0');
    }
    return *octet <= 255 ? text + length : NULL;
}

int velt_read_port(const char* argument, struct in6_addr* address) {
    uint32_t ipv4 = 0;
    unsigned octet = 0;

    for (int i = 0; i < 6; i++) {
        argument = read_octet(argument, &octet);
        if (argument == NULL || *argument != (i < 5 ? ',' : '\0')) {
            return 0;
        }
        argument++;
        ipv4 = i < 4 ? ipv4 << 8 | octet : ipv4;
    }
    map(ipv4, address);
    return 1;
}

int velt_read_eprt(const char* argument, struct in6_addr* address) {
    char text[INET6_ADDRSTRLEN];
    struct in_addr ipv4;
    const char mark = argument[0];

    if (mark == '\0' || (mark >= '0' && mark <= '9') || (argument[1] != '1' && argument[1] != '2') ||
        argument[2] != mark) {
        return 0;
    }
    const char* start = argument + 3;
    const char* end = strchr(start, mark);
    if (end == NULL || (size_t)(end - start) >= sizeof(text)) {
        return 0;
    }
    memcpy(text, start, (size_t)(end - start));
    text[end - start] = '\0';
    if (argument[1] == '2') {
        return inet_pton(AF_INET6, text, address) == 1;
    }
    if (inet_pton(AF_INET, text, &ipv4) != 1) {
        return 0;
    }
    map(ntohl(ipv4.s_addr), address);
    return 1;
}

static int is_special_ipv4(const struct in6_addr* address) {
    const uint8_t* octets = address->s6_addr + 12;

    return octets[0] == 0 || octets[0] == 127 || (octets[0] == 169 && octets[1] == 254) || octets[0] >= 224;
}

static int is_special(const struct in6_addr* address) {
    /* The obsolete form "::127.0.0.1" as well. */
    if (IN6_IS_ADDR_V4MAPPED(address) || IN6_IS_ADDR_V4COMPAT(address)) {
        return is_special_ipv4(address);
    }
    return IN6_IS_ADDR_UNSPECIFIED(address) || IN6_IS_ADDR_LOOPBACK(address) ||
           IN6_IS_ADDR_LINKLOCAL(address) || IN6_IS_ADDR_MULTICAST(address);
}

/* The address to which a gateway would translate this one: RFC 6052 (NAT64), RFC 3056 (6to4). */
static struct in6_addr translated(const struct in6_addr* address) {
    static const uint8_t nat64[12] = {0x00, 0x64, 0xff, 0x9b};
    struct in6_addr plain = *address;
    uint32_t ipv4 = 0;

    if (memcmp(address->s6_addr, nat64, sizeof(nat64)) == 0) {
        memcpy(&ipv4, address->s6_addr + 12, sizeof(ipv4));
        map(ntohl(ipv4), &plain);
    } else if (address->s6_addr[0] == 0x20 && address->s6_addr[1] == 0x02) {
        memcpy(&ipv4, address->s6_addr + 2, sizeof(ipv4));
        map(ntohl(ipv4), &plain);
    }
    return plain;
}

static int is_at(const struct in6_addr* address, const struct sockaddr* interface) {
    struct in6_addr own;

    if (interface == NULL) {
        return 0;
    }
    if (interface->sa_family == AF_INET) {
        map(ntohl(((const struct sockaddr_in*)(const void*)interface)->sin_addr.s_addr), &own);
    } else if (interface->sa_family == AF_INET6) {
        own = ((const struct sockaddr_in6*)(const void*)interface)->sin6_addr;
    } else {
        return 0;
    }
    return IN6_ARE_ADDR_EQUAL(address, &own);
}

int velt_is_inside(const struct in6_addr* address) {
    struct ifaddrs* interfaces = NULL;
    const struct in6_addr plain = translated(address);
    int found = is_special(&plain);

    if (found) {
        return 1;
    }
    if (getifaddrs(&interfaces) < 0) {
        return 1;
    }
    for (const struct ifaddrs* one = interfaces; one != NULL && !found; one = one->ifa_next) {
        found = is_at(address, one->ifa_addr) || is_at(&plain, one->ifa_addr);
    }
    freeifaddrs(interfaces);
    return found;
}
