#include "standalone/shares/share_store.h"

#include "base/file.h"
#include "base/file_stamp.h"
#include "standalone/core/boundary.h"
#include "standalone/core/effects.h"
#include "standalone/core/last_error.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_lock.h"
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

std::optional<std::vector<ShareEntry>> readShares(const std::filesystem::path& path) {
    const auto text = readOptionalFile(path);
    if (!text) {
        fail(text.error());
        return std::nullopt;
    }
    if (!*text) {
        return std::vector<ShareEntry>{};
    }
    std::string flaw;
    std::optional<std::vector<ShareEntry>> shares = parseShares(**text, flaw);
    if (!shares) {
        fail(ErrorNumber::damaged, path.string() + " is damaged: " + flaw + ".");
    }
    return shares;
}

} // namespace

std::optional<std::vector<ShareEntry>> allShares() {
    const std::filesystem::path path = statePath(paths::shares);
    Cache& known = cache();
    const std::lock_guard lock(known.mutex);
    const FileStamp stamp = FileStamp::of(path);
    if (path == known.path && stamp == known.stamp) {
        return known.shares;
    }
    std::optional<std::vector<ShareEntry>> shares = readShares(path);
    if (shares) {
        known.path = path;
        known.stamp = stamp;
        known.shares = *shares;
    }
    return shares;
}

int saveShares(const std::vector<ShareEntry>& shares) {
    if (const std::optional<std::string> flaw = flawOf(shares)) {
        return fail(ErrorNumber::invalid, "The shares cannot be stored: " + *flaw + ".");
    }
    const StateLock lock;
    if (!lock) {
        return -1;
    }
    return toContract(perform(Effect::store, "shares", [&shares] {
        return replaceFile(statePath(paths::shares), renderShares(shares), 0644);
    }));
}

} // namespace velt
