// An operation that is done again and again, while one system call after another fails.
#ifndef VELT_TESTS_SUPPORT_FAULT_SWEEP_H
#define VELT_TESTS_SUPPORT_FAULT_SWEEP_H

#include "tests/support/call_watch.h"

#include <chrono>
#include <functional>
#include <string>

namespace velt::test {

/// One run of the operation, which has ended.
struct SweptRun {
    std::string fault; ///< "veltd: openat /etc/velt/ftp.conf: Too many open files", for messages
    SeenCall call;     ///< the one that failed
    ChildEnd end;
};

/// Which fail of the calls that differ in numbers alone.
enum class Share {
    first,
    firstAndLast,
    all,
};

struct FaultSweep {
    /// Before each run, in this process: brings what the run finds back to the same state.
    std::function<void()> prepare;

    /// The operation, in a child for each run.
    std::function<std::string()> act;

    /// While it runs, in this process: asks something of it, say, and ends one that would go on.
    std::function<void(pid_t child)> meanwhile;

    /// A process that serves: its calls are failed, and the operation is done in this process.
    CallWatch* server = nullptr;

    /// Which calls are failed; all but those of isLoading when empty.
    std::function<bool(const SeenCall&)> counts;

    /// After each run in which a call has failed, and the first without, in this process. What the child has
    /// started may still run; nothing of it must be left at the end.
    std::function<void(const SweptRun&)> check;

    /// Nothing fails before the operation has called beginFaults().
    bool hasBegin = false;

    Share share = Share::firstAndLast;

    /// Where a run takes long: how many of these there are for one that fails, unless the environment has
    /// VELT_LOAD=long.
    std::size_t oneOf = 1;

    std::chrono::milliseconds limit{10'000}; ///< for one run; the test fails past it
};

/// Called within the operation: what comes before, or after, is no part of it, and does not fail.
void beginFaults();
void endFaults();

/// Whether the call loads a program, its libraries, or what belongs to these.
bool isLoading(const SeenCall& call);

/// Does the operation once to learn its calls, and then once for each of its share of them, which fails. With
/// VELT_ALL_FAULTS in the environment, all do, and with several errors. Returns how many were tried.
int sweepFaults(const FaultSweep& sweep);

} // namespace velt::test

#endif
