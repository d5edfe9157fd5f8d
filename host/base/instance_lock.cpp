#include "host/base/instance_lock.h"

#include "base/file.h"

#include <fcntl.h>

#include <cerrno>

namespace velt::host {

namespace {

std::filesystem::path lockPath(const std::filesystem::path& stateRoot) {
    return stateRoot / "run/velt/veltd.lock";
}

std::optional<pid_t> holderOf(int descriptor) {
    struct flock whole {};
    whole.l_type = F_WRLCK;
    whole.l_whence = SEEK_SET;
    const bool held = ::fcntl(descriptor, F_GETLK, &whole) == 0 && whole.l_type != F_UNLCK;
    return held ? std::optional(whole.l_pid) : std::nullopt;
}

} // namespace

Result<InstanceLock> InstanceLock::take(const std::filesystem::path& stateRoot) {
    const std::filesystem::path path = lockPath(stateRoot);
    VELT_RETURN_IF_ERROR(makeFolder(path.parent_path()));
    UniqueFd file(::open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0644));
    struct flock whole {};
    whole.l_type = F_WRLCK;
    whole.l_whence = SEEK_SET;
    if (file && ::fcntl(file.get(), F_SETLK, &whole) == 0) {
        return InstanceLock(std::move(file));
    }
    const int error = errno;
    if (const auto other = file ? holderOf(file.get()) : std::nullopt) {
        return Error("veltd is already running below " + stateRoot.string() + " as process " +
                     std::to_string(*other) + ".");
    }
    return cannot("lock", path, error);
}

void InstanceLock::keepOverExec() const {
    // A lock of this kind is lost as soon as the process closes any descriptor of its file.
    ::fcntl(file_.get(), F_SETFD, 0);
}

std::optional<pid_t> InstanceLock::holder(const std::filesystem::path& stateRoot) {
    const UniqueFd file(::open(lockPath(stateRoot).c_str(), O_RDONLY | O_CLOEXEC));
    return file ? holderOf(file.get()) : std::nullopt;
}

} // namespace velt::host
