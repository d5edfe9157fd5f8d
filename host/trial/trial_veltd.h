// The veltd of a trial, as a process.
#ifndef VELT_HOST_TRIAL_TRIAL_VELTD_H
#define VELT_HOST_TRIAL_TRIAL_VELTD_H

#include "host/trial/trial_place.h"

#include <sys/types.h>

#include <filesystem>
#include <optional>
#include <string>

namespace velt::host {

// In the working folder, which is the trial's, for all of these functions.

/// The folder of this program and the others that were built with it.
std::filesystem::path programFolder();

/// Identifies what was built there; different after each build.
std::string buildOf(const std::filesystem::path& programs);

std::optional<pid_t> runningVeltd();

/// Makes a link to the program folder, by which the trial can be stopped. Throws TrialError.
void linkPrograms();

/// Starts veltd on the port of 127.0.0.1 and returns its process once it answers. However early this process
/// ends, veltd goes on, and runningVeltd finds it. Throws TrialError.
pid_t launchVeltd(const std::filesystem::path& folder, const TrialPlace& place, int httpPort);

/// Waits until the running veltd answers. False when none runs, or it ends before.
bool waitForVeltd();

/// Ends veltd, if it is running, and waits for its end. Throws TrialError.
void endVeltd();

/// A free port of 127.0.0.1 for HTTP, if possible the former one. Throws TrialError.
int chooseHttpPort(int former);

} // namespace velt::host

#endif
