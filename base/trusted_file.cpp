#include "base/trusted_file.h"

#include "base/file.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstring>

namespace velt {
namespace {

constexpr off_t longestFile = off_t{16} << 20;

Error refuse(const std::filesystem::path& path, const std::string& why) {
    return Error(path.string() + " " + why + ".");
}

} // namespace

Result<std::string> readTrusted(const std::filesystem::path& path) {
    const UniqueFd file(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK));
    struct stat facts {};
    if (!file || fstat(file.get(), &facts) < 0) {
        return refuse(path, std::string("cannot be opened: ") + std::strerror(errno));
    }
    if (!S_ISREG(facts.st_mode) || facts.st_size > longestFile) {
        return refuse(path, "is not a file, or is larger than 16 MiB");
    }
    if ((facts.st_uid != 0 && facts.st_uid != getuid()) || (facts.st_mode & (S_IWGRP | S_IWOTH)) != 0) {
        return refuse(path, "belongs to another account, or other accounts may write to it");
    }
    auto text = readAll(file.get());
    if (!text || static_cast<off_t>(text->size()) != facts.st_size) {
        return refuse(path, "cannot be read to its end");
    }
    return *std::move(text);
}

} // namespace velt
