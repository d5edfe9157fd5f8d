// Reading the kernel's tables, and opening ports on trial.

#include "standalone/core/last_error.h"
#include "standalone/ports/known_services.h"
#include "standalone/ports/listening_sockets.h"
#include "standalone/ports/port_probe.h"
#include "standalone/ports/port_range.h"
#include "tests/standalone/supervise/daemon_test.h"

#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

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

TEST(ListeningSockets, HaveAnOwner) {
    const int port = freePort();
    const Listener listener(port);
    EXPECT_EQ(describeListener(port), "standalone_port (process " + std::to_string(::getpid()) + ")");
    EXPECT_EQ(describeListener(freePort()), "another program");
}

TEST(PortProbe, TakesFreePortsAndLeavesThemFree) {
    const std::vector<int> ports{freePort(), freePort()};
    EXPECT_EQ(probePorts(ports), 0) << lastErrorSentence();
    EXPECT_EQ(probePorts(ports), 0) << lastErrorSentence();
    const Listener listener(ports[1]);
}

TEST(PortProbe, NamesTheHolderUnlessItIsTheOneThatAsks) {
    const int port = freePort();
    const Listener listener(port);
    EXPECT_LT(probePorts({freePort(), port}), 0);
    EXPECT_EQ(lastErrorSentence(), "Port " + std::to_string(port) +
                                       " is in use by standalone_port (process " +
                                       std::to_string(::getpid()) + ").");
    EXPECT_EQ(probePorts({port}, ::getpid()), 0);
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
    ASSERT_TRUE(services) << lastErrorSentence();
    EXPECT_GT(services->size(), 20U);
    EXPECT_EQ(services->front(), (KnownService{22, 22, "ssh"}));
}

} // namespace
} // namespace velt::test
