#include "standalone/login/open_folder.h"

#include "base/file.h"
#include "standalone/core/error_number.h"

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

// While it lives, files are opened with the user's rights: with the user's number for file access the kernel
// also drops root's capabilities over files.
class FileRightsOf {
public:
    explicit FileRightsOf(const Identity& user) : taken_(setgroups(user.gids.size(), user.gids.data()) == 0) {
        setfsgid(user.gids.front());
        setfsuid(user.uid);
        // Neither call reports a failure, but each returns the number before it.
        taken_ = taken_ && static_cast<uid_t>(setfsuid(user.uid)) == user.uid &&
                 static_cast<gid_t>(setfsgid(user.gids.front())) == user.gids.front();
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

Result<UniqueFd> openBelow(const UniqueFd& folder, const std::filesystem::path& path,
                           unsigned long long resolve) {
    open_how how{};
    how.flags = asFolder;
    how.resolve = resolve;
    // The kernel gives up (EAGAIN) when folders are moved while it resolves the path.
    for (int attempt = 0; attempt < 100; attempt++) {
        const long fd = syscall(SYS_openat2, folder.get(), path.c_str(), &how, sizeof how);
        if (fd >= 0) {
            return UniqueFd(static_cast<int>(fd));
        }
        if (errno != EAGAIN) {
            break;
        }
    }
    const int error = errno;
    return cannot("open", placeOf(folder).valueOr({}) / path, error);
}

/// Opens with the user's rights, and looks for the place without them again.
template<class Open>
Result<OpenedFolder> openAs(const Identity& user, const std::filesystem::path& path, Open&& open) {
    const auto openWithRights = [&]() -> Result<UniqueFd> {
        const FileRightsOf rights(user);
        return rights.taken() ? open() : cannot("open", path, EPERM);
    };
    VELT_ASSIGN_OR_RETURN(UniqueFd folder, openWithRights());
    VELT_ASSIGN_OR_RETURN(const auto place, placeOf(folder));
    return OpenedFolder{std::move(folder), place};
}

} // namespace

Result<UniqueFd> openFolder(const std::filesystem::path& path) {
    UniqueFd folder(open(path.c_str(), asFolder));
    return folder ? Result<UniqueFd>(std::move(folder)) : cannot("open", path);
}

Result<OpenedFolder> openFolderAs(const Identity& user, const std::filesystem::path& path) {
    return openAs(user, path, [&] { return openFolder(path); });
}

Result<OpenedFolder> openFolderBelow(const Identity& user, const UniqueFd& folder,
                                     const std::filesystem::path& path) {
    return openAs(user, path,
                  [&] { return openBelow(folder, path, RESOLVE_BENEATH | RESOLVE_NO_MAGICLINKS); });
}

Result<UniqueFd> openFolderExactly(const UniqueFd& folder, const std::filesystem::path& path) {
    return openBelow(folder, path, RESOLVE_BENEATH | RESOLVE_NO_SYMLINKS);
}

Result<std::filesystem::path> placeOf(const UniqueFd& folder) {
    std::error_code error;
    std::filesystem::path place =
        std::filesystem::read_symlink("/proc/self/fd/" + std::to_string(folder.get()), error);
    struct stat here {};
    struct stat there {};
    // The kernel marks a removed folder with " (deleted)", which could also be part of a name.
    if (error || fstat(folder.get(), &here) < 0 || stat(place.c_str(), &there) < 0 ||
        here.st_dev != there.st_dev || here.st_ino != there.st_ino) {
        return Error(ErrorNumber::store, "The folder was removed or moved during the login.");
    }
    return place;
}

} // namespace velt
