// What is known about a supervised daemon: a small file that its supervisor keeps, for all who ask.
#ifndef VELT_STANDALONE_SUPERVISE_DAEMON_STATE_H
#define VELT_STANDALONE_SUPERVISE_DAEMON_STATE_H

#include "base/result.h"
#include "standalone/process/process_identity.h"

#include <cstdint>
#include <filesystem>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace velt {

enum class RunState {
    stopped, ///< nothing runs; no file says this, the absence of the file does
    running,
    paused, ///< no listener; sessions of the former one may go on
    failed, ///< the daemon did not start, or ended and did not come back yet
    closed, ///< switched off: no listener; with the last of its sessions its supervisor ends
};

struct DaemonState {
    RunState state = RunState::stopped;
    ProcessId supervisor;            ///< none when it ended after a failed start
    ProcessId daemon;                ///< none while paused, failed or closed
    std::string configurationHash;   ///< what the daemon was started for
    std::vector<int> ports;          ///< on which the daemon listens
    std::vector<ProcessId> sessions; ///< those seen when the file was written
    std::vector<ProcessId> retired;  ///< daemons with a successor, which still take what waits for them
    std::string reason;              ///< of a failure, one line
    std::uint64_t restarts = 0;      ///< of the daemon, after it had ended by itself
};

/// The files of a daemon in the folder that holds those of all.
std::filesystem::path stateFile(const std::filesystem::path& folder, std::string_view daemon);
std::filesystem::path lockFile(const std::filesystem::path& folder, std::string_view daemon);
std::filesystem::path orderFile(const std::filesystem::path& folder, std::string_view daemon);

/// Nothing when there is no such file, not one of this form, or one from before the machine started: its
/// processes are gone, and others may have their numbers. An error when that cannot be told.
Result<std::optional<DaemonState>> readDaemonState(const std::filesystem::path& file);

/// The same for those who only want to tell somebody: nothing when it cannot be told.
std::optional<DaemonState> loadDaemonState(const std::filesystem::path& file);

/// Replaces the file; it is whole at every moment.
Result<> storeDaemonState(const std::filesystem::path& file, const DaemonState& state);

/// Whether the daemon does what its file says: it lives and listens on its ports itself.
bool isServing(const DaemonState& state);

/// The sessions of now: one process each, of the daemon, of a retired one, or left behind by a former one.
std::vector<ProcessId> sessionsOf(const DaemonState& state);

/// Ends everything that a former supervisor left behind. False when some of it does not end.
bool endLeftovers(const DaemonState& state);

} // namespace velt

#endif
