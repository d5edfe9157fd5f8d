/* Changes files by functions that sftp_files.c does not know, and by others. */
#include <fcntl.h>
#include <stdio.h>
#include <sys/stat.h>
#include <unistd.h>

int main(int count, char** arguments) {
    (void)arguments;
    if (count > 9) {
        int file = openat(AT_FDCWD, "/dev/null", O_RDONLY);
        return file + renameat2(file, "", file, "", 0) + chmod("", 0) + unlink("") + fsync(file);
    }
    return 0;
}
