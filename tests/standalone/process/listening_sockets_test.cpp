// Reading the kernel's tables, and opening ports on trial.

#include "standalone/ports/known_services.h"
#include "standalone/ports/port_probe.h"
#include "standalone/ports/port_range.h"
#include "standalone/process/listening_sockets.h"
#include "tests/standalone/supervise/daemon_test.h"
#include "tests/support/ports.h"
#include "tests/support/result.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sched.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <optional>
#include <string_view>

namespace velt::test {
namespace {

TEST(ListeningSockets, AreFoundForIPv4AndIPv6) {
    const int port = freePort();
    EXPECT_FALSE(listensOn(::getpid(), port));
    {
        const Listener listener(port);
        EXPECT_TRUE(listensOn(::getpid(), port));
        EXPECT_FALSE(listensOn(::getppid(), port)) << "another process listens";
    }
    EXPECT_FALSE(listensOn(::getpid(), port));

    const int six = ::socket(AF_INET6, SOCK_STREAM | SOCK_CLOEXEC, 0);
    sockaddr_in6 address{};
    address.sin6_family = AF_INET6;
    address.sin6_port = htons(static_cast<in_port_t>(port));
    if (six < 0 || ::bind(six, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) {
        ::close(six);
        GTEST_SKIP() << "no IPv6 here";
    }
    EXPECT_FALSE(listensOn(::getpid(), port)) << "bound is not listening";
    ASSERT_EQ(::listen(six, 1), 0);
    EXPECT_TRUE(listensOn(::getpid(), port));
    ::close(six);
}

/// Whether the socket that listens on the port can be reached from loopback alone, as both ways of asking
/// tell; nothing when they disagree.
std::optional<bool> isOfLoopback(int port) {
    const auto of = [port](const std::vector<ListeningSocket>& sockets) -> std::optional<bool> {
        const auto found = std::ranges::find(sockets, port, &ListeningSocket::port);
        return found == sockets.end() ? std::nullopt : std::optional(found->ofLoopback);
    };
    const auto asked = of(listeningSockets().valueOr({}));
    const auto read = of(readListeningSockets().valueOr({}));
    return asked == read ? asked : std::nullopt;
}

TEST(ListeningSockets, OfLoopbackAreToldApart) {
    const struct {
        const char* address;
        bool loopback;
    } cases[]{{"127.0.0.1", true}, {"127.9.9.9", true},        {"0.0.0.0", false},
              {"::1", true},       {"::ffff:127.0.0.1", true}, {"::", false}};
    for (const auto& each : cases) {
        const bool four = std::string_view(each.address).find(':') == std::string_view::npos;
        const int descriptor = ::socket(four ? AF_INET : AF_INET6, SOCK_STREAM | SOCK_CLOEXEC, 0);
        const int port = freePort();
        sockaddr_in6 six{};
        six.sin6_family = AF_INET6;
        six.sin6_port = htons(static_cast<in_port_t>(port));
        ::inet_pton(AF_INET6, each.address, &six.sin6_addr);
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_port = htons(static_cast<in_port_t>(port));
        ::inet_pton(AF_INET, each.address, &address.sin_addr);
        const auto* const name =
            four ? reinterpret_cast<const sockaddr*>(&address) : reinterpret_cast<const sockaddr*>(&six);
        if (::bind(descriptor, name, four ? sizeof address : sizeof six) == 0) {
            ASSERT_EQ(::listen(descriptor, 1), 0);
            EXPECT_EQ(isOfLoopback(port), each.loopback) << each.address;
        } else {
            EXPECT_FALSE(four) << "only a machine without IPv6 has no such address: " << each.address;
        }
        ::close(descriptor);
    }
}

// Starts a process that listens and hides it, as daemons do that have changed their rights, and asks as the
// same user. The exit code says what was seen of it: 1 for its port, 2 for another.
int seenByItsOwnUser(int port, int otherPort) {
    constexpr uid_t stranger = 65534;
    if (::geteuid() == 0 && ::setresuid(stranger, stranger, stranger) != 0) {
        return -1;
    }
    std::array<int, 2> ready{};
    std::array<int, 2> end{};
    if (::pipe(ready.data()) != 0 || ::pipe(end.data()) != 0) {
        return -1;
    }
    const pid_t daemon = ::fork();
    char byte = 0;
    if (daemon == 0) {
        ::close(end[1]);
        const Listener listener(port);
        const bool hidden = ::prctl(PR_SET_DUMPABLE, 0) == 0;
        ::_exit(hidden && ::write(ready[1], "x", 1) == 1 && ::read(end[0], &byte, 1) == 0 ? 0 : 1);
    }
    const bool isReady = ::read(ready[0], &byte, 1) == 1;
    const int seen = (listensOn(daemon, port) ? 1 : 0) + (listensOn(daemon, otherPort) ? 2 : 0);
    ::close(end[1]);
    ::waitpid(daemon, nullptr, 0);
    return isReady ? seen : -1;
}

TEST(ListeningSockets, AreFoundOfAProcessThatHidesThem) {
    const int port = freePort();
    const int otherPort = freePort();
    const pid_t asker = ::fork();
    if (asker == 0) {
        ::_exit(seenByItsOwnUser(port, otherPort));
    }
    int status = 0;
    ASSERT_EQ(::waitpid(asker, &status, 0), asker);
    ASSERT_TRUE(WIFEXITED(status));
    EXPECT_EQ(WEXITSTATUS(status), 1);
}

bool listenOn(int family, int port) {
    const int listener = ::socket(family, SOCK_STREAM, 0);
    const int on = 1;
    sockaddr_in6 address{}; // of both families the port is at the same place
    address.sin6_family = static_cast<sa_family_t>(family);
    address.sin6_port = htons(static_cast<in_port_t>(port));
    return (family == AF_INET || ::setsockopt(listener, IPPROTO_IPV6, IPV6_V6ONLY, &on, sizeof on) == 0) &&
           ::bind(listener, reinterpret_cast<const sockaddr*>(&address),
                  family == AF_INET ? sizeof(sockaddr_in) : sizeof address) == 0 &&
           ::listen(listener, 1) == 0;
}

TEST(ListeningSockets, AreThoseOfTheNetworkInWhichTheProcessLives) {
    if (::geteuid() != 0) {
        GTEST_SKIP() << "only root can make a network";
    }
    const int port = freePort();
    const int otherPort = freePort();
    std::array<int, 2> ready{};
    std::array<int, 2> end{};
    ASSERT_TRUE(::pipe(ready.data()) == 0 && ::pipe(end.data()) == 0);
    const pid_t elsewhere = ::fork();
    char byte = 0;
    if (elsewhere == 0) {
        ::close(end[1]);
        const bool listens =
            ::unshare(CLONE_NEWNET) == 0 && listenOn(AF_INET, port) && listenOn(AF_INET6, otherPort);
        ::_exit(listens && ::write(ready[1], "x", 1) == 1 && ::read(end[0], &byte, 1) == 0 ? 0 : 1);
    }
    ::close(ready[1]);
    EXPECT_EQ(::read(ready[0], &byte, 1), 1) << "it listens";
    EXPECT_TRUE(listensOn(elsewhere, port));
    EXPECT_TRUE(listensOn(elsewhere, otherPort));
    for (const ListeningSocket& socket : listeningSockets().valueOr({})) {
        EXPECT_TRUE(socket.port != port && socket.port != otherPort) << "nobody listens there here";
    }
    ::close(end[1]);
    int status = 0;
    EXPECT_EQ(::waitpid(elsewhere, &status, 0), elsewhere);
    EXPECT_EQ(status, 0);
    ::close(ready[0]);
    ::close(end[0]);
}

TEST(ListeningSockets, HaveAnOwner) {
    const int port = freePort();
    const Listener listener(port);
    EXPECT_EQ(describeListener(port), std::string(program_invocation_short_name).substr(0, 15) +
                                          " (process " + std::to_string(::getpid()) + ")");
    EXPECT_EQ(describeListener(freePort()), "another program");
}

TEST(PortProbe, TakesFreePortsAndLeavesThemFree) {
    const std::vector<int> ports{freePort(), freePort()};
    EXPECT_EQ(messageOf(probePorts(ports)), "");
    EXPECT_EQ(messageOf(probePorts(ports)), "");
    const Listener listener(ports[1]);
}

TEST(PortProbe, NamesTheHolderUnlessItIsTheOneThatAsks) {
    const int port = freePort();
    const Listener listener(port);
    EXPECT_EQ(messageOf(probePorts({freePort(), port})),
              "Port " + std::to_string(port) + " is in use by " +
                  std::string(program_invocation_short_name).substr(0, 15) + " (process " +
                  std::to_string(::getpid()) + ").");
    EXPECT_EQ(messageOf(probePorts({port}, ::getpid())), "");
}

TEST(PortRange, IsReadStrictly) {
    const auto range = parsePortRange("8000-8010");
    ASSERT_TRUE(range);
    EXPECT_EQ(range->first, 8000);
    EXPECT_EQ(range->last, 8010);
    EXPECT_EQ(formatPortRange(*range), "8000-8010");
    EXPECT_EQ(formatPortRange(*parsePortRange("65535")), "65535");
    for (const char* text :
         {"", "-", "0", "65536", "80x", " 80", "80 ", "+80", "80-", "-80", "90-80", "1-2-3", "99999999999"}) {
        EXPECT_FALSE(parsePortRange(text)) << text;
    }
}

TEST(KnownServices, ThatAreShippedCanBeRead) {
    const auto services = parseKnownServices(shippedKnownServices, "shipped");
    ASSERT_TRUE(services) << services.error().message;
    EXPECT_GT(services->size(), 20U);
    EXPECT_EQ(services->front(), (KnownService{22, 22, "ssh"}));
}

} // namespace
} // namespace velt::test
