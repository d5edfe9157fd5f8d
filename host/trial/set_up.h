// Sets up the running veltd of a trial.
#ifndef VELT_HOST_TRIAL_SET_UP_H
#define VELT_HOST_TRIAL_SET_UP_H

#include "host/trial/veltd_client.h"

#include <filesystem>
#include <string>

namespace velt::host {

/// In the working folder, which is the trial's for all of these functions.
inline constexpr const char* tokenName = "token";
inline constexpr const char* environmentName = "env";

/// The trial's token. Makes one unless veltd accepts the stored one; the client sends it from then on. Throws
/// TrialError.
std::string provideToken(VeltdClient& client);

/// Makes the settings of a new trial: free ports that need no privileges, and as root the demo share for
/// anonymous users. Throws TrialError.
void makeFirstSettings(const VeltdClient& client);

/// Writes the file that sets up a shell for veltctl. Throws TrialError.
void writeEnvironment(const std::string& url, const std::string& token,
                      const std::filesystem::path& programs);

} // namespace velt::host

#endif
