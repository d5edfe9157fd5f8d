#include "tests/standalone/firewall/private_network.h"

#include "tests/support/run_program.h"

#include <gtest/gtest.h>

#include <arpa/inet.h>
#include <fcntl.h>
#include <netinet/in.h>
#include <poll.h>
#include <sched.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <string>

namespace velt::test {
namespace {

bool run(const std::vector<std::string>& arguments) {
    return runProcess(arguments).exitCode == 0;
}

/// A dropped packet gets no answer at all, so that the wait has to end by itself.
bool connects(int port) {
    const int descriptor = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(static_cast<in_port_t>(port));
    ::inet_pton(AF_INET, "192.0.2.1", &address.sin_addr);
    if (::connect(descriptor, reinterpret_cast<const sockaddr*>(&address), sizeof address) < 0 &&
        errno != EINPROGRESS) {
        ::close(descriptor);
        return false;
    }
    pollfd event{descriptor, POLLOUT, 0};
    int error = -1;
    socklen_t size = sizeof error;
    if (::poll(&event, 1, 400) == 1) {
        ::getsockopt(descriptor, SOL_SOCKET, SO_ERROR, &error, &size);
    }
    ::close(descriptor);
    return error == 0;
}

} // namespace

PrivateNetwork::PrivateNetwork() {
    std::array<int, 2> requests{-1, -1};
    std::array<int, 2> answers{-1, -1};
    if (::unshare(CLONE_NEWNET) != 0 || ::pipe2(requests.data(), O_CLOEXEC) != 0 ||
        ::pipe2(answers.data(), O_CLOEXEC) != 0) {
        return;
    }
    const pid_t child = ::fork();
    if (child == 0) {
        ::prctl(PR_SET_PDEATHSIG, SIGKILL);
        requests_ = requests[0];
        answers_ = answers[1];
        ::close(requests[1]);
        beNeighbour();
        ::_exit(0);
    }
    ::close(requests[0]);
    ::close(answers[1]);
    requests_ = requests[1];
    answers_ = answers[0];
    neighbour_ = child;
    char ready = 0;
    if (::read(answers_, &ready, 1) != 1 || ready != 'y' || !layCable()) {
        ::kill(child, SIGKILL);
        ::waitpid(child, nullptr, 0);
        neighbour_ = -1;
    }
}

PrivateNetwork::~PrivateNetwork() {
    ::close(requests_);
    ::close(answers_);
    if (neighbour_ > 0) {
        ::kill(neighbour_, SIGKILL);
        ::waitpid(neighbour_, nullptr, 0);
    }
}

void PrivateNetwork::beNeighbour() const {
    const char ready = ::unshare(CLONE_NEWNET) == 0 ? 'y' : 'n';
    int port = 0;
    for (ssize_t sent = ::write(answers_, &ready, 1); sent == 1;) {
        if (::read(requests_, &port, sizeof port) != static_cast<ssize_t>(sizeof port)) {
            return;
        }
        const char answer = connects(port) ? 'y' : 'n';
        sent = ::write(answers_, &answer, 1);
    }
}

bool PrivateNetwork::layCable() const {
    const std::string there = std::to_string(neighbour_);
    return run({"ip", "link", "set", "lo", "up"}) &&
           run({"ip", "link", "add", "here", "type", "veth", "peer", "name", "there", "netns", there}) &&
           run({"ip", "address", "add", "192.0.2.1/24", "dev", "here"}) &&
           run({"ip", "link", "set", "here", "up"}) &&
           run({"nsenter", "--net=/proc/" + there + "/ns/net", "ip", "address", "add", "192.0.2.2/24", "dev",
                "there"}) &&
           run({"nsenter", "--net=/proc/" + there + "/ns/net", "ip", "link", "set", "there", "up"});
}

bool PrivateNetwork::neighbourReaches(int port) const {
    char answer = 0;
    return ::write(requests_, &port, sizeof port) == static_cast<ssize_t>(sizeof port) &&
           ::read(answers_, &answer, 1) == 1 && answer == 'y';
}

OpenPort::OpenPort(int port) : descriptor_(::socket(AF_INET6, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
    const int on = 1; // ended connections of a former listener do not count
    ::setsockopt(descriptor_, SOL_SOCKET, SO_REUSEADDR, &on, sizeof on);
    sockaddr_in6 address{};
    address.sin6_family = AF_INET6;
    address.sin6_port = htons(static_cast<in_port_t>(port));
    EXPECT_EQ(::bind(descriptor_, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
    EXPECT_EQ(::listen(descriptor_, 16), 0);
}

OpenPort::~OpenPort() {
    ::close(descriptor_);
}

} // namespace velt::test
