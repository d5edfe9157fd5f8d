#include "base/file_stamp.h"

#include <sys/stat.h>

#include <ctime>

namespace velt {

namespace {

// A file written twice within one tick of the file system's clock may look the same after both, even its
// inode when the first file was replaced. A stamp this young is therefore equal to nothing.
constexpr std::int64_t youngNanoseconds = 50'000'000;

bool isSettled(const timespec& changed) {
    timespec now{};
    clock_gettime(CLOCK_REALTIME, &now);
    const std::int64_t age = (now.tv_sec - changed.tv_sec) * 1'000'000'000 + now.tv_nsec - changed.tv_nsec;
    return age > youngNanoseconds || age < 0;
}

} // namespace

FileStamp FileStamp::of(const std::filesystem::path& path) {
    FileStamp stamp;
    struct stat status {};
    if (stat(path.c_str(), &status) != 0) {
        stamp.settled_ = true;
        return stamp;
    }
    stamp.settled_ = isSettled(status.st_mtim);
    stamp.exists_ = true;
    stamp.seconds_ = status.st_mtim.tv_sec;
    stamp.nanoseconds_ = status.st_mtim.tv_nsec;
    stamp.size_ = status.st_size;
    stamp.inode_ = status.st_ino;
    stamp.device_ = status.st_dev;
    return stamp;
}

bool FileStamp::operator==(const FileStamp& other) const {
    return settled_ && other.settled_ && exists_ == other.exists_ && seconds_ == other.seconds_ &&
           nanoseconds_ == other.nanoseconds_ && size_ == other.size_ && inode_ == other.inode_ &&
           device_ == other.device_;
}

} // namespace velt
