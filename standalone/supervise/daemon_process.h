// One daemon in the foreground: its start, its readiness, and its last words.
#ifndef VELT_STANDALONE_SUPERVISE_DAEMON_PROCESS_H
#define VELT_STANDALONE_SUPERVISE_DAEMON_PROCESS_H

#include "standalone/process/process_identity.h"

#include <chrono>
#include <deque>
#include <string>
#include <vector>

namespace velt {

/// What is to run.
struct DaemonOrder {
    std::string configurationHash;
    std::vector<int> ports;             ///< the daemon is ready when it listens on all of them
    std::vector<std::string> arguments; ///< arguments[0] is an absolute path
};

/// The daemon of one supervisor, which must be its parent. Belongs to one thread.
class DaemonProcess {
public:
    using Clock = std::chrono::steady_clock;

    /// Opens the pipe for what the daemon and its sessions write to their standard output and error.
    DaemonProcess();
    ~DaemonProcess();
    DaemonProcess(const DaemonProcess&) = delete;
    DaemonProcess& operator=(const DaemonProcess&) = delete;

    /// Starts the daemon and waits until it listens. "" when it does; else why it does not, in the daemon's
    /// own words where it has some, and it is gone. All that it writes goes to syslog.
    std::string start(const DaemonOrder& order, Clock::time_point deadline);

    /// The running daemon; no process before a start and after ended().
    const ProcessId& id() const { return id_; }

    /// To be told when the daemon was reaped with this status; returns why, as start() does.
    std::string ended(int waitStatus);

    /// Becomes readable when the daemon has written something, which readOutput() then takes.
    int outputDescriptor() const { return readEnd_; }
    void readOutput();

private:
    std::string spawn(const DaemonOrder& order);
    std::string waitUntilListening(const DaemonOrder& order, Clock::time_point deadline);
    std::string takeLastWords();
    void takeLine(std::string line);

    int readEnd_ = -1;
    int writeEnd_ = -1; ///< kept, so that the read end never sees an end of file
    ProcessId id_;
    std::string partialLine_;
    std::deque<std::string> lastLines_;
};

} // namespace velt

#endif
