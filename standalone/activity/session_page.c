#include "standalone/activity/session_page.h"

#include <fcntl.h>
#include <inttypes.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <unistd.h>

_Static_assert(sizeof(struct velt_session_page) == velt_page_size, "a page is one page of memory");

enum {
    fields_before_start = 20, /* of /proc/self/stat, behind the program's name */
    digits_of_boot = 8
};

static ssize_t read_file(const char* path, char* text, size_t size) {
    int file = open(path, O_RDONLY | O_CLOEXEC);
    ssize_t length = file >= 0 ? read(file, text, size - 1) : -1;

    if (file >= 0) {
        (void)close(file);
    }
    text[length > 0 ? length : 0] = '\0';
    return length;
}

/* In clock ticks since the machine began; 0 when it cannot be told. */
static uint64_t own_start(void) {
    char text[1024];

    if (read_file("/proc/self/stat", text, sizeof(text)) <= 0) {
        return 0;
    }
    const char* at = strrchr(text, ')');
    for (int i = 0; at != NULL && i < fields_before_start; i++) {
        at = strchr(at + 1, ' ');
    }
    return at != NULL ? strtoull(at, NULL, 10) : 0;
}

/* To the base of 36. */
static const char* short_number(uint64_t number, char text[16]) {
    char* at = text + 15;

    *at = '\0';
    do {
        *--at = "0123456789abcdefghijklmnopqrstuvwxyz"[number % 36];
        number /= 36;
    } while (number > 0);
    return at;
}

int velt_name_session(char name[velt_session_name_size]) {
    char boot[64];
    char pid[16];
    char start[16];

    if (read_file("/proc/sys/kernel/random/boot_id", boot, sizeof(boot)) < digits_of_boot) {
        return -1;
    }
    (void)snprintf(name, velt_session_name_size, "%s-%s-%.*s", short_number((uint64_t)getpid(), pid),
                   short_number(own_start(), start), (int)digits_of_boot, boot);
    return 0;
}
