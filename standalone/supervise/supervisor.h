// Keeps one daemon running.
#ifndef VELT_STANDALONE_SUPERVISE_SUPERVISOR_H
#define VELT_STANDALONE_SUPERVISE_SUPERVISOR_H

#include "standalone/supervise/control_channel.h"
#include "standalone/supervise/daemon_process.h"
#include "standalone/supervise/service_state.h"

#include <chrono>
#include <cstdint>
#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace velt {

/// The life of the process velt-supervise: it starts the daemon, starts it again when it ends unasked, obeys
/// the control socket and SIGTERM, inherits the sessions that outlive their listener, and keeps the state
/// file.
class Supervisor {
public:
    Supervisor(std::filesystem::path directory, std::string service);
    ~Supervisor();
    Supervisor(const Supervisor&) = delete;
    Supervisor& operator=(const Supervisor&) = delete;

    /// Becomes the service's only supervisor, ends what a former one left, and starts the daemon: "" on
    /// success, else the reason in one line, and nothing runs.
    std::string begin(const DaemonOrder& order);

    /// Returns when the service was stopped.
    void run();

private:
    using Clock = DaemonProcess::Clock;

    bool takeLock();
    std::string startDaemon(Clock::time_point deadline);
    std::string handle(const ControlRequest& request);
    std::string replaceDaemon(const DaemonOrder& order);
    std::string pause();
    std::string stop();
    bool endDaemon();
    void settleDaemon();
    void onSignals();
    void reapChildren();
    void onDaemonEnd(int waitStatus);
    void restartDaemon();
    int millisecondsToRestart() const;
    void publish(RunState state, std::string reason = {});

    std::filesystem::path directory_;
    std::string service_;
    int lock_ = -1;
    int signals_ = -1;
    DaemonProcess daemon_;
    std::optional<ControlListener> control_;
    DaemonOrder order_;
    RunState state_ = RunState::stopped;
    Clock::time_point startedAt_;
    std::chrono::milliseconds backOff_;
    std::uint64_t restarts_ = 0; ///< after the daemon had ended by itself
    std::optional<Clock::time_point> restartAt_;
    bool finished_ = false;
};

} // namespace velt

#endif
