#include "standalone/login/recorded_path.h"

#include <stdio.h>
#include <stdlib.h>
#include <string.h>

/* Absolute and without "/" at the end, but as it is otherwise. */
static void make_absolute(const char* path, char absolute[PATH_MAX]) {
    char folder[PATH_MAX] = "";

    /* What is too long is no path that anything is done to. */
    if (path[0] != '/' && realpath(".", folder) == NULL) {
        folder[0] = '\0';
    }
    const char* between = path[0] == '/' || strcmp(folder, "/") == 0 ? "" : "/";
    if (snprintf(absolute, PATH_MAX, "%s%s%s", path[0] == '/' ? "" : folder, between, path) >= PATH_MAX) {
        absolute[PATH_MAX - 1] = '\0';
    }
    for (size_t length = strlen(absolute); length > 1 && absolute[length - 1] == '/'; length--) {
        absolute[length - 1] = '\0';
    }
}

static int is_name(const char* text) {
    return text[0] != '\0' && strcmp(text, ".") != 0 && strcmp(text, "..") != 0;
}

/* The folder without links, then the name. 0 when that cannot be. */
static int resolve_folder(const char* absolute, char resolved[PATH_MAX]) {
    char folder[PATH_MAX];
    const char* name = strrchr(absolute, '/') + 1;
    size_t length = (size_t)(name - absolute);

    if (!is_name(name)) {
        return realpath(absolute, resolved) != NULL;
    }
    memcpy(folder, absolute, length);
    folder[length] = '\0';
    if (realpath(folder, resolved) == NULL) {
        return 0;
    }
    length = strcmp(resolved, "/") == 0 ? 0 : strlen(resolved);
    return snprintf(resolved + length, PATH_MAX - length, "/%s", name) < (int)(PATH_MAX - length);
}

void velt_resolve_path(const char* path, int follow, char resolved[PATH_MAX]) {
    char absolute[PATH_MAX];

    make_absolute(path, absolute);
    if ((follow && realpath(absolute, resolved) != NULL) || resolve_folder(absolute, resolved)) {
        return;
    }
    memcpy(resolved, absolute, strlen(absolute) + 1);
}
