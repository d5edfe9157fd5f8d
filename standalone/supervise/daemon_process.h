// One daemon in the foreground: its start, its readiness, and its last words.
#ifndef VELT_STANDALONE_SUPERVISE_DAEMON_PROCESS_H
#define VELT_STANDALONE_SUPERVISE_DAEMON_PROCESS_H

#include "base/pipe.h"
#include "base/rate_limit.h"
#include "base/result.h"
#include "standalone/process/process_identity.h"
#include "standalone/supervise/daemon_order.h"

#include <chrono>
#include <deque>
#include <functional>
#include <string>
#include <string_view>

namespace velt {

/// The daemon of one supervisor, which must be its parent. Belongs to one thread.
class DaemonProcess {
public:
    using Clock = std::chrono::steady_clock;

    /// Told of each message that the daemon or a session of it wrote at once, as it came.
    using Listener = std::function<void(std::string_view message)>;

    /// Opens the pipe for what the daemon and its sessions write to their standard output and error.
    explicit DaemonProcess(Listener listener = {});

    /// Starts the daemon and waits until it listens. Before the daemon does anything, `announce` is called,
    /// so that it can be written down as one of this process's. On failure the daemon is gone, and the error
    /// is its own last words where it has some. What it writes goes to syslog, but no more than 600 lines a
    /// minute, since strangers can make it write; a line tells how many are missing.
    Result<> start(const DaemonOrder& order, Clock::time_point deadline,
                   const std::function<Result<>()>& announce);

    /// The running daemon; no process before a start and after ended().
    const ProcessId& id() const { return id_; }

    /// To be told when the daemon was reaped with this status; returns why it ended.
    Error ended(int waitStatus);

    /// To be called when it has a successor: no daemon is started here again. What its sessions say is still
    /// read.
    void retire() { output_.writeEnd.reset(); }

    /// After retire(): whether the last of them has ended.
    bool isSilent() const { return silent_; }

    /// Becomes readable when the daemon has written something, which readOutput() then takes, as far as it is
    /// there.
    int outputDescriptor() const { return output_.readEnd.get(); }
    void readOutput();

private:
    Result<> spawn(const DaemonOrder& order, const std::function<Result<>()>& announce);
    Result<> waitUntilListening(const DaemonOrder& order, Clock::time_point deadline);
    std::string takeLastWords();
    void takeLine(std::string line);
    void log(const std::string& line);

    Listener listener_;
    Pipe output_; ///< with its write end, so that the read end sees no end of file before retire()
    bool silent_ = false;
    ProcessId id_;
    std::string partialLine_;
    bool serves_ = false; ///< what it says may contain what its clients say
    RateLimit logged_{600, std::chrono::minutes(1)};
    std::deque<std::string> lastLines_;
};

} // namespace velt

#endif
