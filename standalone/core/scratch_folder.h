// Folders for a moment's work.
#ifndef VELT_STANDALONE_CORE_SCRATCH_FOLDER_H
#define VELT_STANDALONE_CORE_SCRATCH_FOLDER_H

#include "base/result.h"
#include "base/unique_fd.h"

#include <filesystem>

namespace velt {

/// A folder below the state root that is removed with this object. It may hold keys: only its owner can
/// enter.
class ScratchFolder {
public:
    static Result<ScratchFolder> make();
    ScratchFolder(ScratchFolder&&) = default;
    ~ScratchFolder();

    const std::filesystem::path& path() const { return path_; }

private:
    ScratchFolder(std::filesystem::path path, UniqueFd lock);

    std::filesystem::path path_;
    UniqueFd lock_; ///< tells sweepScratchFolders that the folder is in use; none once moved from
};

/// Removes the scratch folders that a process left behind when it was killed; those in use stay. What cannot
/// be removed is left for the next time.
void sweepScratchFolders();

} // namespace velt

#endif
