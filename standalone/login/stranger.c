#include "standalone/login/stranger.h"

#include <arpa/inet.h>
#include <errno.h>
#include <fcntl.h>
#include <stdint.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <unistd.h>

enum {
    places_bits = 7, /* each address has more bytes of the file than places */
    key_bits = 63 - places_bits,
    whole_bits = 128,
    mapped_bits = 96
};

static uint64_t half_of(const struct in6_addr* address, int half) {
    uint64_t number = 0;

    for (int i = 0; i < 8; i++) {
        number = number << 8 | address->s6_addr[8 * half + i];
    }
    return number;
}

/* One for each source, of so many bits that it can choose a place in a file. For IPv6 some sources have the
 * same one: those that do have nothing else in common. */
static uint64_t key_of(const struct in6_addr* address) {
    const uint64_t odd = 0x9e3779b97f4a7c15U;

    if (IN6_IS_ADDR_V4MAPPED(address)) {
        return half_of(address, 1) & UINT32_MAX;
    }
    uint64_t source = half_of(address, IN6_IS_ADDR_LINKLOCAL(address) ? 1 : 0);
    return (source * odd) >> (64 - key_bits) | (uint64_t)1 << (key_bits - 1);
}

/* A lock of one byte of the file, which need not exist. The kernel takes it back when the process ends. */
static int take(int file, uint64_t key, int place) {
    struct flock lock;

    memset(&lock, 0, sizeof(lock));
    lock.l_type = F_WRLCK;
    lock.l_whence = SEEK_SET;
    lock.l_start = (off_t)(key << places_bits | (uint64_t)place);
    lock.l_len = 1;
    return fcntl(file, F_OFD_SETLK, &lock);
}

int velt_count_stranger(const char* file, const struct in6_addr* address) {
    const uint64_t key = key_of(address);
    const int first = getpid() % velt_most_strangers; /* or all would try the taken ones before a free one */
    int taken = -1;

    int descriptor = open(file, O_RDWR | O_CREAT | O_NOFOLLOW | O_CLOEXEC, 0644);
    if (descriptor < 0) {
        return -1;
    }
    for (int i = 0; i < velt_most_strangers && taken < 0; i++) {
        taken = take(descriptor, key, (first + i) % velt_most_strangers);
        if (taken < 0 && errno != EAGAIN && errno != EACCES) {
            break;
        }
    }
    if (taken == 0) {
        return descriptor;
    }
    int reason = errno == EACCES ? EAGAIN : errno;
    (void)close(descriptor);
    errno = reason;
    return -1;
}

static int have_same_start(const struct in6_addr* one, const struct in6_addr* other, unsigned bits) {
    unsigned whole = bits / 8;
    unsigned char rest = (unsigned char)(0xff00U >> (bits % 8));

    return memcmp(one, other, whole) == 0 &&
           (whole == sizeof(*one) || ((one->s6_addr[whole] ^ other->s6_addr[whole]) & rest) == 0);
}

int velt_is_in_network(const struct in6_addr* address, const char* network) {
    char text[INET6_ADDRSTRLEN + sizeof("::ffff:")];
    struct in6_addr first;
    const size_t length = strcspn(network, "/");
    const int is_ipv4 = strchr(network, ':') == NULL;
    unsigned long bits = whole_bits;

    if (length > INET6_ADDRSTRLEN) {
        return 0;
    }
    (void)snprintf(text, sizeof(text), "%s%.*s", is_ipv4 ? "::ffff:" : "", (int)length, network);
    if (network[length] == '/') {
        bits = strtoul(network + length + 1, NULL, 10) + (is_ipv4 ? mapped_bits : 0);
    }
    return bits <= whole_bits && inet_pton(AF_INET6, text, &first) == 1 &&
           have_same_start(address, &first, (unsigned)bits);
}
