// The folder of a trial, its lock, and what is known of its veltd.
#ifndef VELT_HOST_TRIAL_TRIAL_FOLDER_H
#define VELT_HOST_TRIAL_TRIAL_FOLDER_H

#include "base/unique_fd.h"

#include <filesystem>
#include <string>

namespace velt::host {

/// What a trial has stored about itself.
struct TrialRecord {
    std::filesystem::path place; ///< the state root as veltd sees it; "" for a new trial
    int httpPort = 0;            ///< 0 for a new trial
    std::string build;           ///< tells the programs that were started from all others
    bool setUp = false;          ///< its first settings were made
};

/// Held while a trial is started or stopped: one at a time. The working folder is the trial's meanwhile, so
/// that the names in it are short enough for a socket, wherever it is.
class TrialFolder {
public:
    /// Makes the folder when it is missing, and waits for others that start or stop the trial. Throws
    /// TrialError, also for a trial of another user; root may stop those.
    static TrialFolder forStart(const std::filesystem::path& folder);
    static TrialFolder forStop(const std::filesystem::path& folder);

    /// The folder as it was named, for messages.
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
