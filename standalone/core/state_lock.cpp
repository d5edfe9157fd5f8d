#include "standalone/core/state_lock.h"

#include "base/file.h"
#include "base/file_lock.h"
#include "base/unique_fd.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"

#include <fcntl.h>

#include <system_error>

namespace velt {

namespace {

// flock belongs to the opened file: each thread opens its own, so that threads of one process exclude each
// other as processes do.
struct ThreadLock {
    int depth = 0;
    UniqueFd file;
};

ThreadLock& threadLock() {
    thread_local ThreadLock lock;
    return lock;
}

Result<UniqueFd> openAndLock() {
    const auto path = statePath(paths::stateLock);
    std::error_code error;
    std::filesystem::create_directories(path.parent_path(), error);
    if (error)
        return cannot("lock", path, error.value());
    UniqueFd file(::open(path.c_str(), O_RDWR | O_CREAT | O_NOFOLLOW | O_CLOEXEC, 0600));
    if (!file)
        return cannot("lock", path);
    VELT_RETURN_IF_ERROR(waitForFileLock(file.get(), path));
    return file;
}

} // namespace

Result<StateLock> StateLock::take() {
    ThreadLock& lock = threadLock();
    if (lock.depth == 0) {
        VELT_ASSIGN_OR_RETURN(lock.file, openAndLock());
    }
    ++lock.depth;
    return StateLock();
}

StateLock::~StateLock() {
    if (!held_)
        return;
    ThreadLock& lock = threadLock();
    if (--lock.depth == 0)
        lock.file.reset();
}

} // namespace velt
