#include "standalone/login/kept_objects.h"

#include <stdlib.h>
#include <string.h>
#include <strings.h>

struct kept {
    dev_t device;
    ino_t number;
    int whole;
    int around_home;
};

/* What is made there would be obeyed. */
struct absent {
    struct stat folder;
    char name[NAME_MAX + 1];
};

struct set {
    struct kept* kept;
    size_t kept_count;
    struct absent* absent;
    size_t absent_count;
};

static struct set looked_up; /* until the homes are looked at again */
static struct set told;      /* for all of the login */

int velt_is_same_object(const struct stat* one, const struct stat* other) {
    return one->st_dev == other->st_dev && one->st_ino == other->st_ino;
}

static struct kept* find_kept(const struct set* set, const struct stat* object) {
    for (size_t i = 0; i < set->kept_count; i++) {
        if (set->kept[i].device == object->st_dev && set->kept[i].number == object->st_ino) {
            return &set->kept[i];
        }
    }
    return NULL;
}

static struct kept* append_kept(struct set* set, const struct stat* object) {
    struct kept* larger = realloc(set->kept, (set->kept_count + 1) * sizeof(*set->kept));
    if (larger == NULL) {
        return NULL;
    }
    set->kept = larger;
    struct kept* added = &set->kept[set->kept_count++];
    memset(added, 0, sizeof(*added));
    added->device = object->st_dev;
    added->number = object->st_ino;
    return added;
}

static struct kept* add_kept(struct set* set, const struct stat* object) {
    struct kept* known = find_kept(set, object);
    return known != NULL ? known : append_kept(set, object);
}

static int add_absent(struct set* set, const struct velt_way_end* end) {
    struct absent* larger = realloc(set->absent, (set->absent_count + 1) * sizeof(*set->absent));
    if (larger == NULL) {
        return -1;
    }
    set->absent = larger;
    set->absent[set->absent_count].folder = end->folder;
    memcpy(set->absent[set->absent_count].name, end->name, sizeof(end->name));
    set->absent_count++;
    return 0;
}

static int is_in_set(const struct set* set, const struct stat* folder, const char* name) {
    for (size_t i = 0; i < set->absent_count; i++) {
        if (velt_is_same_object(&set->absent[i].folder, folder) &&
            strcasecmp(set->absent[i].name, name) == 0) {
            return 1;
        }
    }
    return 0;
}

static void forget(struct set* set) {
    free(set->kept);
    free(set->absent);
    memset(set, 0, sizeof(*set));
}

int velt_keep_object(const struct stat* object, int whole) {
    struct kept* added = add_kept(&looked_up, object);
    if (added == NULL) {
        return -1;
    }
    added->whole |= whole;
    return 0;
}

int velt_keep_way_to_home(const struct stat* object, int is_end) {
    struct kept* added = add_kept(&looked_up, object);
    (void)is_end;
    if (added == NULL) {
        return -1;
    }
    added->around_home = 1;
    return 0;
}

int velt_keep_absent(const struct velt_way_end* end) {
    return add_absent(&looked_up, end);
}

int velt_keep_told_object(const struct stat* object) {
    /* There may be ten thousands of them, each told once. */
    return append_kept(&told, object) == NULL ? -1 : 0;
}

int velt_keep_told_absent(const struct velt_way_end* end) {
    return add_absent(&told, end);
}

void velt_forget_kept(void) {
    forget(&looked_up);
}

void velt_forget_told(void) {
    forget(&told);
}

int velt_is_kept(const struct stat* object, int whole_only) {
    const struct kept* known = find_kept(&looked_up, object);
    if (known != NULL && (known->whole || !whole_only)) {
        return 1;
    }
    return !whole_only && find_kept(&told, object) != NULL;
}

int velt_is_around_home(const struct stat* object) {
    const struct kept* known = find_kept(&looked_up, object);
    return known != NULL && known->around_home;
}

int velt_is_kept_absent(const struct stat* folder, const char* name) {
    return is_in_set(&looked_up, folder, name) || is_in_set(&told, folder, name);
}
