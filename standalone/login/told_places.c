#include "standalone/login/told_places.h"

#include "standalone/login/kept_objects.h"

#include <errno.h>
#include <stdlib.h>
#include <string.h>
#include <sys/stat.h>
#include <unistd.h>

/* Ends with an empty text, whatever the file holds. NULL with errno when it cannot be read. */
static char* read_whole(int file, size_t* size) {
    struct stat status;

    if (fstat(file, &status) < 0) {
        return NULL;
    }
    *size = (size_t)status.st_size;
    char* text = calloc(*size + 1, 1);
    if (text != NULL && pread(file, text, *size, 0) != (ssize_t)*size) {
        free(text);
        errno = EIO;
        return NULL;
    }
    return text;
}

/* The object that begins the text, and where it ends; NULL with errno when there is none. */
static const char* read_object(const char* text, struct stat* object) {
    char* between = NULL;
    char* end = NULL;

    memset(object, 0, sizeof(*object));
    object->st_dev = strtoull(text, &between, 10);
    object->st_ino = strtoull(between, &end, 10);
    if (between == text || end == between || (*end != '\0' && *end != ' ')) {
        errno = EINVAL;
        return NULL;
    }
    return end;
}

static int keep_fact(const char* kind, const char* name, const char* place) {
    struct stat folder;
    struct stat object;
    const int exists = strcmp(kind, "kept") == 0;

    if (!exists && strcmp(kind, "absent") != 0) {
        return 0;
    }
    const char* rest = read_object(place, &folder);
    if (rest == NULL || (exists && read_object(rest, &object) == NULL)) {
        return -1;
    }
    return velt_keep_told_name(&folder, name, exists ? &object : NULL);
}

int velt_keep_told_places(int file) {
    size_t size = 0;
    int result = 0;

    if (file < 0) {
        return 0;
    }
    char* text = read_whole(file, &size);
    if (text == NULL) {
        return -1;
    }
    const char* parts[3];
    size_t count = 0;
    for (const char* at = text; result == 0 && at < text + size; at += strlen(at) + 1) {
        parts[count++] = at;
        if (count == sizeof(parts) / sizeof(parts[0])) {
            result = keep_fact(parts[0], parts[1], parts[2]);
            count = 0;
        }
    }
    free(text);
    return result;
}
