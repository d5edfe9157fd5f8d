// The folder of a trial, its lock, and its record.
#ifndef VELT_HOST_TRIAL_TRIAL_FOLDER_H
#define VELT_HOST_TRIAL_TRIAL_FOLDER_H

#include "base/unique_fd.h"

#include <filesystem>
#include <string>

namespace velt::host {

/// What is stored about a trial once its first state is made.
struct TrialRecord {
    std::filesystem::path place; ///< the state root as veltd sees it; "" for a new trial
    int httpPort = 0;            ///< 0 for a new trial
    std::string build;           ///< identifies the programs that were started
};

/// The trial while it is started or stopped, which its lock allows one process at a time. Makes the folder
/// the working folder, so that the name of the socket is short enough wherever the folder is.
class TrialFolder {
public:
    /// Waits while others start or stop the trial. A start makes a missing folder. Throws TrialError, also
    /// when the trial is another user's, which only root may stop.
    static TrialFolder forStart(const std::filesystem::path& folder);
    static TrialFolder forStop(const std::filesystem::path& folder);

    /// The folder as it was named, with a slash at its end, for messages.
    const std::string& name() const { return name_; }
    const std::filesystem::path& path() const { return path_; }

    TrialRecord record() const;
    void store(const TrialRecord& record) const;

private:
    TrialFolder(const std::filesystem::path& folder, bool forStop);

    std::string name_;
    std::filesystem::path path_; ///< absolute
    UniqueFd lock_;
};

} // namespace velt::host

#endif
