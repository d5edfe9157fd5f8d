// A process that is killed at each of its steps in turn.
#ifndef VELT_TESTS_STANDALONE_CRASH_KILLED_PROCESS_H
#define VELT_TESTS_STANDALONE_CRASH_KILLED_PROCESS_H

#include <functional>
#include <string>

namespace velt::test {

/// How a child ended that was to be killed.
enum class Ending {
    killed,
    succeeded, ///< it got through first, and returned 0
    failed,
};

/// Runs `act` in a child and kills it in the place of its `call`-th system call, counted from 0, of those
/// that can change anything outside of the process: without that call and all that would have followed.
Ending killAtCall(int call, const std::function<int()>& act);

/// What `tell` returns in a child of its own, so that nothing stays in this process that another child would
/// inherit; at most 1 MiB. Fails the test when the child does not end well.
std::string tellInChild(const std::function<std::string()>& tell);

} // namespace velt::test

#endif
