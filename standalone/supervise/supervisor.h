// Keeps one daemon running.
#ifndef VELT_STANDALONE_SUPERVISE_SUPERVISOR_H
#define VELT_STANDALONE_SUPERVISE_SUPERVISOR_H

#include "base/result.h"
#include "base/unique_fd.h"
#include "standalone/supervise/back_off.h"
#include "standalone/supervise/control_channel.h"
#include "standalone/supervise/daemon_process.h"
#include "standalone/supervise/daemon_state.h"
#include "standalone/supervise/retirement.h"

#include <chrono>
#include <cstdint>
#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace velt {

/// The life of the process velt-supervise: it starts the daemon, starts it again when it ends unasked, obeys
/// the control socket and SIGTERM, inherits the sessions that outlive their listener, and keeps the state
/// file. Where it can, it has a daemon of another order listen before the former one ends; the sessions of
/// all former ones are its own as well.
class Supervisor {
public:
    /// The listener hears what the daemon and its sessions write.
    Supervisor(std::filesystem::path folder, std::string name, DaemonProcess::Listener listener);

    /// Becomes the daemon's only supervisor, ends what a former one left, and starts the daemon. On failure
    /// nothing runs.
    Result<> begin(const DaemonOrder& order);

    /// Returns when the daemon was stopped, or closed and the last of its sessions has ended.
    void run();

private:
    using Clock = DaemonProcess::Clock;

    Result<> takeLock();
    Result<> startDaemon(Clock::time_point deadline);
    void waitForEvents();
    Result<SessionCount> handle(const ControlRequest& request);
    Result<SessionCount> follow(const DaemonOrder& order, bool endSessions);
    bool canHandOver(const DaemonOrder& order) const;
    Result<> handOver(const DaemonOrder& order, Clock::time_point deadline);
    Result<> exchange(const DaemonOrder& order, Clock::time_point deadline);
    DaemonState processes() const; ///< its members that name processes
    std::vector<ProcessId> sessions() const { return sessionsOf(processes()); }
    Result<SessionCount> settleSessions(const std::vector<ProcessId>& sessions, bool end);
    Result<SessionCount> pause();
    Result<SessionCount> stop();
    Result<SessionCount> close();
    void endIfEmpty();
    void leave();
    Result<> endDaemon();
    void finishRetirement();
    void settleDaemon();
    void onSignals();
    void reapChildren();
    void onDaemonEnd(int waitStatus);
    void restartDaemon();
    int millisecondsToNextTask() const;
    void restartAfter(Clock::duration run);                 ///< of the daemon; zero when it did not start
    DaemonState record(RunState state, std::string reason); ///< writes the state file
    void publish(RunState state, std::string reason = {});

    std::filesystem::path folder_;
    std::string name_;
    UniqueFd lock_;
    UniqueFd signals_;
    DaemonProcess::Listener listener_;
    std::unique_ptr<DaemonProcess> daemon_;
    std::vector<std::unique_ptr<DaemonProcess>> former_; ///< those whose sessions may still say something
    std::optional<Retirement> retirement_;               ///< of the last of them
    std::optional<ControlListener> control_;
    DaemonOrder order_;
    RunState state_ = RunState::stopped;
    std::string reason_; ///< of the state, if it is a failure
    Clock::time_point startedAt_;
    BackOff backOff_;
    std::uint64_t restarts_ = 0; ///< after the daemon had ended by itself
    std::optional<Clock::time_point> restartAt_;
    Result<> published_; ///< whether the state file says what is so
    bool finished_ = false;
};

} // namespace velt

#endif
