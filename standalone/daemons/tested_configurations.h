// Which configurations have passed their daemon's own test in this process.
#ifndef VELT_STANDALONE_DAEMONS_TESTED_CONFIGURATIONS_H
#define VELT_STANDALONE_DAEMONS_TESTED_CONFIGURATIONS_H

#include "base/result.h"

#include <filesystem>
#include <functional>
#include <string>
#include <vector>

namespace velt {

/// What tells these files from their successors, by their entries in the file system; a missing one counts,
/// too.
std::string identityOf(const std::vector<std::filesystem::path>& files);

/// Runs the test, unless the configuration of this hash, which stands for all that the test looks at, is
/// among the last that have passed it. Thread-safe.
Result<> testOnce(const std::string& hash, const std::function<Result<>()>& test);

} // namespace velt

#endif
