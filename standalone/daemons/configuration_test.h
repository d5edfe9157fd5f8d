// Passing a configuration through the test that a daemon itself offers.
#ifndef VELT_STANDALONE_DAEMONS_CONFIGURATION_TEST_H
#define VELT_STANDALONE_DAEMONS_CONFIGURATION_TEST_H

#include "base/unique_fd.h"

#include <filesystem>
#include <string>
#include <vector>

namespace velt {

/// A folder of its own below the state root, gone with this object. Keys may lie in it: nobody but its owner
/// can enter.
class ScratchFolder {
public:
    ScratchFolder();
    ~ScratchFolder();
    ScratchFolder(const ScratchFolder&) = delete;
    ScratchFolder& operator=(const ScratchFolder&) = delete;

    /// False when it could not be made; the last error is then set.
    explicit operator bool() const { return !path_.empty(); }
    const std::filesystem::path& path() const { return path_; }

private:
    std::filesystem::path path_;
    UniqueFd lock_; ///< tells sweepScratchFolders that the folder is in use
};

/// Removes the scratch folders that a process left behind when it was killed; those in use stay. Best effort:
/// what cannot be removed is left for the next time.
void sweepScratchFolders();

/// Runs the test; negative when the daemon refuses, with its own words in the last error. `daemon` is its
/// name for people.
int runDaemonTest(const std::string& daemon, const std::vector<std::string>& arguments);

} // namespace velt

#endif
