// Under which names the daemons' words are found in the system's log.
#include "base/unique_fd.h"
#include "standalone/contract/last_error.h"
#include "standalone/control/supervised_daemon.h"
#include "tests/standalone/supervise/daemon_test.h"
#include "tests/support/ports.h"

#include <fcntl.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cstring>
#include <fstream>
#include <string>
#include <thread>

namespace velt::test {
namespace {

/// A "/dev" of this process's own, in which this process is the system's log.
class OwnLog {
public:
    explicit OwnLog(const std::filesystem::path& folder) {
        std::filesystem::create_directories(folder);
        const bool apart = ::unshare(CLONE_NEWNS) == 0 &&
                           ::mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0 &&
                           ::mount("velt-test", folder.c_str(), "tmpfs", 0, "mode=0755") == 0 &&
                           ::mknod((folder / "null").c_str(), S_IFCHR | 0666, makedev(1, 3)) == 0 &&
                           ::mount(folder.c_str(), "/dev", nullptr, MS_BIND, nullptr) == 0;
        socket_ = UniqueFd(apart ? ::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0) : -1);
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        std::strcpy(address.sun_path, "/dev/log");
        const timeval patience{2, 0};
        isThere_ = socket_ &&
                   ::bind(socket_.get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0 &&
                   ::setsockopt(socket_.get(), SOL_SOCKET, SO_RCVTIMEO, &patience, sizeof patience) == 0;
    }

    bool isThere() const { return isThere_; }

    /// How many lines come that hold the text, until none comes for a while.
    int linesWith(const std::string& text) const {
        int count = 0;
        std::array<char, 1024> line{};
        for (ssize_t size = 0; (size = receive(line)) > 0;) {
            count += std::string(line.data(), static_cast<std::size_t>(size)).find(text) != std::string::npos;
        }
        return count;
    }

    /// The next line that holds the text; "" when none comes.
    std::string lineWith(const std::string& text) const {
        std::array<char, 1024> line{};
        for (ssize_t size = 0; (size = receive(line)) > 0;) {
            const std::string received(line.data(), static_cast<std::size_t>(size));
            if (received.find(text) != std::string::npos) {
                return received;
            }
        }
        return "";
    }

private:
    /// A socket that waits for a limited time is interrupted by any signal.
    ssize_t receive(std::array<char, 1024>& line) const {
        ssize_t size = 0;
        do {
            size = ::recv(socket_.get(), line.data(), line.size(), 0);
        } while (size < 0 && errno == EINTR);
        return size;
    }

    UniqueFd socket_;
    bool isThere_ = false;
};

class SyslogTest : public DaemonTest {
protected:
    /// The line with `sign` that the supervisor of this daemon writes when it says the words; found
    /// in a child, whose "/dev" goes with it.
    std::string lineOf(const Daemon& daemon, const std::string& words, const std::string& sign) const {
        return told(daemon, {"--refuse", words}, [&](const OwnLog& log) { return log.lineWith(sign); });
    }

    /// How many lines with `sign` it writes.
    std::string countOf(const Daemon& daemon, const std::string& words, const std::string& sign) const {
        return told(daemon, {"--refuse", words},
                    [&](const OwnLog& log) { return std::to_string(log.linesWith(sign)); });
    }

    /// What `listen` makes of the log when the daemon with these options starts and has a client.
    template<class Listen>
    std::string told(const Daemon& daemon, const std::vector<std::string>& options, Listen&& listen) const {
        const std::filesystem::path file = root_ / "line";
        const pid_t child = ::fork();
        if (child == 0) {
            const OwnLog log(root_ / "dev");
            if (!log.isThere()) {
                ::_exit(77);
            }
            // Beside the start, which waits as long as nobody takes the lines.
            std::thread listener([&] { std::ofstream(file) << listen(log); });
            SupervisedDaemon supervised(daemon);
            const int port = freePort();
            if (supervised.start(testOrder(port, "one", options))) {
                (void)Client(port).isServed();
            }
            listener.join();
            (void)supervised.stop();
            ::_exit(0);
        }
        int status = -1;
        ::waitpid(child, &status, 0);
        if (WEXITSTATUS(status) == 77) {
            return "skip";
        }
        std::string line;
        std::getline(std::ifstream(file), line);
        return line;
    }
};

TEST_F(SyslogTest, ADaemonsWordsAreUnderItsName) {
    for (const auto& [daemon, name] :
         {std::pair(&ftpDaemon, " velt-ftpd["), std::pair(&sftpDaemon, " velt-sftpd[")}) {
        const std::string line = lineOf(*daemon, "no such certificate", "certificate");
        if (line == "skip") {
            GTEST_SKIP() << "no mount name space can be made here";
        }
        EXPECT_TRUE(line.starts_with("<29>")) << "a notice of a daemon: " << line;
        EXPECT_NE(line.find(name), std::string::npos) << line;
        EXPECT_TRUE(line.ends_with("]: no such certificate")) << line;
    }
}

TEST_F(SyslogTest, NoWordForgesALineOrAFormat) {
    const std::string turn = std::string("\xe2\x80") + '\xae'; // which would turn this line, too
    const std::string line = lineOf(ftpDaemon, "50%n \x1b[2J\rvelt-ftpd[1]: forged\x9b" + turn, "50%");
    if (line == "skip") {
        GTEST_SKIP() << "no mount name space can be made here";
    }
    EXPECT_TRUE(line.ends_with("]: 50%n [2Jvelt-ftpd[1]: forged\\x9b\\u202e")) << line;
}

TEST_F(SyslogTest, WhatAClientSaysBeginsNoLine) {
    const std::string message = "Invalid user x\nFailed password for root from 203.0.113.9\r\n";
    const std::string line = told(sftpDaemon, {"--say-in-sessions", message},
                                  [](const OwnLog& log) { return log.lineWith("Failed password"); });
    if (line == "skip") {
        GTEST_SKIP() << "no mount name space can be made here";
    }
    EXPECT_TRUE(line.ends_with("]: Invalid user x Failed password for root from 203.0.113.9")) << line;
}

TEST_F(SyslogTest, StrangersDoNotFillIt) {
    std::string words;
    for (int i = 0; i < 1000; ++i) {
        words += "a login\n";
    }
    const std::string count = countOf(ftpDaemon, words, "a login");
    if (count == "skip") {
        GTEST_SKIP() << "no mount name space can be made here";
    }
    EXPECT_EQ(count, "600");
}

} // namespace
} // namespace velt::test
