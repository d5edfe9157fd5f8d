// The lock for changing stored state.
#ifndef VELT_STANDALONE_CORE_STATE_LOCK_H
#define VELT_STANDALONE_CORE_STATE_LOCK_H

namespace velt {

/// Holds the lock of the state root, across threads and processes, while it lives. Read-modify-write
/// of a stored file happens under it. A thread that holds it may take it again.
class StateLock {
public:
    StateLock();
    ~StateLock();
    StateLock(const StateLock&) = delete;
    StateLock& operator=(const StateLock&) = delete;

    /// False when the lock cannot be had (the last error says why).
    explicit operator bool() const { return held_; }

private:
    bool held_ = false;
};

} // namespace velt

#endif
