#include "standalone/login/authorized_keys.h"

#include "base/file.h"
#include "base/text.h"
#include "standalone/core/error_number.h"
#include "standalone/keys/key_options.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <array>

namespace velt {
namespace {

constexpr off_t largestFile = off_t{1024} * 1024;

/// The line as the daemon may have it; "" for none.
std::string lineForTransfer(std::string_view line) {
    line = trimmed(line);
    const auto length = lengthOfOptions(line); // or of the key's type where there are none
    if (line.empty() || line.front() == '#' || line.find('\0') != std::string_view::npos || !length) {
        return {};
    }
    // Also where it is part of another option's value: who wrote that is not to be surprised.
    const std::string options = lowerCase(line.substr(0, *length));
    if (options.find("command=") != std::string::npos) {
        return {};
    }
    const bool isAuthority = options.find("cert-authority") != std::string::npos;
    return (isAuthority ? "command=\"internal-sftp\"," : "") + std::string(line) + '\n';
}

bool othersWrite(const struct stat& status, uid_t owner) {
    return (status.st_uid != 0 && status.st_uid != owner) || (status.st_mode & (S_IWGRP | S_IWOTH)) != 0;
}

Error canBeWritten(const std::filesystem::path& path) {
    return {ErrorNumber::invalid, path.string() + " can be written by other users; its keys are not used."};
}

/// The folders that hold the file, up to the home or, where the file is elsewhere, up to "/".
Result<> checkFolders(const std::filesystem::path& file, const std::filesystem::path& home, uid_t owner) {
    for (auto folder = file.parent_path();; folder = folder.parent_path()) {
        struct stat status {};
        if (stat(folder.c_str(), &status) < 0) {
            return cannot("open", folder);
        }
        if (othersWrite(status, owner)) {
            return canBeWritten(folder);
        }
        if (folder == home || folder == "/") {
            return {};
        }
    }
}

Result<std::string> readKeys(const std::filesystem::path& path, const std::filesystem::path& home,
                             uid_t owner) {
    std::error_code error;
    const auto file = std::filesystem::canonical(path, error);
    if (error == std::errc::no_such_file_or_directory) {
        return std::string();
    }
    const UniqueFd fd(error ? -1 : open(file.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK));
    struct stat status {};
    if (!fd || fstat(fd.get(), &status) < 0) {
        return cannot("open", path, error ? error.value() : errno);
    }
    if (!S_ISREG(status.st_mode) || status.st_size > largestFile) {
        return Error(ErrorNumber::invalid, path.string() + " is not a file of at most 1 MiB.");
    }
    if (othersWrite(status, owner)) {
        return canBeWritten(path);
    }
    VELT_RETURN_IF_ERROR(checkFolders(file, home, owner));
    const auto text = readAll(fd.get());
    return text ? Result<std::string>(*text) : cannot("read", path);
}

} // namespace

std::string keysForTransfer(std::string_view text) {
    std::string keys;
    while (!text.empty()) {
        keys += lineForTransfer(cut(text, '\n'));
    }
    return keys;
}

Result<std::string> readKeysForTransfer(const std::filesystem::path& home, uid_t owner) {
    std::error_code error;
    const auto place = std::filesystem::canonical(home, error);
    if (error) {
        return cannot("open", home, error.value());
    }
    std::string keys;
    for (const char* const name : {"authorized_keys", "authorized_keys2"}) {
        VELT_ASSIGN_OR_RETURN(const auto text, readKeys(place / ".ssh" / name, place, owner));
        keys += keysForTransfer(text);
    }
    return keys;
}

} // namespace velt
