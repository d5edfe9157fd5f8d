// Tells whether a file changed since it was read.
#ifndef VELT_BASE_FILE_STAMP_H
#define VELT_BASE_FILE_STAMP_H

#include <sys/types.h>

#include <cstdint>
#include <filesystem>

namespace velt {

/// What a file looked like at one moment. Two equal stamps of one path mean equal contents.
class FileStamp {
public:
    /// Equal to no stamp.
    FileStamp() = default;

    /// The file's stamp now; to be taken before the file is read. A missing file has a stamp, too.
    static FileStamp of(const std::filesystem::path& path);

    bool operator==(const FileStamp& other) const;

private:
    bool settled_ = false;
    bool exists_ = false;
    std::int64_t seconds_ = 0;
    std::int64_t nanoseconds_ = 0;
    off_t size_ = 0;
    ino_t inode_ = 0;
    dev_t device_ = 0;
};

} // namespace velt

#endif
