/* Reading the chroot rules and the map of shares at a login. */
#ifndef VELT_MOD_VELT_CHROOT_RULES_H
#define VELT_MOD_VELT_CHROOT_RULES_H

#include <stdio.h>

/* The first line of either file. */
#define VELT_RULES_HEADER "velt-chroot-rules 1"
#define VELT_SHARES_HEADER "velt-share-map 1"

/* The lines of a small text file, one after the other. */
struct velt_lines {
    FILE* file;
    char text[8192]; /* the current line, without its end */
};

/* Opens the file and reads its first line, which must be `header`. The file must belong to root, or to whom
 * this process belongs, and nobody else may write it. Negative on failure, with nothing to close. */
int velt_lines_open(struct velt_lines* lines, const char* path, const char* header);

/* Reads the next line into `text`: 1 when there is one, 0 at the end, negative when the file cannot be read,
 * a line is too long, contains a NUL, or the last one has no end. */
int velt_lines_next(struct velt_lines* lines);

void velt_lines_close(struct velt_lines* lines);

struct velt_rule {
    int is_user;
    unsigned long id;
    const char* path; /* in the parsed line; absolute, without "." and ".." */
};

/* Reads "u:1000:/share/below" or "g:100:/home". Negative when the line is no rule. */
int velt_rule_parse(const char* line, struct velt_rule* rule);

#endif
