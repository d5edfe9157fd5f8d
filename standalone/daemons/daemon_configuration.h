// What the configurations of all daemons have in common.
#ifndef VELT_STANDALONE_DAEMONS_DAEMON_CONFIGURATION_H
#define VELT_STANDALONE_DAEMONS_DAEMON_CONFIGURATION_H

#include "base/result.h"

#include <filesystem>
#include <string>
#include <vector>

namespace velt {

/// Whether the path can stand between quotes in a configuration: absolute, of at most 1024 bytes, and without
/// the characters that mean something to a daemon even there, or to env(1) in front of a program.
bool isRenderable(const std::filesystem::path& path);

/// Whether the account's name is of letters, digits, '.', '_' and '-', which mean nothing to any daemon.
bool isPlainName(const std::string& name);

/// Fails, naming the administrator's folder that the path is below, unless the path is renderable.
Result<> checkRenderable(const std::filesystem::path& path, const std::filesystem::path& folder);

/// Runs the test that a daemon offers of its configuration. Fails, with the daemon's own words, when it
/// refuses. `label` is the daemon's for people: "FTP".
Result<> runConfigurationTest(const std::string& label, const std::vector<std::string>& arguments);

} // namespace velt

#endif
