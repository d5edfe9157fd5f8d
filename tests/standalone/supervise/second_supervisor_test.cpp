// A supervisor that finds another one.
#include "base/unique_fd.h"
#include "standalone/control/supervised_daemon.h"
#include "standalone/core/state_root.h"
#include "tests/standalone/supervise/daemon_test.h"
#include "tests/support/ports.h"
#include "tests/support/result.h"

#include <fcntl.h>
#include <sys/file.h>

#include <chrono>
#include <filesystem>
#include <thread>

namespace velt::test {
namespace {

class SecondSupervisor : public DaemonTest {
protected:
    void TearDown() override {
        EXPECT_EQ(messageOf(sftp_.stop()), "");
        DaemonTest::TearDown();
    }

    SupervisedDaemon sftp_{sftpDaemon};
};

TEST_F(SecondSupervisor, IsRefused) {
    ASSERT_EQ(messageOf(sftp_.start(testOrder(freePort(), "one"))), "");
    const DaemonState before = daemonState(sftpDaemon);
    // As two processes would see it that both found nothing running.
    std::filesystem::remove(stateFile(statePath("/run/velt"), "sftp"));
    const DaemonOrder other = testOrder(freePort(), "two");
    const std::string refusal = messageOf(sftp_.start(other));
    EXPECT_NE(refusal.find("it already has a supervisor"), std::string::npos) << refusal;
    ASSERT_TRUE(storeDaemonState(stateFile(statePath("/run/velt"), "sftp"), before));
    EXPECT_TRUE(isServing(before));
}

TEST_F(SecondSupervisor, WaitsForOneThatIsAboutToEnd) {
    const auto folder = statePath("/run/velt");
    std::filesystem::create_directories(folder);
    UniqueFd former(::open(lockFile(folder, "sftp").c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600));
    ASSERT_EQ(::flock(former.get(), LOCK_EX), 0);
    std::thread farewell([&former] {
        std::this_thread::sleep_for(std::chrono::milliseconds(150));
        former.reset();
    });
    EXPECT_EQ(messageOf(sftp_.start(testOrder(freePort(), "one"))), "");
    farewell.join();
}

} // namespace
} // namespace velt::test
