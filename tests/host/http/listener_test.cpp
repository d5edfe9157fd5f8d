// Where the host listens: addresses, Unix sockets, and sockets that are handed over.

#include "host/http/listener.h"

#include "base/unique_fd.h"
#include "host/base/account_names.h"
#include "tests/host/host_test.h"
#include "tests/support/waiting.h"

#include <fcntl.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <cstdlib>
#include <fstream>
#include <functional>
#include <optional>
#include <thread>
#include <vector>

namespace {

TEST(Listening, OtherMachinesNeedAnExplicitChoice) {
    using velt::host::Listener;
    using velt::host::ListenError;
    EXPECT_THROW(Listener::tcp("0.0.0.0:0", false), ListenError);
    EXPECT_THROW(Listener::tcp("[::]:0", false), ListenError);
    EXPECT_NO_THROW(Listener::tcp("0.0.0.0:0", true));
    EXPECT_NO_THROW(Listener::tcp("127.1.2.3:0", false));
    for (const char* address : {"127.0.0.1", "127.0.0.1:", "nonsense:80:80", "127.0.0.1:http", ":"}) {
        EXPECT_THROW(Listener::tcp(address, false), ListenError) << address;
    }
}

TEST(Listening, APortInUseIsAnError) {
    using velt::host::Listener;
    const Listener first = Listener::tcp("127.0.0.1:0", false);
    EXPECT_THROW(Listener::tcp(first.name(), false), velt::host::ListenError);
}

class Doors : public HostTest {};

/// As long as it lives, this process can open so many files more.
class FilesLeft {
public:
    explicit FilesLeft(rlim_t count) {
        getrlimit(RLIMIT_NOFILE, &former_);
        const velt::UniqueFd next(open("/dev/null", O_RDONLY | O_CLOEXEC));
        const rlimit few{static_cast<rlim_t>(next.get()) + count, former_.rlim_max};
        setrlimit(RLIMIT_NOFILE, &few);
    }
    ~FilesLeft() { setrlimit(RLIMIT_NOFILE, &former_); }
    FilesLeft(const FilesLeft&) = delete;
    FilesLeft& operator=(const FilesLeft&) = delete;

private:
    rlimit former_{};
};

TEST_F(Doors, OpenToAGroupThatCouldNotBeLookedUpAtFirst) {
    using velt::host::Listener;
    if (geteuid() != 0) {
        GTEST_SKIP() << "only root can give a socket to any group";
    }
    const std::string path = (folder / "shared").string();
    const auto groupOfSocket = [&path] {
        struct stat status {};
        return stat(path.c_str(), &status) == 0 ? velt::host::groupName(status.st_gid) : "no socket";
    };
    limits.groupSearch = std::chrono::milliseconds(10);
    start();
    velt::host::HttpServer other(*app, limits, {});
    std::optional<FilesLeft> few(std::in_place, 1); // for the socket
    Listener listener = Listener::unixSocket(path, "daemon");
    few.reset();
    EXPECT_EQ(groupOfSocket(), "root");
    other.add(std::move(listener));
    other.start(1);
    EXPECT_TRUE(velt::test::waitUntil([&] { return groupOfSocket() == "daemon"; }, velt::test::patience));
}

TEST_F(Doors, CloseWhileClientsConnect) {
    for (int i = 0; i < 10; ++i) {
        start();
        std::atomic<int> connected{0};
        std::vector<std::thread> clients;
        for (int one = 0; one < 4; ++one) {
            clients.emplace_back([&] {
                while (Client::unixSocket(socketPath).connected()) {
                    ++connected;
                }
            });
        }
        EXPECT_TRUE(velt::test::waitUntil([&] { return connected > 20; }, velt::test::patience));
        stop();
        for (std::thread& client : clients) {
            client.join(); // it finds the door closed
        }
    }
}

class UnixSocket : public HostTest {};

TEST_F(UnixSocket, WhatADeadHostLeftIsReplacedALiveOneIsNot) {
    using velt::host::Listener;
    {
        const Listener live = Listener::unixSocket(socketPath, "no-such-group");
        EXPECT_THROW(Listener::unixSocket(socketPath, "no-such-group"), velt::host::ListenError);
        EXPECT_TRUE(std::filesystem::exists(socketPath));
        std::filesystem::rename(socketPath, socketPath + ".stale");
    }
    std::filesystem::rename(socketPath + ".stale", socketPath);
    EXPECT_NO_THROW(Listener::unixSocket(socketPath, "no-such-group"));
    std::ofstream(socketPath) << "a file";
    EXPECT_THROW(Listener::unixSocket(socketPath, "no-such-group"), velt::host::ListenError);
    EXPECT_TRUE(std::filesystem::exists(socketPath)) << "somebody's file";
}

/// Runs `check` in a process that was handed the descriptors from 3 on; whether it returned true there.
bool holdsWhenHandedOver(const std::vector<int>& descriptors, const std::function<bool()>& check) {
    const pid_t child = fork();
    if (child == 0) {
        // First out of the way of 3 and its followers, some of which they may be.
        std::vector<int> copies;
        for (const int descriptor : descriptors) {
            copies.push_back(fcntl(descriptor, F_DUPFD, 100));
        }
        for (std::size_t i = 0; i < copies.size(); ++i) {
            dup2(copies[i], 3 + static_cast<int>(i));
        }
        setenv("LISTEN_PID", std::to_string(getpid()).c_str(), 1);           // NOLINT(concurrency-mt-unsafe)
        setenv("LISTEN_FDS", std::to_string(descriptors.size()).c_str(), 1); // NOLINT(concurrency-mt-unsafe)
        bool good = false;
        try {
            good = check();
        } catch (...) {
        }
        _exit(good ? 0 : 1);
    }
    int status = 0;
    waitpid(child, &status, 0);
    return WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

class HandedOver : public HostTest {};

TEST_F(HandedOver, SocketsAreTakenAndKept) {
    using velt::host::Listener;
    const Listener tcp = Listener::tcp("127.0.0.1:0", false);
    const Listener local = Listener::unixSocket(socketPath, "no-such-group");
    // Asked for before: what is handed over may take the place of its descriptor.
    const std::string address = tcp.name();
    EXPECT_TRUE(holdsWhenHandedOver({tcp.descriptor(), local.descriptor()}, [&] {
        const std::vector<Listener> taken = Listener::inherited(false);
        return taken.size() == 2 && taken[0].descriptor() == 3 && taken[0].name() == address &&
               !taken[0].isUnixSocket() && taken[1].isUnixSocket() && taken[1].name() == socketPath &&
               (fcntl(3, F_GETFD) & FD_CLOEXEC) != 0 && (fcntl(4, F_GETFL) & O_NONBLOCK) != 0;
    }));
    EXPECT_TRUE(std::filesystem::exists(socketPath)) << "the path is the service manager's";
}

TEST_F(HandedOver, SocketsOfAnotherProcessAreNotTaken) {
    using velt::host::Listener;
    const Listener tcp = Listener::tcp("127.0.0.1:0", false);
    EXPECT_TRUE(holdsWhenHandedOver({tcp.descriptor()}, [] {
        setenv("LISTEN_PID", "1", 1); // NOLINT(concurrency-mt-unsafe)
        return Listener::inherited(false).empty();
    }));
    EXPECT_TRUE(Listener::inherited(false).empty());
}

TEST_F(HandedOver, OtherMachinesNeedAnExplicitChoiceAsWell) {
    using velt::host::Listener;
    const Listener remote = Listener::tcp("0.0.0.0:0", true);
    EXPECT_TRUE(
        holdsWhenHandedOver({remote.descriptor()}, [] { return Listener::inherited(true).size() == 1; }));
    EXPECT_TRUE(holdsWhenHandedOver({remote.descriptor()}, [] {
        try {
            Listener::inherited(false);
            return false;
        } catch (const velt::host::ListenError& error) {
            return std::string(error.what()).find("needs --allow-remote") != std::string::npos;
        }
    }));
}

TEST_F(HandedOver, WhatDoesNotListenIsRefused) {
    using velt::host::Listener;
    std::ofstream(folder / "file") << "no socket";
    const int file = open((folder / "file").c_str(), O_RDONLY | O_CLOEXEC);
    const int idle = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    for (const int descriptor : {file, idle}) {
        EXPECT_TRUE(holdsWhenHandedOver({descriptor}, [] {
            try {
                Listener::inherited(true);
                return false;
            } catch (const velt::host::ListenError& error) {
                return std::string(error.what()).find("descriptor 3") != std::string::npos;
            }
        }));
        close(descriptor);
    }
}

} // namespace
