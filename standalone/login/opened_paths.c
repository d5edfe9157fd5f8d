#include "standalone/login/opened_paths.h"

#include <stddef.h>
#include <stdlib.h>
#include <string.h>

static char** paths = NULL;
static size_t count = 0;

static int make_room(size_t needed) {
    char** larger = needed > count ? realloc(paths, needed * sizeof(*paths)) : paths;
    if (larger == NULL) {
        return 0;
    }
    for (size_t i = count; i < needed; i++) {
        larger[i] = NULL;
    }
    paths = larger;
    count = needed > count ? needed : count;
    return 1;
}

void velt_note_opened(int descriptor, const char* path) {
    const size_t place = (size_t)descriptor;

    if (place < count) {
        free(paths[place]);
        paths[place] = NULL;
    }
    if (make_room(place + 1)) {
        paths[place] = strdup(path);
    }
}

const char* velt_path_of_opened(int descriptor) {
    return descriptor >= 0 && (size_t)descriptor < count ? paths[descriptor] : NULL;
}
