// The veltd of a trial as a process.
#ifndef VELT_HOST_TRIAL_TRIAL_VELTD_H
#define VELT_HOST_TRIAL_TRIAL_VELTD_H

#include "host/trial/trial_place.h"
#include "host/trial/veltd_client.h"

#include <sys/types.h>

#include <filesystem>
#include <optional>
#include <string>

namespace velt::host {

/// In the trial's folder, which is the working folder for all of these.
inline constexpr const char* socketName = "run/velt/veltd.sock";

/// The folder of this program, where the others that were built lie, too.
std::filesystem::path programFolder();

/// Tells what was built there now from what was built before.
std::string buildOf(const std::filesystem::path& programs);

std::optional<pid_t> runningVeltd();

/// Leaves word of this program, which can stop what it has started. Throws TrialError.
void linkPrograms();

/// Starts veltd on the port of 127.0.0.1 and returns its process when it answers. It goes on when this
/// process ends, whenever that is: from its first moment on runningVeltd finds it. Throws TrialError.
pid_t launchVeltd(const std::filesystem::path& folder, const TrialPlace& place, int httpPort);

/// Waits until a veltd that runs already answers. Throws TrialError when it ends.
void waitForVeltd();

/// Ends veltd, if it runs, and the services that it has started. Throws TrialError.
void stopVeltd(const std::filesystem::path& folder);

/// A port of 127.0.0.1 for HTTP that is free: the one given, if it is. Throws TrialError.
int chooseHttpPort(int former);

} // namespace velt::host

#endif
