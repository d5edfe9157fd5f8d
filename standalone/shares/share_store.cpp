#include "standalone/shares/share_store.h"

#include "base/file.h"
#include "base/file_stamp.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/shares/share_file.h"

#include <mutex>

namespace velt {

namespace {

// A listing of chroot rules looks a share up for each rule.
struct Cache {
    std::mutex mutex;
    std::filesystem::path path;
    FileStamp stamp;
    std::vector<ShareEntry> shares;
};

Cache& cache() {
    static Cache instance;
    return instance;
}

Result<std::vector<ShareEntry>> readShares(const std::filesystem::path& path) {
    VELT_ASSIGN_OR_RETURN(const auto text, readOptionalFile(path));
    return text ? parseShares(*text) : std::vector<ShareEntry>();
}

} // namespace

Result<std::vector<ShareEntry>> loadShares() {
    const std::filesystem::path path = statePath(paths::shares);
    Cache& known = cache();
    const std::lock_guard lock(known.mutex);
    const FileStamp stamp = FileStamp::of(path);
    if (path == known.path && stamp == known.stamp) {
        return known.shares;
    }
    auto shares = readShares(path);
    if (shares) {
        known.path = path;
        known.stamp = stamp;
        known.shares = *shares;
    }
    return shares;
}

} // namespace velt
