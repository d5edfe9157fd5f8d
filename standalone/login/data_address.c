#include "standalone/login/data_address.h"

#include <arpa/inet.h>
#include <errno.h>
#include <linux/netlink.h>
#include <linux/rtnetlink.h>
#include <stdint.h>
#include <string.h>
#include <sys/socket.h>
#include <unistd.h>

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

/* An IPv4 address within an IPv6 one. */
struct form {
    uint8_t mark[12]; /* by which it is known */
    size_t mark_place;
    size_t mark_size;
    uint8_t places[4]; /* of its octets */
    uint8_t mask;      /* that they are hidden with */
};

/* To which a gateway, or the kernel itself, would translate: RFC 6052 and 8215 (NAT64, whose own prefix may
 * be longer than the one that is reserved), RFC 3056 (6to4), RFC 4380 (Teredo: the client, and the server),
 * RFC 5214 (ISATAP), RFC 2765 (SIIT). */
static const struct form forms[] = {
    {{0x00, 0x64, 0xff, 0x9b}, 0, 12, {12, 13, 14, 15}, 0},
    {{0x00, 0x64, 0xff, 0x9b, 0x00, 0x01}, 0, 6, {12, 13, 14, 15}, 0},
    {{0x00, 0x64, 0xff, 0x9b, 0x00, 0x01}, 0, 6, {6, 7, 9, 10}, 0},
    {{0x00, 0x64, 0xff, 0x9b, 0x00, 0x01}, 0, 6, {7, 9, 10, 11}, 0},
    {{0x00, 0x64, 0xff, 0x9b, 0x00, 0x01}, 0, 6, {9, 10, 11, 12}, 0},
    {{0x20, 0x02}, 0, 2, {2, 3, 4, 5}, 0},
    {{0x20, 0x01, 0x00, 0x00}, 0, 4, {12, 13, 14, 15}, 0xff},
    {{0x20, 0x01, 0x00, 0x00}, 0, 4, {4, 5, 6, 7}, 0},
    {{0x00, 0x00, 0x5e, 0xfe}, 8, 4, {12, 13, 14, 15}, 0},
    {{0x02, 0x00, 0x5e, 0xfe}, 8, 4, {12, 13, 14, 15}, 0},
    {{0, 0, 0, 0, 0, 0, 0, 0, 0xff, 0xff, 0, 0}, 0, 12, {12, 13, 14, 15}, 0},
};

/* True when the address has this form. */
static int translate(const struct form* form, const struct in6_addr* address, struct in6_addr* plain) {
    uint32_t ipv4 = 0;

    if (memcmp(address->s6_addr + form->mark_place, form->mark, form->mark_size) != 0) {
        return 0;
    }
    for (size_t i = 0; i < sizeof(ipv4); i++) {
        ipv4 = ipv4 << 8 | (uint8_t)(address->s6_addr[form->places[i]] ^ form->mask);
    }
    map(ipv4, plain);
    return 1;
}

/* Asks for the route of the address; the size of the message. */
static size_t describe_question(const struct in6_addr* address, unsigned char* bytes) {
    const int is_ipv4 = IN6_IS_ADDR_V4MAPPED(address);
    const size_t size = is_ipv4 ? sizeof(struct in_addr) : sizeof(*address);
    struct nlmsghdr* head = (struct nlmsghdr*)(void*)bytes;
    struct rtmsg* route = NLMSG_DATA(head);
    struct rtattr* destination = (struct rtattr*)(void*)(bytes + NLMSG_SPACE(sizeof(*route)));

    head->nlmsg_len = (uint32_t)(NLMSG_SPACE(sizeof(*route)) + RTA_LENGTH(size));
    head->nlmsg_type = RTM_GETROUTE;
    head->nlmsg_flags = NLM_F_REQUEST;
    route->rtm_family = is_ipv4 ? AF_INET : AF_INET6;
    route->rtm_dst_len = (unsigned char)(size * 8);
    destination->rta_type = RTA_DST;
    destination->rta_len = (unsigned short)RTA_LENGTH(size);
    memcpy(RTA_DATA(destination), is_ipv4 ? address->s6_addr + 12 : address->s6_addr, size);
    return head->nlmsg_len;
}

/* Whether the kernel takes what is sent there for itself, be it for an interface's address or by a route, or
 * sends it to many (rtnetlink(7)). What cannot be asked counts as inside, and what has no route at all as
 * outside. */
static int leads_inside(const struct in6_addr* address) {
    union {
        struct nlmsghdr head;
        unsigned char bytes[4096];
    } message;
    int inside = 1;

    memset(&message, 0, sizeof(message));
    int kernel = socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC, NETLINK_ROUTE);
    if (kernel < 0) {
        return 1;
    }
    const size_t size = describe_question(address, message.bytes);
    if (send(kernel, &message, size, 0) == (ssize_t)size &&
        recv(kernel, &message, sizeof(message), 0) >= (ssize_t)NLMSG_SPACE(sizeof(struct rtmsg))) {
        if (message.head.nlmsg_type == RTM_NEWROUTE) {
            inside = ((const struct rtmsg*)NLMSG_DATA(&message.head))->rtm_type != RTN_UNICAST;
        } else if (message.head.nlmsg_type == NLMSG_ERROR) {
            const int error = ((const struct nlmsgerr*)NLMSG_DATA(&message.head))->error;
            inside = error != -ENETUNREACH && error != -EHOSTUNREACH;
        }
    }
    (void)close(kernel);
    return inside;
}

static int is_one_inside(const struct in6_addr* address, const struct in6_addr* external) {
    return is_special(address) || (external != NULL && IN6_ARE_ADDR_EQUAL(address, external)) ||
           leads_inside(address);
}

int velt_is_inside(const struct in6_addr* address, const struct in6_addr* external) {
    struct in6_addr plain;

    if (is_one_inside(address, external)) {
        return 1;
    }
    for (size_t i = 0; i < sizeof(forms) / sizeof(forms[0]); i++) {
        if (translate(&forms[i], address, &plain) && is_one_inside(&plain, external)) {
            return 1;
        }
    }
    return 0;
}
