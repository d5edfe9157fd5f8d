#include "standalone/login/open_folder.h"

#include "base/file.h"
#include "standalone/core/error_number.h"
#include "standalone/login/file_rights.h"

#include <fcntl.h>
#include <linux/openat2.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <climits>
#include <iterator>
#include <optional>

namespace velt {
namespace {

constexpr int asFolder = O_PATH | O_DIRECTORY | O_CLOEXEC;

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

bool onlyRootChanges(const struct stat& folder) {
    return folder.st_uid == 0 && (folder.st_mode & (S_IWGRP | S_IWOTH)) == 0;
}

/// Whether what was looked for is not there, or leads nowhere. What root may not see, on another server's
/// disk, is nothing here, and stays so; other failures say nothing of what is there.
bool isAbsent(int error) {
    return error == ENOENT || error == ENOTDIR || error == ELOOP || error == ENAMETOOLONG || error == EACCES;
}

/// Whether it is the file system's answer that the user may not.
bool isRefusal(int error) {
    return error == EACCES || error == EPERM || error == EROFS;
}

std::filesystem::path withoutFirst(const std::filesystem::path& path) {
    std::filesystem::path rest;
    for (auto part = std::next(path.begin()); part != path.end(); ++part) {
        rest /= *part;
    }
    return rest;
}

/// Nothing when that cannot be told.
std::optional<bool> isLink(const UniqueFd& folder, const std::filesystem::path& name) {
    struct stat status {};
    if (fstatat(folder.get(), name.c_str(), &status, AT_SYMLINK_NOFOLLOW) == 0) {
        return S_ISLNK(status.st_mode);
    }
    return isAbsent(errno) ? std::optional(false) : std::nullopt;
}

/// Replaces the link that `name` is in the walk's folder, and that comes next, by what it says.
Result<> followLink(Walk& walk, const std::filesystem::path& name) {
    const auto place = placeOf(walk.folder).valueOr({}) / name;
    struct stat folder {};
    walk.lost = fstat(walk.folder.get(), &folder) < 0;
    if (walk.lost) {
        return cannot("open", place);
    }
    if (!onlyRootChanges(folder)) {
        return Error(ErrorNumber::invalid,
                     place.string() + " is a symbolic link that root need not have made.");
    }
    std::array<char, PATH_MAX> target{};
    const ssize_t size = readlinkat(walk.folder.get(), name.c_str(), target.data(), target.size());
    if (size <= 0 || size == static_cast<ssize_t>(target.size())) {
        walk.lost = true;
        return cannot("open", place);
    }
    const std::filesystem::path path(std::string(target.data(), static_cast<std::size_t>(size)));
    if (path.is_absolute()) {
        walk.folder = UniqueFd(open("/", asFolder));
    }
    walk.rest = path.relative_path() / withoutFirst(walk.rest);
    return {};
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

Walk walk(const std::filesystem::path& path) {
    int links = 40; // at most, as for the kernel
    Walk walk{UniqueFd(open("/", asFolder)), path.relative_path(), {}};
    while (walk.ended && !walk.rest.empty()) {
        const std::filesystem::path name = *walk.rest.begin();
        UniqueFd next(openat(walk.folder.get(), name.empty() ? "." : name.c_str(), asFolder | O_NOFOLLOW));
        if (next) {
            walk.folder = std::move(next);
            walk.rest = withoutFirst(walk.rest);
            continue;
        }
        const int error = errno;
        const std::optional<bool> link = isLink(walk.folder, name);
        walk.lost = !link || !isAbsent(error);
        walk.ended =
            link.value_or(false) && links-- > 0 ? followLink(walk, name) : cannot("open", path, error);
    }
    return walk;
}

Result<OpenedFolder> openFolderAs(const Identity& user, const std::filesystem::path& path) {
    VELT_ASSIGN_OR_RETURN(auto opened, openAs(user, path, [&]() -> Result<UniqueFd> {
                              Walk way = walk(path);
                              VELT_RETURN_IF_ERROR(way.ended);
                              return std::move(way.folder);
                          }));
    if (opened.place == "/") {
        return Error(ErrorNumber::invalid, path.string() + " is the whole server.");
    }
    return opened;
}

Result<Access> accessTo(const Identity& user, const std::filesystem::path& path) {
    if (user.gids.empty()) {
        return Access::none;
    }
    const FileRightsOf rights(user);
    if (!rights.taken()) {
        return cannot("open", path, EPERM);
    }
    const UniqueFd folder(open(path.c_str(), asFolder));
    if (!folder) {
        return isAbsent(errno) || isRefusal(errno) ? Result<Access>(Access::none) : cannot("open", path);
    }
    // The system call itself: where it is missing, the C library would answer for the process's numbers,
    // root's.
    const auto may = [&](int mode) {
        errno = 0;
        return syscall(SYS_faccessat2, folder.get(), "", mode, AT_EACCESS | AT_EMPTY_PATH) == 0;
    };
    const bool readable = may(R_OK | X_OK);
    const bool writable = readable && may(W_OK);
    if (!writable && !isRefusal(errno)) {
        return cannot("look at", path);
    }
    return writable ? Access::write : readable ? Access::read : Access::none;
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
