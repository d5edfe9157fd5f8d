// A daemon under test, started straight from its plan.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_DAEMON_PROCESS_H
#define VELT_TESTS_SYSTEM_SUPPORT_DAEMON_PROCESS_H

#include "standalone/supervise/daemon_order.h"

#include <sys/types.h>

#include <string>

namespace velt::test {

class DaemonProcess {
public:
    DaemonProcess() = default;
    ~DaemonProcess() { stop(); }
    DaemonProcess(const DaemonProcess&) = delete;
    DaemonProcess& operator=(const DaemonProcess&) = delete;

    /// Starts the daemon and waits until it listens; false, with the daemon's own output shown, when it does
    /// not.
    bool start(const DaemonOrder& order);

    /// Ends the daemon and waits for its end.
    void stop();

    pid_t pid() const { return pid_; }
    bool runs() const { return pid_ > 0; }

    /// What daemons have written to their outputs, their log, since the last one was started.
    static std::string output();

private:
    pid_t pid_ = -1;
};

/// Whether something in this network name space listens on the TCP port.
bool isListening(int port);

} // namespace velt::test

#endif
