// What the tests under systemd do inside their machine.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_SYSTEMD_SERVICES_H
#define VELT_TESTS_SYSTEM_SUPPORT_SYSTEMD_SERVICES_H

#include "tests/standalone/support/daemon_states.h"
#include "tests/support/run_program.h"
#include "tests/system/support/systemd_world.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <functional>
#include <memory>
#include <string>
#include <thread>

namespace velt::test {

/// A machine for each test, fresh from its boot.
class UnderSystemd : public testing::Test {
protected:
    void SetUp() override;
    void inside(const std::function<void()>& act) { EXPECT_TRUE(world_->inside(act)); }
    void reboot() { world_->reboot(); }

private:
    std::unique_ptr<SystemdWorld> world_;
};

// All of these are for use inside.

/// Opens the platform's state on the machine's root.
void openMachine();

/// Stores which of FTP and FTPS are served, and whether users are confined to their homes.
void storeFtp(int flags, int atPort = 21, bool confined = true);
void storeSftp(bool enabled, int atPort = 2222);

/// "active", "inactive" or "failed".
std::string unitState(const std::string& unit);
std::string unitProperty(const std::string& unit, const std::string& name);

/// Whether the service is back within two seconds, with another daemon than the former.
bool isBack(const std::string& service, const ProcessId& former);

/// What alice gets when she fetches this path by FTP; "" when she is refused.
std::string fetchByFtp(const std::string& path = "/home-of", int fromPort = 21);

/// Gives alice a key, which lies in /root/key, and a file "large".
void letAliceInByKey();

/// alice fetches her large file by SFTP, in four seconds.
class SlowTransfer {
public:
    /// Returns when data flows.
    explicit SlowTransfer(int fromPort);
    ~SlowTransfer();
    SlowTransfer(const SlowTransfer&) = delete;
    SlowTransfer& operator=(const SlowTransfer&) = delete;

    /// Waits for the end; true when the whole file arrived.
    bool succeeds();

private:
    ProcessResult result_;
    std::thread client_;
};

/// Installs all, as an administrator does who has built it, and has the host started now and at each boot.
void installAndEnableHost();

/// Whether the host answers soon. From then on it has started what is enabled.
bool hostAnswers();

/// alice logs in over SFTP and does this; the first command that fails ends it.
ProcessResult runSftp(int atPort, const std::string& commands);

/// alice logs in over SFTP, to the service or to another server, and asks where she is.
ProcessResult logInBySftp(int atPort);

} // namespace velt::test

#endif
