#include "base/file.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <vector>

namespace velt {

namespace fs = std::filesystem;

namespace {

Result<> syncFolder(const fs::path& folder) {
    const UniqueFd fd(::open(folder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (!fd || ::fsync(fd.get()) != 0)
        return cannot("write the folder", folder);
    return {};
}

/// After so many failures to look at a file that was opened, it counts as impossible.
constexpr int mostFailures = 10;

/// Nothing, with errno set, when that cannot be told.
std::optional<bool> isSameFile(int fd, const fs::path& path) {
    struct stat opened {};
    struct stat named {};
    if (::fstat(fd, &opened) != 0)
        return std::nullopt;
    if (::lstat(path.c_str(), &named) != 0)
        return errno == ENOENT ? std::optional(false) : std::nullopt;
    return opened.st_dev == named.st_dev && opened.st_ino == named.st_ino;
}

} // namespace

Error cannot(std::string_view verb, const fs::path& path, int error, SourcePlace where) {
    return Error("Cannot " + std::string(verb) + " " + path.string() + ": " + std::strerror(error) + ".",
                 where);
}

bool writeAll(int fd, std::string_view contents) {
    while (!contents.empty()) {
        const ssize_t written = ::write(fd, contents.data(), contents.size());
        if (written < 0) {
            if (errno == EINTR)
                continue;
            return false;
        }
        contents.remove_prefix(static_cast<std::size_t>(written));
    }
    return true;
}

std::optional<std::string> readAll(int fd) {
    std::string contents;
    std::string block(65536, '\0');
    for (;;) {
        const ssize_t got = ::read(fd, block.data(), block.size());
        if (got == 0)
            return contents;
        if (got > 0) {
            contents.append(block, 0, static_cast<std::size_t>(got));
        } else if (errno != EINTR) {
            return std::nullopt;
        }
    }
}

UniqueFd openLocked(const fs::path& path, int flags, mode_t mode) {
    for (int failures = 0;;) {
        UniqueFd fd(::open(path.c_str(), flags | O_CREAT | O_NOFOLLOW | O_CLOEXEC, mode));
        if (!fd)
            return fd;
        while (::flock(fd.get(), LOCK_EX) != 0)
            if (errno != EINTR)
                return UniqueFd();
        const auto same = isSameFile(fd.get(), path);
        if (same == true)
            return fd;
        if (!same && ++failures == mostFailures)
            return UniqueFd();
    }
}

bool fileExists(const fs::path& path) {
    return ::access(path.c_str(), F_OK) == 0;
}

Result<bool> isThere(const fs::path& path) {
    const bool there = fileExists(path);
    if (!there && errno != ENOENT && errno != ENOTDIR)
        return cannot("look at", path);
    return there;
}

// Each new folder is made durable in the one that holds it, or a crash could take it away again together with
// the file that was stored in it.
Result<> makeFolder(const fs::path& folder, mode_t mode) {
    std::vector<fs::path> missing;
    for (fs::path at = folder; !at.empty() && !fileExists(at); at = at.parent_path()) {
        missing.push_back(at);
        if (at == at.parent_path())
            break;
    }
    for (auto at = missing.rbegin(); at != missing.rend(); ++at) {
        if (::mkdir(at->c_str(), *at == folder ? mode : 0755) != 0 && errno != EEXIST)
            return cannot("make the folder", *at);
        VELT_RETURN_IF_ERROR(syncFolder(at->has_parent_path() ? at->parent_path() : fs::path(".")));
    }
    return {};
}

// The temporary file has one fixed name, so that what a crash leaves behind is taken up by the next store and
// never piles up. Its lock keeps a second writer out until the first has renamed it.
Result<> replaceFile(const fs::path& path, std::string_view contents, mode_t mode) {
    const fs::path folder = path.has_parent_path() ? path.parent_path() : fs::path(".");
    VELT_RETURN_IF_ERROR(makeFolder(folder));
    fs::path temporary = folder / ".";
    temporary += path.filename();
    temporary += ".new";
    const UniqueFd fd = openLocked(temporary, O_WRONLY, 0600);
    if (!fd)
        return cannot("make", temporary);
    if (::ftruncate(fd.get(), 0) != 0 || ::fchmod(fd.get(), mode) != 0 || !writeAll(fd.get(), contents) ||
        ::fsync(fd.get()) != 0) {
        const int error = errno;
        ::unlink(temporary.c_str());
        return cannot("write", temporary, error);
    }
    if (::rename(temporary.c_str(), path.c_str()) != 0) {
        const int error = errno;
        ::unlink(temporary.c_str());
        return cannot("replace", path, error);
    }
    return syncFolder(folder);
}

Result<std::optional<std::string>> readOptionalFile(const fs::path& path) {
    const UniqueFd fd(::open(path.c_str(), O_RDONLY | O_CLOEXEC));
    if (!fd && errno == ENOENT)
        return std::nullopt;
    if (!fd)
        return cannot("read", path);
    auto contents = readAll(fd.get());
    return contents ? Result<std::optional<std::string>>(std::move(contents)) : cannot("read", path);
}

Result<std::string> readFile(const fs::path& path) {
    VELT_ASSIGN_OR_RETURN(auto contents, readOptionalFile(path));
    if (!contents)
        return cannot("read", path, ENOENT);
    return std::move(*contents);
}

} // namespace velt
