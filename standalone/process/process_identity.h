// Processes told apart by pid and start time, so that a pid that the kernel has given to another process is
// never taken for the one that is meant.
#ifndef VELT_STANDALONE_PROCESS_PROCESS_IDENTITY_H
#define VELT_STANDALONE_PROCESS_PROCESS_IDENTITY_H

#include <sys/types.h>

#include <chrono>
#include <functional>
#include <optional>
#include <string>
#include <vector>

namespace velt {

struct ProcessId {
    pid_t pid = 0;                    ///< 0: no process
    unsigned long long startTime = 0; ///< in clock ticks since boot

    explicit operator bool() const { return pid > 0; }
    bool operator==(const ProcessId&) const = default;
};

/// What tells this boot of the machine from every other. A process is named by its ProcessId within one boot
/// only, so files that may outlive it note this beside one.
std::string bootId();

/// The numbers of all processes, in ascending order.
std::vector<pid_t> allPids();

/// The process that has this pid now; nothing when there is none or it has ended and only waits to be reaped.
std::optional<ProcessId> identifyProcess(pid_t pid);

/// Whether this very process still runs, or may: who takes it for gone would leave it behind.
bool isAlive(const ProcessId& process);

/// Sends the signal to this very process; nothing happens when it has ended.
void signalProcess(const ProcessId& process, int signal);

/// The children of a process, their children and so on; the process itself is not among them.
std::vector<ProcessId> descendantsOf(pid_t ancestor);

/// The children of a process alone.
std::vector<ProcessId> childrenOf(pid_t parent);

/// Whether the process waits for something: it does not compute at this moment.
bool isAsleep(const ProcessId& process);

/// The processes of the list that still run, and all that descend from these.
std::vector<ProcessId> livingTrees(const std::vector<ProcessId>& roots);

/// Ends all processes that `remaining` lists, which is asked again and again until it lists none: SIGTERM
/// first, SIGKILL when `patience` has passed. False when some are there even a second after that.
bool endProcesses(const std::function<std::vector<ProcessId>()>& remaining,
                  std::chrono::milliseconds patience);

/// The same with these processes and all that descend from them, also from those that end meanwhile.
bool endTrees(std::vector<ProcessId> roots, std::chrono::milliseconds patience);

} // namespace velt

#endif
