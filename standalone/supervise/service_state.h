// What is known about a supervised service: a small file that its supervisor keeps, for everybody who asks.
#ifndef VELT_STANDALONE_SUPERVISE_SERVICE_STATE_H
#define VELT_STANDALONE_SUPERVISE_SERVICE_STATE_H

#include "standalone/process/process_identity.h"

#include <cstdint>
#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace velt {

enum class RunState {
    stopped, ///< nothing runs; no file says this, the absence of the file does
    running,
    paused, ///< no listener; sessions of the former one may go on
    failed, ///< the daemon did not start, or ended and did not come back yet
};

struct ServiceState {
    RunState state = RunState::stopped;
    ProcessId supervisor;            ///< none when it ended after a failed start
    ProcessId daemon;                ///< none while paused or failed
    std::string configurationHash;   ///< what the daemon was started for
    std::vector<int> ports;          ///< on which the daemon listens
    std::vector<ProcessId> sessions; ///< those seen when the file was written
    std::string reason;              ///< of a failure, one line
    std::uint64_t restarts = 0;      ///< of the daemon, after it had ended by itself
};

/// The files of a service in the folder that holds all of them.
std::filesystem::path stateFile(const std::filesystem::path& directory, const std::string& service);
std::filesystem::path lockFile(const std::filesystem::path& directory, const std::string& service);
std::filesystem::path orderFile(const std::filesystem::path& directory, const std::string& service);

/// Nothing when there is no such file, not one of this form, or one from before the machine started: its
/// processes are gone, and others may have their numbers.
std::optional<ServiceState> readServiceState(const std::filesystem::path& file);

/// Replaces the file; it is whole at every moment. False on failure, errno says why.
bool writeServiceState(const std::filesystem::path& file, const ServiceState& state);

/// Whether the service does what its file says: the daemon lives and itself listens on its ports.
bool isServing(const ServiceState& state);

/// Ends everything that a supervisor which is gone left behind. False when something resists.
bool endLeftovers(const ServiceState& state);

} // namespace velt

#endif
