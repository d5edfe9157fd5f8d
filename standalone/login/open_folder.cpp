#include "standalone/login/open_folder.h"

#include <fcntl.h>
#include <grp.h>
#include <linux/openat2.h>
#include <sys/fsuid.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>

namespace velt {
namespace {

constexpr int asFolder = O_PATH | O_DIRECTORY | O_CLOEXEC;

// While it lives, files are opened as the user would open them: the kernel takes root's capabilities over
// files away with the number.
class FileRightsOf {
public:
    explicit FileRightsOf(const Login& login) : taken_(setgroups(login.gids.size(), login.gids.data()) == 0) {
        setfsgid(login.gids.front());
        setfsuid(login.uid);
        // Neither call tells whether it failed, but each answers who it was before.
        taken_ = taken_ && static_cast<uid_t>(setfsuid(login.uid)) == login.uid &&
                 static_cast<gid_t>(setfsgid(login.gids.front())) == login.gids.front();
    }
    ~FileRightsOf() {
        setfsuid(geteuid());
        setfsgid(getegid());
        setgroups(0, nullptr);
    }
    FileRightsOf(const FileRightsOf&) = delete;
    FileRightsOf& operator=(const FileRightsOf&) = delete;

    bool taken() const { return taken_; }

private:
    bool taken_;
};

UniqueFd openBelow(const UniqueFd& folder, const std::filesystem::path& path, unsigned long long resolve) {
    open_how how{};
    how.flags = asFolder;
    how.resolve = resolve;
    // The kernel gives up when folders move while it follows a path that must stay below one.
    for (int attempt = 0; attempt < 100; attempt++) {
        const long fd = syscall(SYS_openat2, folder.get(), path.c_str(), &how, sizeof how);
        if (fd >= 0 || errno != EAGAIN) {
            return UniqueFd(static_cast<int>(fd));
        }
    }
    return UniqueFd();
}

} // namespace

UniqueFd openFolder(const std::filesystem::path& path) {
    return UniqueFd(open(path.c_str(), asFolder));
}

UniqueFd openFolderAs(const Login& login, const std::filesystem::path& path) {
    const FileRightsOf rights(login);
    if (!rights.taken()) {
        errno = EPERM;
        return UniqueFd();
    }
    return openFolder(path);
}

UniqueFd openFolderBelow(const Login& login, const UniqueFd& folder, const std::filesystem::path& path) {
    const FileRightsOf rights(login);
    if (!rights.taken()) {
        errno = EPERM;
        return UniqueFd();
    }
    return openBelow(folder, path, RESOLVE_BENEATH | RESOLVE_NO_MAGICLINKS);
}

UniqueFd openFolderExactly(const UniqueFd& folder, const std::filesystem::path& path) {
    return openBelow(folder, path, RESOLVE_BENEATH | RESOLVE_NO_SYMLINKS);
}

std::filesystem::path placeOf(const UniqueFd& folder) {
    std::error_code error;
    std::filesystem::path place =
        std::filesystem::read_symlink("/proc/self/fd/" + std::to_string(folder.get()), error);
    struct stat here {};
    struct stat there {};
    // The kernel marks the place of a removed folder in words that could be a name as well.
    if (error || fstat(folder.get(), &here) < 0 || stat(place.c_str(), &there) < 0 ||
        here.st_dev != there.st_dev || here.st_ino != there.st_ino) {
        return {};
    }
    return place;
}

} // namespace velt
