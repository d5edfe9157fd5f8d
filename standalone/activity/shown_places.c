#include "standalone/activity/shown_places.h"

#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/stat.h>
#include <unistd.h>

enum {
    longest_description = 1 << 20
};

/* Ends with an empty text. */
static char* facts = NULL;

static char* read_whole(int file) {
    struct stat status;

    if (file < 0 || fstat(file, &status) < 0 || status.st_size <= 0 || status.st_size > longest_description) {
        return NULL;
    }
    size_t size = (size_t)status.st_size;
    char* text = calloc(size + 2, 1);
    if (text != NULL && pread(file, text, size, 0) != (ssize_t)size) {
        free(text);
        return NULL;
    }
    return text;
}

void velt_note_shown_places(int file) {
    free(facts);
    facts = read_whole(file);
}

struct fact {
    const char* kind;
    const char* name;
    const char* path;
};

/* The fact at `at`, and then what follows it. NULL at the end. */
static const char* next_fact(const char* at, struct fact* fact) {
    const char** const parts[] = {&fact->kind, &fact->name, &fact->path};

    for (size_t i = 0; i < sizeof(parts) / sizeof(parts[0]); i++) {
        if (at == NULL || *at == '\0') {
            return NULL;
        }
        *parts[i] = at;
        at += strlen(at) + 1;
    }
    return at;
}

/* What follows `folder` in the path, beginning with '/' or empty; NULL where the path is not within it. */
static const char* rest_within(const char* folder, const char* path) {
    size_t length = strcmp(folder, "/") == 0 ? 0 : strlen(folder);

    if (strncmp(folder, path, length) != 0 || (path[length] != '/' && path[length] != '\0')) {
        return NULL;
    }
    return strcmp(path + length, "/") == 0 ? "" : path + length;
}

static void find_server_path(const char* path, struct velt_shown_place* place) {
    struct fact fact;
    size_t longest = 0;
    const char* at = facts;

    while ((at = next_fact(at, &fact)) != NULL) {
        const char* rest = strcmp(fact.kind, "view") == 0 ? rest_within(fact.name, path) : NULL;
        const char* folder = strcmp(fact.path, "/") == 0 ? "" : fact.path;
        if (rest != NULL && strlen(fact.name) > longest &&
            snprintf(place->server_path, sizeof(place->server_path), "%s%s", folder, rest) <
                (int)sizeof(place->server_path)) {
            longest = strlen(fact.name);
        }
    }
    if (longest == 0) {
        place->server_path[0] = '\0';
    }
}

static void find_share(struct velt_shown_place* place) {
    struct fact fact;
    size_t longest = 0;
    const char* at = facts;

    while ((at = next_fact(at, &fact)) != NULL) {
        const char* rest =
            strcmp(fact.kind, "share") == 0 ? rest_within(fact.path, place->server_path) : NULL;
        if (rest != NULL && strlen(fact.path) > longest) {
            longest = strlen(fact.path);
            place->share = fact.name;
            place->share_path = *rest == '/' ? rest + 1 : rest;
        }
    }
}

void velt_find_shown_place(const char* path, struct velt_shown_place* place) {
    place->share = "";
    place->share_path = "";
    if (facts == NULL || *path == '\0') {
        (void)snprintf(place->server_path, sizeof(place->server_path), "%s", path);
        return;
    }
    find_server_path(path, place);
    if (place->server_path[0] != '\0') {
        find_share(place);
    }
}
