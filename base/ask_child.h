// Trying something in a child process that would change the whole process.
#ifndef VELT_BASE_ASK_CHILD_H
#define VELT_BASE_ASK_CHILD_H

#include "base/result.h"

#include <functional>

namespace velt {

/// Runs `question` in a child process and returns what it returned. The child has only this thread, and
/// another one may have held any lock: only system calls are safe in `question`. Thread-safe.
Result<int> askChild(const std::function<int()>& question);

} // namespace velt

#endif
