// The system calls that a fault sweep fails.
#ifndef VELT_TESTS_SUPPORT_WATCHED_CALLS_H
#define VELT_TESTS_SUPPORT_WATCHED_CALLS_H

#include <cerrno>

#include <span>

namespace velt::test {

/// What tells a call from others of its name.
enum class CallSubject {
    none,
    path,      ///< its first argument
    pathAt,    ///< its second argument, below the folder that is the first
    pathAtEnd, ///< its second argument: a link says the first
    descriptor ///< its first argument
};

struct WatchedCall {
    long number;
    const char* name;
    CallSubject subject;
    int error; ///< with which it fails in practice, once in a long time
};

std::span<const WatchedCall> watchedCalls();

/// The row of this call. It must be one of them.
const WatchedCall& watchedCall(long number);

} // namespace velt::test

#endif
