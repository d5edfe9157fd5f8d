// Asking a child process for what this one cannot try without changing itself.
#ifndef VELT_BASE_ASK_CHILD_H
#define VELT_BASE_ASK_CHILD_H

#include "base/result.h"

#include <functional>

namespace velt {

/// What `question` returns in a child process, which then ends. Other threads are not there in the child and
/// may have held any lock: only system calls are safe in it. Thread-safe.
Result<int> askChild(const std::function<int()>& question);

} // namespace velt

#endif
