// What lets the user of a trial administer it: a token, and a file that sets up a shell for veltctl.
#ifndef VELT_HOST_TRIAL_CREDENTIALS_H
#define VELT_HOST_TRIAL_CREDENTIALS_H

#include <filesystem>
#include <optional>
#include <string>

namespace velt::host {

// All of these work in the working folder, which is the state root, and throw TrialError or TokenError.

/// The token that the last start has left; nothing when there is none or it is no longer valid.
std::optional<std::string> storedToken();

/// Makes a token. veltd must not run: it reads the tokens when it starts.
std::string makeToken();

/// Writes the file for the shell. A user who became root by sudo gets it and the token.
void writeEnvironment(const std::string& url, const std::string& token,
                      const std::filesystem::path& programs);

} // namespace velt::host

#endif
