// A machine of the tests' own that a real systemd has booted: its processes, network, mounts, control groups
// and a root of which nothing that is written reaches the real one.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_SYSTEMD_WORLD_H
#define VELT_TESTS_SYSTEM_SUPPORT_SYSTEMD_WORLD_H

#include <sys/types.h>

#include <functional>
#include <stdexcept>
#include <string>

namespace velt::test {

/// The machine cannot be made here; what() says why.
class NoSystemd : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// One at a time, in a process with one thread; it moves this process into a mount name space of its own.
class SystemdWorld {
public:
    static constexpr unsigned aliceId = 1001;

    /// Boots. Its account is "alice", password "alice-secret", with the home /home/alice. Throws NoSystemd.
    SystemdWorld();
    /// Ends all that runs in it and removes what it had of the real machine: its control group.
    ~SystemdWorld();
    SystemdWorld(const SystemdWorld&) = delete;
    SystemdWorld& operator=(const SystemdWorld&) = delete;

    /// Runs the function in the machine, in a process of its own, and waits for its end: true when no
    /// expectation failed in there. What it writes to memory is lost.
    bool inside(const std::function<void()>& act);

    /// Shuts the machine down, as "systemctl reboot" does, and boots it again with the same disk. Throws
    /// std::runtime_error.
    void reboot();

private:
    void boot();
    void waitUntilBooted();
    void end();

    std::string group_;
    pid_t init_ = -1;
};

} // namespace velt::test

#endif
