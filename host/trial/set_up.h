// Makes a veltd that runs one to try.
#ifndef VELT_HOST_TRIAL_SET_UP_H
#define VELT_HOST_TRIAL_SET_UP_H

#include "host/trial/veltd_client.h"

#include <filesystem>
#include <string>

namespace velt::host {

/// In the trial's folder, which is the working folder for all of these.
inline constexpr const char* tokenName = "token";
inline constexpr const char* environmentName = "env";

/// The trial's token, made anew when there is none that veltd knows; the client shows it from then on. Throws
/// TrialError.
std::string provideToken(VeltdClient& client);

/// The settings of a new trial: ports that are free and need no rights, and as root the demo share for
/// anonymous users. Throws TrialError.
void makeFirstSettings(const VeltdClient& client);

/// Writes what a shell takes over to use veltctl. Throws TrialError.
void writeEnvironment(const std::string& url, const std::string& token,
                      const std::filesystem::path& programs);

} // namespace velt::host

#endif
