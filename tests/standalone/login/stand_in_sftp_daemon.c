/* As the SFTP daemon at a login of the user "ann", with velt-sftp-session.so loaded before the C library:
 * takes the user's groups, makes ROOT its root directory, becomes the user, and serves.
 *
 *     stand-in-sftp look|change ROOT PATH...
 *
 * Tells what it sees, a line for each: "see /team/plan", and "write /team/plan" where the view lets that be
 * changed. Tries all changes with each PATH. In the first way calls may fail until it is logged in, in the
 * second while it tries. */
#include <dirent.h>
#include <fcntl.h>
#include <grp.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <sys/time.h>
#include <unistd.h>

enum {
    ann = 54321,
    longest_path = 4096
};

/* What the sweep of faults listens to. */
static void mark(const char* text) {
    (void)access(text, F_OK);
}

static int log_in(const char* root) {
    if (setgid(ann) < 0 || initgroups("ann", ann) < 0 || chroot(root) < 0 || chdir("/") < 0) {
        return -1;
    }
    closefrom(STDERR_FILENO + 1);
    return setresuid(ann, ann, ann);
}

/* What is in the folder, whose path "" is that of the root. */
static void tell(const char* folder) {
    char path[longest_path];
    struct statvfs mounted;
    struct stat status;

    DIR* list = opendir(folder[0] == '\0' ? "/" : folder);
    for (struct dirent* entry = NULL; list != NULL && (entry = readdir(list)) != NULL;) {
        if (strcmp(entry->d_name, ".") == 0 || strcmp(entry->d_name, "..") == 0) {
            continue;
        }
        (void)snprintf(path, sizeof(path), "%s/%s", folder, entry->d_name);
        (void)printf("see %s\n", path);
        if (statvfs(path, &mounted) == 0 && (mounted.f_flag & ST_RDONLY) == 0) {
            (void)printf("write %s\n", path);
        }
        if (lstat(path, &status) == 0 && S_ISDIR(status.st_mode)) {
            tell(path);
        }
    }
    if (list != NULL) {
        (void)closedir(list);
    }
}

static void try_to_write(const char* path) {
    int file = open(path, O_WRONLY | O_TRUNC);
    if (file < 0) {
        file = open(path, O_RDWR | O_CREAT, 0666);
    }
    if (file >= 0) {
        (void)!write(file, "new", 3);
        (void)close(file);
    }
    file = open(path, O_RDONLY);
    if (file >= 0) {
        (void)fchmod(file, 0666);
        (void)close(file);
    }
}

static void try_to_change(const char* path) {
    const struct timeval times[2] = {{1, 0}, {1, 0}};

    try_to_write(path);
    (void)!truncate(path, 1);
    (void)chmod(path, 0666);
    (void)utimes(path, times);
    (void)!link(path, "/again");
    (void)rename(path, "/moved");
    (void)rename("/letter", path);
    (void)!link("/letter", path);
    (void)!symlink("/letter", path);
    (void)mkdir(path, 0777);
    (void)unlink(path);
    (void)rmdir(path);
}

int main(int count, char** words) {
    if (count < 3) {
        return EXIT_FAILURE;
    }
    const int looks = strcmp(words[1], "look") == 0;
    if (log_in(words[2]) < 0) {
        (void)printf("refused\n");
        return EXIT_FAILURE;
    }
    if (looks) {
        mark("/end of the faults");
        tell("");
    } else {
        mark("/begin of the faults");
    }
    for (int i = 3; i < count; i++) {
        try_to_change(words[i]);
    }
    mark("/end of the faults");
    (void)printf("tried\n");
    return EXIT_SUCCESS;
}
