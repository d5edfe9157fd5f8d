// The lock for changing stored state.
#ifndef VELT_STANDALONE_CORE_STATE_LOCK_H
#define VELT_STANDALONE_CORE_STATE_LOCK_H

#include "base/result.h"

#include <utility>

namespace velt {

/// Holds the lock of the state root, across threads and processes, while it lives. Read-modify-write
/// of a stored file happens under it. A thread that holds it may take it again. Stays on its thread.
class StateLock {
public:
    static Result<StateLock> take();

    ~StateLock();
    StateLock(StateLock&& other) noexcept : held_(std::exchange(other.held_, false)) {}
    StateLock& operator=(StateLock&&) = delete;

private:
    StateLock() = default;

    bool held_ = true; ///< false once it was moved away
};

} // namespace velt

#endif
