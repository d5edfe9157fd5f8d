// Starting a program that is known before it does anything.
#ifndef VELT_STANDALONE_SUPERVISE_ANNOUNCED_START_H
#define VELT_STANDALONE_SUPERVISE_ANNOUNCED_START_H

#include "base/result.h"

#include <sys/types.h>

#include <functional>
#include <string>
#include <vector>

namespace velt {

/// Starts the program arguments[0], a path, with /dev/null as its standard input and `output` as its output
/// and error, no signal blocked or ignored, and an environment of PATH and LANG=C.UTF-8 alone; of the other
/// descriptors it gets those that are not closed on exec. It is a process already when `announce` is called,
/// and does nothing before that has succeeded; where it fails, or this process ends first, so does that one.
/// For a process with one thread.
Result<pid_t> startAnnounced(const std::vector<std::string>& arguments, int output,
                             const std::function<Result<>()>& announce);

} // namespace velt

#endif
