// velt-share-root LIST FOLDER PROGRAM ARGUMENTS...
//
// Gives a daemon a mount namespace of its own in which the shares stand side by side below FOLDER, as LIST
// says, and becomes that daemon. The server's own mount table stays as it is, and everything is gone when the
// daemon has ended.
//
// LIST has one line per share: "ro" or "rw", the place below FOLDER, and the share's folder, separated by
// tabs.
#include <fcntl.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <sched.h>
#include <string>

namespace {

[[noreturn]] void giveUp(const std::string& what) {
    std::fprintf(stderr, "velt-share-root: %s: %s\n", what.c_str(), std::strerror(errno));
    std::exit(EXIT_FAILURE);
}

void leaveOut(const std::string& what, int error) {
    std::fprintf(stderr, "velt-share-root: %s: %s; the share is left out\n", what.c_str(),
                 std::strerror(error));
}

struct Place {
    bool readOnly = false;
    std::string name;
    std::string folder;
};

bool leadsUp(const std::string& path) {
    return ("/" + path + "/").find("/../") != std::string::npos;
}

Place parsePlace(const std::string& line) {
    const auto first = line.find('\t');
    const auto second = line.find('\t', first == std::string::npos ? first : first + 1);
    if (second == std::string::npos) {
        errno = EINVAL;
        giveUp("the list of shares");
    }
    Place place{line.substr(0, first) == "ro", line.substr(first + 1, second - first - 1),
                line.substr(second + 1)};
    if (leadsUp(place.name)) {
        errno = EINVAL;
        giveUp("the list of shares");
    }
    return place;
}

// Adds to what the server's own mounts are restricted by already; a plain remount would lift that.
bool restrict(const std::string& target, bool readOnly) {
    mount_attr attributes{};
    attributes.attr_set = MOUNT_ATTR_NOSUID | MOUNT_ATTR_NODEV;
    if (readOnly) {
        attributes.attr_set |= MOUNT_ATTR_RDONLY;
    }
    return mount_setattr(AT_FDCWD, target.c_str(), AT_RECURSIVE, &attributes, sizeof attributes) == 0;
}

// A share that cannot be shown is left out, so that the others can still be reached.
void mountShare(const std::string& root, const Place& place) {
    const std::string target = root + "/" + place.name;
    std::error_code error;
    if (!std::filesystem::is_directory(place.folder, error)) {
        leaveOut(place.folder, error ? error.value() : ENOTDIR);
        return;
    }
    if (!std::filesystem::create_directories(target, error) && error) {
        leaveOut(target, error.value());
        return;
    }
    if (mount(place.folder.c_str(), target.c_str(), nullptr, MS_BIND | MS_REC, nullptr) < 0) {
        const int reason = errno;
        rmdir(target.c_str());
        leaveOut("mount " + place.folder, reason);
        return;
    }
    if (!restrict(target, place.readOnly)) {
        const int reason = errno;
        // It must not stay there with more rights than it should give.
        if (umount2(target.c_str(), MNT_DETACH) < 0) {
            giveUp("umount " + place.folder);
        }
        rmdir(target.c_str());
        leaveOut("restrict " + place.folder, reason);
    }
}

void makeRoot(const std::string& list, const std::string& root) {
    if (unshare(CLONE_NEWNS) < 0) {
        giveUp("unshare");
    }
    // What the server mounts later shows here, nothing of ours shows there.
    if (mount(nullptr, "/", nullptr, MS_REC | MS_SLAVE, nullptr) < 0) {
        giveUp("mount /");
    }
    if (mount("velt-shares", root.c_str(), "tmpfs", MS_NOSUID | MS_NODEV | MS_NOEXEC, "mode=0755,size=1m") <
        0) {
        giveUp("mount " + root);
    }
    std::ifstream lines(list);
    if (!lines) {
        giveUp(list);
    }
    for (const char* tree : {"/users", "/anonymous"}) {
        if (mkdir((root + tree).c_str(), 0755) < 0) {
            giveUp(root + tree);
        }
    }
    for (std::string line; std::getline(lines, line);) {
        mountShare(root, parsePlace(line));
    }
    if (mount(nullptr, root.c_str(), nullptr, MS_REMOUNT | MS_BIND | MS_RDONLY | MS_NOSUID | MS_NODEV,
              nullptr) < 0) {
        giveUp("remount " + root);
    }
}

} // namespace

int main(int count, char** arguments) {
    if (count < 4) {
        std::fprintf(stderr, "usage: velt-share-root LIST FOLDER PROGRAM ARGUMENTS...\n");
        return EXIT_FAILURE;
    }
    umask(022);
    makeRoot(arguments[1], arguments[2]);
    execv(arguments[3], arguments + 3);
    giveUp(arguments[3]);
}
