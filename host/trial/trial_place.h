// Where a trial's veltd finds its state.
#ifndef VELT_HOST_TRIAL_TRIAL_PLACE_H
#define VELT_HOST_TRIAL_TRIAL_PLACE_H

#include <filesystem>

namespace velt::host {

/// The account ftp serves anonymous users. If it cannot get to the trial's folder, for example below a home
/// folder, veltd runs with mounts of its own in which the folder is at a place that everybody can enter.
struct TrialPlace {
    std::filesystem::path root; ///< the state root, as veltd sees it
    bool needsMounts = false;
};

/// Throws TrialError when the account is missing or cannot get there either way.
TrialPlace findPlace(const std::filesystem::path& folder);

/// Whether this process may have mounts of its own.
bool mayMount();

/// Gives this process mounts of its own, with the folder at the place. False, with errno, on failure.
bool mountPlace(const std::filesystem::path& folder, const TrialPlace& place);

} // namespace velt::host

#endif
