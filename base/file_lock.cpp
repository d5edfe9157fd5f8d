#include "base/file_lock.h"

#include "base/file.h"

#include <sys/file.h>

#include <algorithm>
#include <thread>

namespace velt {

namespace {

std::string inWords(std::chrono::milliseconds time) {
    return time >= longestLockWait ? "a minute" : std::to_string(time.count()) + " ms";
}

} // namespace

Result<> waitForFileLock(int descriptor, const std::filesystem::path& path, std::chrono::milliseconds limit) {
    const auto deadline = std::chrono::steady_clock::now() + limit;
    auto pause = std::chrono::microseconds(100);
    while (::flock(descriptor, LOCK_EX | LOCK_NB) != 0) {
        if (errno == EINTR)
            continue;
        if (errno != EWOULDBLOCK)
            return cannot("lock", path);
        if (std::chrono::steady_clock::now() > deadline)
            return Error("Cannot lock " + path.string() + ": another process has held it for " +
                         inWords(limit) + ".");
        std::this_thread::sleep_for(pause);
        pause = std::min(pause * 2, std::chrono::microseconds(5000));
    }
    return {};
}

} // namespace velt
