// Where a trial's veltd finds its state.
#ifndef VELT_HOST_TRIAL_TRIAL_PLACE_H
#define VELT_HOST_TRIAL_TRIAL_PLACE_H

#include <filesystem>

namespace velt::host {

/// Anonymous users are served by the account ftp. Where that one cannot get to the trial's folder, as below a
/// home folder, veltd gets a view of its own of the machine, with the folder at a place that everybody can
/// get to.
struct TrialPlace {
    std::filesystem::path root; ///< the state root, as veltd sees it
    bool needsView = false;
};

/// Throws TrialError when the folder, or the account, cannot be used.
TrialPlace findPlace(const std::filesystem::path& folder);

/// Whether this process may mount in a view of its own.
bool mayMount();

/// Gives this process the view in which the folder is at the place. False, with errno, on failure.
bool enterView(const std::filesystem::path& folder, const TrialPlace& place);

} // namespace velt::host

#endif
