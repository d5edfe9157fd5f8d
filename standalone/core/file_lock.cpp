#include "standalone/core/file_lock.h"

#include "standalone/core/last_error.h"

#include <sys/file.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <string>
#include <thread>

namespace velt {

namespace {

int failToLock(const std::filesystem::path& path, const std::string& why,
               SourcePlace where = SourcePlace::current()) {
    return fail(ErrorNumber::store, "Cannot lock " + path.string() + ": " + why + ".", where);
}

std::string inWords(std::chrono::milliseconds time) {
    return time >= longestLockWait ? "a minute" : std::to_string(time.count()) + " ms";
}

} // namespace

int waitForFileLock(int descriptor, const std::filesystem::path& path, std::chrono::milliseconds limit) {
    const auto deadline = std::chrono::steady_clock::now() + limit;
    auto pause = std::chrono::microseconds(100);
    while (::flock(descriptor, LOCK_EX | LOCK_NB) != 0) {
        if (errno == EINTR)
            continue;
        if (errno != EWOULDBLOCK)
            return failToLock(path, std::strerror(errno));
        if (std::chrono::steady_clock::now() > deadline)
            return failToLock(path, "another process has held it for " + inWords(limit));
        std::this_thread::sleep_for(pause);
        pause = std::min(pause * 2, std::chrono::microseconds(5000));
    }
    return 0;
}

} // namespace velt
