// A child process whose system calls are seen one by one, and can be failed, wherever they are made: by the
// program, by its libraries, or by what it starts. The kernel's seccomp asks about each.
#ifndef VELT_TESTS_SUPPORT_CALL_WATCH_H
#define VELT_TESTS_SUPPORT_CALL_WATCH_H

#include "base/unique_fd.h"

#include <sys/types.h>

#include <chrono>
#include <functional>
#include <mutex>
#include <string>
#include <thread>

namespace velt::test {

/// A call that opens, reads, writes, renames, links, mounts, binds or starts something, or looks at it.
struct SeenCall {
    std::string name;    ///< "openat"
    std::string subject; ///< the path that it names, or what its first descriptor leads to; may be ""
    std::string program; ///< that makes it: its short name
    bool ofChild = true; ///< and not of a process that the child has started
    int error = 0;       ///< with which such a call fails in practice
};

/// How the child ended.
struct ChildEnd {
    bool inTime = false;
    int status = -1;  ///< as waitpid has it
    std::string told; ///< what the function returned; "threw: " and what; "" when neither
};

/// Belongs to one thread.
class CallWatch {
public:
    /// The error number with which the call is to fail; 0 to let it be made. Called on a thread of the
    /// watch's, one call at a time, and no more once a call has failed.
    using Decide = std::function<int(const SeenCall&)>;

    /// Runs `act` in a child, which ends with it, and asks about each of its calls. Throws where the kernel
    /// does not offer that.
    CallWatch(const std::function<std::string()>& act, Decide decide);

    /// Kills the child if it still runs. What it has started must have ended before: nobody answers for its
    /// calls any more.
    ~CallWatch();
    CallWatch(const CallWatch&) = delete;
    CallWatch& operator=(const CallWatch&) = delete;

    pid_t child() const { return child_; }

    /// Waits for the end of the child. One that does not come in time is killed. To be called once.
    ChildEnd finish(std::chrono::milliseconds limit);

    /// From now on, until it is called again, calls are decided like this; an empty function lets all be
    /// made.
    void decideBy(Decide decide);

private:
    struct Shared;

    void answerCalls();
    void answerOne();

    Shared* shared_;
    pid_t child_ = -1;
    bool finished_ = false;
    UniqueFd listener_;
    UniqueFd wake_;
    std::mutex mutex_; ///< of decide_
    Decide decide_;
    std::thread thread_;
};

} // namespace velt::test

#endif
