#include "standalone/login/banned_address.h"

#include <arpa/inet.h>
#include <fcntl.h>
#include <limits.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <unistd.h>

enum {
    mapped_bits = 96,
    whole_bits = 128
};

/* "192.0.2.1" or "2001:db8::/64" as an IPv6 network. 1, or 0 for a text of another form. */
static int read_network(char* text, struct in6_addr* network, int* bits) {
    static const unsigned char mapped[] = {0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0xff, 0xff};
    char* slash = strchr(text, '/');
    int length = -1;

    if (slash != NULL) {
        *slash = '\0';
        length = (int)strtol(slash + 1, NULL, 10);
    }
    if (inet_pton(AF_INET6, text, network) == 1) {
        *bits = length < 0 ? whole_bits : length;
    } else if (inet_pton(AF_INET, text, network->s6_addr + mapped_bits / 8) == 1) {
        memcpy(network->s6_addr, mapped, sizeof(mapped));
        *bits = length < 0 ? whole_bits : mapped_bits + length;
    } else {
        return 0;
    }
    return *bits >= 0 && *bits <= whole_bits;
}

static int is_within(const struct in6_addr* address, const struct in6_addr* network, int bits) {
    const int whole = bits / 8;
    const int rest = bits % 8;

    if (memcmp(address->s6_addr, network->s6_addr, (size_t)whole) != 0) {
        return 0;
    }
    return rest == 0 || ((address->s6_addr[whole] ^ network->s6_addr[whole]) >> (8 - rest)) == 0;
}

/* One line of the list: source, end in seconds since 1970, and more. */
static int is_banned_by(char* line, const struct in6_addr* address, time_t now) {
    struct in6_addr network;
    int bits = 0;
    char* blank = strchr(line, ' ');

    if (blank == NULL) {
        return 0;
    }
    *blank = '\0';
    return read_network(line, &network, &bits) && strtoll(blank + 1, NULL, 10) > (long long)now &&
           is_within(address, &network, bits);
}

int velt_is_banned(const char* state_root, const struct in6_addr* address, time_t now) {
    char path[PATH_MAX];
    char line[256];
    int banned = 0;

    if (snprintf(path, sizeof(path), "%s/run/velt/bans", state_root) >= (int)sizeof(path)) {
        return 0;
    }
    int file = open(path, O_RDONLY | O_CLOEXEC | O_NOFOLLOW);
    FILE* list = file < 0 ? NULL : fdopen(file, "r");
    if (list == NULL) {
        if (file >= 0) {
            (void)close(file);
        }
        return 0;
    }
    while (!banned && fgets(line, sizeof(line), list) != NULL) {
        banned = is_banned_by(line, address, now);
    }
    (void)fclose(list);
    return banned;
}
