#include "standalone/core/state_lock.h"

#include "base/unique_fd.h"
#include "standalone/core/file_lock.h"
#include "standalone/core/last_error.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"

#include <fcntl.h>

#include <cerrno>
#include <cstring>
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

int failToLock(const std::filesystem::path& path, const std::string& why,
               SourcePlace where = SourcePlace::current()) {
    return fail(ErrorNumber::store, "Cannot lock " + path.string() + ": " + why + ".", where);
}

int openAndLock(UniqueFd& file) {
    const auto path = statePath(paths::stateLock);
    std::error_code error;
    std::filesystem::create_directories(path.parent_path(), error);
    if (error)
        return failToLock(path, error.message());
    UniqueFd opened(::open(path.c_str(), O_RDWR | O_CREAT | O_NOFOLLOW | O_CLOEXEC, 0600));
    if (!opened)
        return failToLock(path, std::strerror(errno));
    if (waitForFileLock(opened.get(), path) < 0)
        return -1;
    file = std::move(opened);
    return 0;
}

} // namespace

StateLock::StateLock() {
    ThreadLock& lock = threadLock();
    if (lock.depth == 0 && openAndLock(lock.file) < 0)
        return;
    ++lock.depth;
    held_ = true;
}

StateLock::~StateLock() {
    if (!held_)
        return;
    ThreadLock& lock = threadLock();
    if (--lock.depth == 0)
        lock.file.reset();
}

} // namespace velt
