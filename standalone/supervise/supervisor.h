// Keeps one daemon running.
#ifndef VELT_STANDALONE_SUPERVISE_SUPERVISOR_H
#define VELT_STANDALONE_SUPERVISE_SUPERVISOR_H

#include "base/result.h"
#include "base/unique_fd.h"
#include "standalone/supervise/back_off.h"
#include "standalone/supervise/control_channel.h"
#include "standalone/supervise/daemon_process.h"
#include "standalone/supervise/daemon_state.h"

#include <chrono>
#include <cstdint>
#include <filesystem>
#include <optional>
#include <string>

namespace velt {

/// The life of the process velt-supervise: it starts the daemon, starts it again when it ends unasked, obeys
/// the control socket and SIGTERM, inherits the sessions that outlive their listener, and keeps the state
/// file.
class Supervisor {
public:
    /// The listener hears what the daemon and its sessions write.
    Supervisor(std::filesystem::path folder, std::string name, DaemonProcess::Listener listener);

    /// Becomes the daemon's only supervisor, ends what a former one left, and starts the daemon. On failure
    /// nothing runs.
    Result<> begin(const DaemonOrder& order);

    /// Returns when the daemon was stopped.
    void run();

private:
    using Clock = DaemonProcess::Clock;

    Result<> takeLock();
    Result<> startDaemon(Clock::time_point deadline);
    Result<> handle(const ControlRequest& request);
    Result<> replaceDaemon(const DaemonOrder& order);
    Result<> pause();
    Result<> stop();
    Result<> endDaemon();
    void settleDaemon();
    void onSignals();
    void reapChildren();
    void onDaemonEnd(int waitStatus);
    void restartDaemon();
    int millisecondsToRestart() const;
    void restartAfter(Clock::duration run); ///< of the daemon; zero when it did not start
    void publish(RunState state, std::string reason = {});

    std::filesystem::path folder_;
    std::string name_;
    UniqueFd lock_;
    UniqueFd signals_;
    DaemonProcess daemon_;
    std::optional<ControlListener> control_;
    DaemonOrder order_;
    RunState state_ = RunState::stopped;
    Clock::time_point startedAt_;
    BackOff backOff_;
    std::uint64_t restarts_ = 0; ///< after the daemon had ended by itself
    std::optional<Clock::time_point> restartAt_;
    Result<> published_; ///< whether the state file says what is so
    bool finished_ = false;
};

} // namespace velt

#endif
