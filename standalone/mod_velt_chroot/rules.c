#include "standalone/mod_velt_chroot/rules.h"

#include <errno.h>
#include <fcntl.h>
#include <stdlib.h>
#include <string.h>
#include <sys/stat.h>
#include <unistd.h>

static int is_ours_alone(int fd) {
    struct stat st;

    if (fstat(fd, &st) < 0 || !S_ISREG(st.st_mode)) {
        return 0;
    }
    return (st.st_uid == 0 || st.st_uid == getuid()) && (st.st_mode & (S_IWGRP | S_IWOTH)) == 0;
}

int velt_lines_open(struct velt_lines* lines, const char* path, const char* header) {
    int fd = open(path, O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK);

    if (fd < 0) {
        return -1;
    }
    lines->file = is_ours_alone(fd) ? fdopen(fd, "r") : NULL;
    if (lines->file == NULL) {
        (void)close(fd);
        return -1;
    }
    if (velt_lines_next(lines) <= 0 || strcmp(lines->text, header) != 0) {
        velt_lines_close(lines);
        return -1;
    }
    return 0;
}

int velt_lines_next(struct velt_lines* lines) {
    size_t length = 0;
    int c = EOF;

    while ((c = getc(lines->file)) != EOF && c != '\n') {
        if (c == '\0' || length + 1 >= sizeof(lines->text)) {
            return -1;
        }
        lines->text[length++] = (char)c;
    }
    lines->text[length] = '\0';
    if (c == '\n') {
        return 1;
    }
    return length == 0 && !ferror(lines->file) ? 0 : -1;
}

void velt_lines_close(struct velt_lines* lines) {
    (void)fclose(lines->file);
    lines->file = NULL;
}

/* Each component must say something, and none may lead elsewhere. */
static int is_plain_path(const char* path) {
    if (*path != '/') {
        return 0;
    }
    while (*path == '/') {
        const char* component = path + 1;
        size_t length = strcspn(component, "/");

        if (length == 0 || (length == 1 && component[0] == '.') ||
            (length == 2 && component[0] == '.' && component[1] == '.')) {
            return 0;
        }
        path = component + length;
    }
    return 1;
}

int velt_rule_parse(const char* line, struct velt_rule* rule) {
    char* end = NULL;

    if ((line[0] != 'u' && line[0] != 'g') || line[1] != ':' || line[2] < '0' || line[2] > '9') {
        return -1;
    }
    errno = 0;
    rule->is_user = line[0] == 'u';
    rule->id = strtoul(line + 2, &end, 10);
    if (errno != 0 || rule->id > 0xfffffffeUL || *end != ':' || !is_plain_path(end + 1)) {
        return -1;
    }
    rule->path = end + 1;
    return 0;
}
