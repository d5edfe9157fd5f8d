#include "standalone/core/scratch_folder.h"

#include "base/file.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_lock.h"
#include "standalone/core/state_root.h"

#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace velt {

namespace {

constexpr std::string_view prefix = "test.";

UniqueFd lockedFolder(const std::filesystem::path& path) {
    UniqueFd folder(::open(path.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
    return folder && ::flock(folder.get(), LOCK_EX | LOCK_NB) == 0 ? std::move(folder) : UniqueFd();
}

} // namespace

ScratchFolder::ScratchFolder(std::filesystem::path path, UniqueFd lock)
    : path_(std::move(path)), lock_(std::move(lock)) {}

Result<ScratchFolder> ScratchFolder::make() {
    // Keeps a sweep away until the folder has its lock.
    VELT_ASSIGN_OR_RETURN(const auto making, StateLock::take());
    const auto parent = statePath(paths::run);
    std::error_code error;
    std::filesystem::create_directories(parent, error);
    std::string path = (parent / (std::string(prefix) + "XXXXXX")).string();
    if (mkdtemp(path.data()) == nullptr) {
        return cannot("make a folder in", parent);
    }
    UniqueFd lock = lockedFolder(path);
    if (!lock) {
        const int reason = errno;
        ::rmdir(path.c_str());
        return cannot("lock", path, reason);
    }
    return ScratchFolder(path, std::move(lock));
}

ScratchFolder::~ScratchFolder() {
    if (lock_) {
        std::error_code error;
        std::filesystem::remove_all(path_, error);
    }
}

void sweepScratchFolders() {
    const auto nobodyMakesOne = StateLock::take();
    if (!nobodyMakesOne) {
        return;
    }
    std::error_code error;
    std::vector<std::filesystem::path> abandoned;
    for (std::filesystem::directory_iterator entry(statePath(paths::run), error), end; !error && entry != end;
         entry.increment(error)) {
        if (entry->path().filename().string().starts_with(prefix) && lockedFolder(entry->path())) {
            abandoned.push_back(entry->path());
        }
    }
    for (const auto& folder : abandoned) {
        std::filesystem::remove_all(folder, error);
    }
}

} // namespace velt
