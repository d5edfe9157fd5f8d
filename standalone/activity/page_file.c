#include "standalone/activity/page_file.h"

#include <dirent.h>
#include <fcntl.h>
#include <stdio.h>
#include <string.h>
#include <sys/file.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

enum {
    most_looks = 64,
    private_file = 0600
};

/* Under another name until it is whole and locked: without a lock it would look like one of a session that
 * has ended. The lock stays with the mapping. */
struct velt_session_page* velt_make_page(int folder, const char* name, int* file) {
    char hidden[velt_session_name_size + 1];
    void* made = MAP_FAILED;

    (void)snprintf(hidden, sizeof(hidden), ".%s", name);
    (void)unlinkat(folder, hidden, 0);
    *file = openat(folder, hidden, O_RDWR | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, private_file);
    if (*file < 0) {
        return NULL;
    }
    if (flock(*file, LOCK_EX | LOCK_NB) == 0 && posix_fallocate(*file, 0, velt_page_size) == 0) {
        made = mmap(NULL, velt_page_size, PROT_READ | PROT_WRITE, MAP_SHARED, *file, 0);
    }
    if (made == MAP_FAILED || renameat(folder, hidden, folder, name) < 0) {
        (void)unlinkat(folder, hidden, 0);
    }
    return made != MAP_FAILED ? made : NULL;
}

/* Empty, or without a session and with its last word said. */
static int has_ended(int folder, const char* name) {
    struct stat status;
    uint32_t closed = 0;
    int file = openat(folder, name, O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC);

    if (file < 0) {
        return 0;
    }
    int ended =
        fstat(file, &status) == 0 && S_ISREG(status.st_mode) &&
        (status.st_size == 0 || (status.st_size == velt_page_size && flock(file, LOCK_SH | LOCK_NB) == 0 &&
                                 pread(file, &closed, sizeof(closed),
                                       offsetof(struct velt_session_page, closed)) == sizeof(closed) &&
                                 closed));
    (void)close(file);
    return ended;
}

/* Those who may not remove their page leave it. Some of these go with each login, so that they stay few also
 * while nobody reads the pages. */
void velt_remove_ended_pages(int folder) {
    int file = openat(folder, ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    DIR* names = file >= 0 ? fdopendir(file) : NULL;
    const struct dirent* entry = NULL;

    for (int i = 0; names != NULL && i < most_looks && (entry = readdir(names)) != NULL; i++) {
        if (strchr(entry->d_name, '-') != NULL && entry->d_name[0] != '.' &&
            has_ended(folder, entry->d_name)) {
            (void)unlinkat(folder, entry->d_name, 0);
        }
    }
    if (names != NULL) {
        (void)closedir(names);
    } else if (file >= 0) {
        (void)close(file);
    }
}
