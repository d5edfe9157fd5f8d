/* A record as a line of text: RS, a JSON object, LF (RFC 7464). What was cut off, by a full disk for
 * instance, does not end with LF before the next RS, so nobody takes it for a record. */
#ifndef VELT_STANDALONE_ACTIVITY_RECORD_LINE_H
#define VELT_STANDALONE_ACTIVITY_RECORD_LINE_H

#include <stddef.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

enum {
    velt_longest_line = 16384,
    velt_longest_text = velt_longest_line, /* where none is to be cut that fits */
    velt_record_separator = 0x1e
};

/* A member of the object: a text, or a number where `text` is NULL. */
struct velt_member {
    const char* name;
    const char* text;
    int64_t number;
};

/* Writes the members into `line` and returns the line's length. A member whose text is "" or whose number is
 * negative is left out.
 *
 * Texts may hold any octets. Where one of them is not UTF-8, all are written with '%' and each octet of what
 * is not UTF-8 as "%XX", and the object has "escaped": 1. Texts of more than `longest` octets are cut to
 * that, or to 250 where the line would be too long, and it has "cut": 1. */
size_t velt_make_line(char line[velt_longest_line], const struct velt_member* members, size_t count,
                      size_t longest);

/* The length of the UTF-8 character that the text begins with, 0 when that is none, also at its end. */
size_t velt_character_length(const char* text);

#ifdef __cplusplus
}
#endif

#endif
