// velt-supervise as the child of a service manager: what it is told by files, and what it says to the
// manager.

#include "base/file.h"
#include "standalone/core/installed_files.h"
#include "standalone/core/state_root.h"
#include "standalone/supervise/control_channel.h"
#include "standalone/supervise/daemon_state.h"
#include "tests/standalone/supervise/daemon_test.h"
#include "tests/support/ports.h"
#include "tests/support/result.h"

#include <spawn.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <csignal>
#include <cstddef>

namespace velt::test {
namespace {

using std::chrono::seconds;

class ManagedSupervisor : public DaemonTest {
protected:
    void SetUp() override {
        DaemonTest::SetUp();
        directory_ = statePath("/run/velt");
        std::filesystem::create_directories(directory_);
        listenAt((root_ / "notify").string());
    }

    void TearDown() override {
        ::close(socket_);
        DaemonTest::TearDown();
    }

    /// Where the manager listens; a name that begins with "@" is no file.
    void listenAt(const std::string& place) {
        ::close(socket_);
        place_ = place;
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        place.copy(address.sun_path, sizeof address.sun_path - 1);
        if (place.front() == '@') {
            address.sun_path[0] = '\0';
        }
        const auto size = static_cast<socklen_t>(offsetof(sockaddr_un, sun_path) + place.size());
        socket_ = ::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
        ASSERT_EQ(::bind(socket_, reinterpret_cast<const sockaddr*>(&address), size), 0);
    }

    void order(const std::vector<std::string>& options = {}) const {
        const ControlRequest request{Command::start, testOrder(port_, "one", options)};
        ASSERT_TRUE(replaceFile(orderFile(directory_, "sftp"), encodeRequest(request), 0600));
    }

    pid_t run() const {
        std::string program = installedFile("velt-supervise");
        std::string directory = directory_;
        std::string service = "sftp";
        std::string place = "NOTIFY_SOCKET=" + place_;
        std::array<char*, 4> arguments{program.data(), directory.data(), service.data(), nullptr};
        std::array<char*, 2> environment{place.data(), nullptr};
        pid_t pid = -1;
        EXPECT_EQ(
            ::posix_spawn(&pid, program.c_str(), nullptr, nullptr, arguments.data(), environment.data()), 0);
        return pid;
    }

    static constexpr const char* nothing = "nothing";

    /// The next message.
    std::string heard(int flags = 0) const {
        std::array<char, 1000> message{};
        const timeval limit{5, 0};
        ::setsockopt(socket_, SOL_SOCKET, SO_RCVTIMEO, &limit, sizeof limit);
        const ssize_t length = ::recv(socket_, message.data(), message.size(), flags);
        return length < 0 ? nothing : std::string(message.data(), static_cast<std::size_t>(length));
    }

    static int exitCodeOf(pid_t pid) {
        int status = -1;
        ::waitpid(pid, &status, 0);
        return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    }

    std::filesystem::path directory_;
    int port_ = freePort();
    int socket_ = -1;
    std::string place_;
};

TEST_F(ManagedSupervisor, StaysInTheForegroundAndSaysWhenTheDaemonServes) {
    order();
    const pid_t supervisor = run();
    EXPECT_EQ(heard(), "STATUS=the daemon serves");
    EXPECT_EQ(heard(), "READY=1");
    EXPECT_TRUE(accepts(port_));
    EXPECT_EQ(loadDaemonState(stateFile(directory_, "sftp"))->supervisor.pid, supervisor);

    const auto answer = askSupervisor(directory_, "sftp", {Command::pause, {}}, seconds(5));
    ASSERT_TRUE(answer);
    ASSERT_EQ(messageOf(*answer), "");
    EXPECT_EQ(heard(), "STATUS=paused: open sessions continue");
    ::kill(supervisor, SIGTERM);
    EXPECT_EQ(exitCodeOf(supervisor), 0);
    EXPECT_FALSE(std::filesystem::exists(stateFile(directory_, "sftp")));
}

TEST_F(ManagedSupervisor, TheManagersPlaceMayBeNoFile) {
    listenAt("@velt-test-" + std::to_string(::getpid()));
    order();
    const pid_t supervisor = run();
    EXPECT_EQ(heard(), "STATUS=the daemon serves");
    EXPECT_EQ(heard(), "READY=1");
    ::kill(supervisor, SIGTERM);
    EXPECT_EQ(exitCodeOf(supervisor), 0);
}

TEST_F(ManagedSupervisor, AFailedStartIsItsLastWord) {
    order({"--refuse", "fatal: no such certificate"});
    EXPECT_EQ(exitCodeOf(run()), 1);
    std::string last;
    for (std::string next = heard(MSG_DONTWAIT); next != nothing; next = heard(MSG_DONTWAIT)) {
        last = next;
    }
    EXPECT_EQ(last, "STATUS=fatal: no such certificate");
}

TEST_F(ManagedSupervisor, WithoutAnOrderItSaysSo) {
    const pid_t supervisor = run();
    EXPECT_EQ(heard(), "STATUS=" + directory_.string() + " has no valid order for sftp");
    EXPECT_EQ(exitCodeOf(supervisor), 1);
    ASSERT_TRUE(replaceFile(orderFile(directory_, "sftp"), encodeRequest({Command::stop, {}}), 0600));
    EXPECT_EQ(exitCodeOf(run()), 1) << "not an order to start";
}

} // namespace
} // namespace velt::test
