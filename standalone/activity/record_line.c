#include "standalone/activity/record_line.h"

#include <inttypes.h>
#include <stdio.h>
#include <string.h>

enum {
    length_when_cut = 250,
    first_printable = 0x20
};

struct line {
    char* text;
    size_t length;
    int escaped;
    size_t longest_text;
    int cut;
    int too_long;
};

static void append(struct line* line, const char* text, size_t length) {
    /* Room for the end stays. */
    if (line->length + length + 32 > velt_longest_line) {
        line->too_long = 1;
        return;
    }
    memcpy(line->text + line->length, text, length);
    line->length += length;
}

static int is_continuation(unsigned char octet) {
    return (octet & 0xc0) == 0x80;
}

/* Of the lead octet; 0 for what cannot begin a character. */
static size_t announced_length(unsigned char octet) {
    if (octet < 0x80) {
        return octet == 0 ? 0 : 1;
    }
    if (octet < 0xc2 || octet > 0xf4) {
        return 0;
    }
    return octet < 0xe0 ? 2 : octet < 0xf0 ? 3 : 4;
}

/* Neither an overlong form, nor half of a pair, nor beyond the last character. */
static int is_well_formed(const unsigned char* octets) {
    switch (octets[0]) {
    case 0xe0:
        return octets[1] >= 0xa0;
    case 0xed:
        return octets[1] < 0xa0;
    case 0xf0:
        return octets[1] >= 0x90;
    case 0xf4:
        return octets[1] < 0x90;
    default:
        return 1;
    }
}

size_t velt_character_length(const char* text) {
    const unsigned char* octets = (const unsigned char*)text;
    size_t length = announced_length(octets[0]);

    for (size_t i = 1; i < length; i++) {
        if (!is_continuation(octets[i])) {
            return 0;
        }
    }
    return length > 1 && !is_well_formed(octets) ? 0 : length;
}

static int is_utf8(const char* text) {
    while (*text != '\0') {
        size_t length = velt_character_length(text);
        if (length == 0) {
            return 0;
        }
        text += length;
    }
    return 1;
}

static void append_hexadecimal(struct line* line, const char* before, unsigned char octet) {
    static const char digits[] = "0123456789ABCDEF";
    const char number[] = {digits[octet / 16], digits[octet % 16]};

    append(line, before, strlen(before));
    append(line, number, sizeof(number));
}

/* One character or, where there is none, one octet. Returns what it took. */
static size_t append_character(struct line* line, const char* text) {
    unsigned char octet = (unsigned char)*text;
    size_t length = velt_character_length(text);

    if (length == 0 || (octet == '%' && line->escaped)) {
        append_hexadecimal(line, "%", octet);
        return 1;
    }
    if (octet < first_printable) {
        append_hexadecimal(line, "\\u00", octet);
    } else if (octet == '"' || octet == '\\') {
        append(line, "\\", 1);
        append(line, text, 1);
    } else {
        append(line, text, length);
    }
    return length;
}

static void append_text(struct line* line, const char* text) {
    append(line, "\"", 1);
    size_t taken = 0;
    while (text[taken] != '\0' && taken < line->longest_text) {
        taken += append_character(line, text + taken);
    }
    line->cut |= text[taken] != '\0';
    append(line, "\"", 1);
}

static void append_member(struct line* line, const struct velt_member* member) {
    char number[24];

    if (member->text != NULL ? member->text[0] == '\0' : member->number < 0) {
        return;
    }
    append(line, line->length > 2 ? ",\"" : "\"", line->length > 2 ? 2 : 1);
    append(line, member->name, strlen(member->name));
    append(line, "\":", 2);
    if (member->text != NULL) {
        append_text(line, member->text);
    } else {
        append(line, number, (size_t)snprintf(number, sizeof(number), "%" PRId64, member->number));
    }
}

static void append_all(struct line* line, const struct velt_member* members, size_t count) {
    line->length = 0;
    line->too_long = 0;
    append(line, "\x1e{", 2);
    for (size_t i = 0; i < count; i++) {
        append_member(line, &members[i]);
    }
}

static int all_utf8(const struct velt_member* members, size_t count) {
    for (size_t i = 0; i < count; i++) {
        if (members[i].text != NULL && !is_utf8(members[i].text)) {
            return 0;
        }
    }
    return 1;
}

static void append_end(struct line* line, const char* text) {
    memcpy(line->text + line->length, text, strlen(text));
    line->length += strlen(text);
}

size_t velt_make_line(char text[velt_longest_line], const struct velt_member* members, size_t count,
                      size_t longest) {
    struct line line = {text, 0, !all_utf8(members, count), longest, 0, 0};

    append_all(&line, members, count);
    if (line.too_long) {
        line.longest_text = length_when_cut;
        append_all(&line, members, count);
    }
    append_end(&line, line.escaped ? ",\"escaped\":1" : "");
    append_end(&line, line.cut ? ",\"cut\":1" : "");
    append_end(&line, "}\n");
    return line.length;
}
