#include "standalone/login/kept_objects.h"

#include <errno.h>
#include <fcntl.h>
#include <search.h>
#include <stdlib.h>
#include <string.h>
#include <strings.h>

/* Both kinds of entries in a tree begin with it. */
struct key {
    dev_t device;
    ino_t number;
};

struct kept {
    struct key key;
    int whole;
    int around_home;
};

struct kept_name {
    struct kept_name* next;
    struct key object; /* what stood there */
    int existed;
    int whole;
    char name[];
};

struct folder {
    struct key key;
    struct kept_name* names;
};

/* There may be ten thousands of them. */
struct set {
    void* objects;
    void* folders;
};

static struct set looked_up; /* until the homes are looked at again */
static struct set told;      /* for all of the login */

int velt_is_same_object(const struct stat* one, const struct stat* other) {
    return one->st_dev == other->st_dev && one->st_ino == other->st_ino;
}

static struct key key_of(const struct stat* object) {
    const struct key key = {object->st_dev, object->st_ino};
    return key;
}

static int compare(const void* one, const void* other) {
    const struct key* a = one;
    const struct key* b = other;

    if (a->device != b->device) {
        return a->device < b->device ? -1 : 1;
    }
    return a->number < b->number ? -1 : a->number > b->number;
}

static void* find(void* const* tree, const struct stat* object) {
    const struct key key = key_of(object);
    void* const* found = tfind(&key, tree, compare);
    return found != NULL ? *found : NULL;
}

/* The entry of the object, which is made where it is missing, with zeros behind the key. NULL with errno. */
static void* find_or_add(void** tree, const struct stat* object, size_t size) {
    const struct key key = key_of(object);
    void* entry = find(tree, object);

    if (entry != NULL) {
        return entry;
    }
    entry = calloc(1, size);
    if (entry == NULL) {
        return NULL;
    }
    memcpy(entry, &key, sizeof(key));
    if (tsearch(entry, tree, compare) == NULL) {
        free(entry);
        errno = ENOMEM;
        return NULL;
    }
    return entry;
}

static struct kept_name* find_name(const struct folder* folder, const char* name) {
    struct kept_name* at = folder != NULL ? folder->names : NULL;

    while (at != NULL && strcasecmp(at->name, name) != 0) {
        at = at->next;
    }
    return at;
}

static int add_name(struct set* set, const struct stat* in, const char* name, const struct stat* object,
                    int whole) {
    struct folder* folder = find_or_add(&set->folders, in, sizeof(*folder));
    struct kept_name* known = find_name(folder, name);

    if (known != NULL) {
        known->whole |= whole;
        return 0;
    }
    struct kept_name* added = folder != NULL ? calloc(1, sizeof(*added) + strlen(name) + 1) : NULL;
    if (added == NULL) {
        return -1;
    }
    memcpy(added->name, name, strlen(name) + 1);
    added->existed = object != NULL;
    if (object != NULL) {
        added->object = key_of(object);
    }
    added->whole = whole;
    added->next = folder->names;
    folder->names = added;
    return 0;
}

static void free_folder(void* entry) {
    struct folder* folder = entry;

    while (folder->names != NULL) {
        struct kept_name* next = folder->names->next;
        free(folder->names);
        folder->names = next;
    }
    free(folder);
}

static void forget(struct set* set) {
    tdestroy(set->objects, free);
    tdestroy(set->folders, free_folder);
    memset(set, 0, sizeof(*set));
}

int velt_keep_object(const struct stat* object, int whole) {
    struct kept* added = find_or_add(&looked_up.objects, object, sizeof(*added));
    if (added == NULL) {
        return -1;
    }
    added->whole |= whole;
    return 0;
}

int velt_keep_way_to_home(const struct velt_way_step* step) {
    struct kept* added = find_or_add(&looked_up.objects, step->what, sizeof(*added));
    if (added == NULL) {
        return -1;
    }
    added->around_home = 1;
    return 0;
}

int velt_keep_name(const struct stat* folder, const char* name, const struct stat* object, int whole) {
    return add_name(&looked_up, folder, name, object, whole);
}

int velt_keep_told_name(const struct stat* folder, const char* name, const struct stat* object) {
    if (object != NULL && find_or_add(&told.objects, object, sizeof(struct kept)) == NULL) {
        return -1;
    }
    return add_name(&told, folder, name, object, 0);
}

void velt_forget_kept(void) {
    forget(&looked_up);
}

void velt_forget_told(void) {
    forget(&told);
}

int velt_is_kept(const struct stat* object, int whole_only) {
    const struct kept* known = find(&looked_up.objects, object);
    if (known != NULL && (known->whole || !whole_only)) {
        return 1;
    }
    return !whole_only && find(&told.objects, object) != NULL;
}

int velt_is_around_home(const struct stat* object) {
    const struct kept* known = find(&looked_up.objects, object);
    return known != NULL && known->around_home;
}

static int is_name_in(const struct set* set, const struct stat* folder, const char* name, int exists,
                      int whole_only) {
    const struct kept_name* known = find_name(find(&set->folders, folder), name);
    return known != NULL && (!whole_only || known->whole || !exists || !known->existed);
}

int velt_is_kept_name(const struct stat* folder, const char* name, int exists, int whole_only) {
    return is_name_in(&looked_up, folder, name, exists, whole_only) ||
           is_name_in(&told, folder, name, exists, whole_only);
}

/* Whether the child stands at this name of the folder now. 1, 0, or -1 with errno. */
static int stands_at(const struct kept_name* name, int folder, const struct stat* child) {
    struct stat status;

    if (fstatat(folder, name->name, &status, AT_SYMLINK_NOFOLLOW) == 0) {
        return velt_is_same_object(&status, child);
    }
    return errno == ENOENT || errno == ENOTDIR || errno == EACCES ? 0 : -1;
}

static int is_below(const struct set* set, int folder, const struct stat* here, const struct stat* child) {
    const struct folder* known = find(&set->folders, here);
    const struct kept_name* const first = known != NULL ? known->names : NULL;
    const struct key key = key_of(child);
    int result = 0;

    /* A folder has one name. Mostly it is the one that it had. */
    for (const struct kept_name* at = first; at != NULL; at = at->next) {
        if (at->existed && compare(&at->object, &key) == 0 && stands_at(at, folder, child) == 1) {
            return at->whole;
        }
    }
    for (const struct kept_name* at = first; at != NULL && result == 0; at = at->next) {
        result = stands_at(at, folder, child);
    }
    return result;
}

int velt_is_kept_below(int folder, const struct stat* here, const struct stat* child, int whole_only) {
    const int result = is_below(&looked_up, folder, here, child);
    return result != 0 || whole_only ? result : is_below(&told, folder, here, child);
}
