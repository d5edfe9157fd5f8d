#include "tests/standalone/supervise/daemon_test.h"

#include "standalone/core/state_root.h"
#include "tests/support/waiting.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <cstdlib>

namespace velt::test {
namespace {

sockaddr_in loopback(int port) {
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    address.sin_port = htons(static_cast<in_port_t>(port));
    return address;
}

bool bindTo(int descriptor, int port) {
    const sockaddr_in address = loopback(port);
    return ::bind(descriptor, reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0;
}

int connectTo(int port) {
    const int descriptor = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    const sockaddr_in address = loopback(port);
    if (::connect(descriptor, reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0) {
        return descriptor;
    }
    ::close(descriptor);
    return -1;
}

} // namespace

bool accepts(int port) {
    const int descriptor = connectTo(port);
    if (descriptor < 0) {
        return false;
    }
    ::close(descriptor);
    return true;
}

Client::Client(int port) : descriptor_(connectTo(port)) {}

Client::~Client() {
    ::close(descriptor_);
}

bool Client::isServed() {
    char byte = 'x';
    return ::send(descriptor_, &byte, 1, MSG_NOSIGNAL) == 1 && ::recv(descriptor_, &byte, 1, 0) == 1;
}

Listener::Listener(int port) : descriptor_(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
    EXPECT_TRUE(bindTo(descriptor_, port));
    EXPECT_EQ(::listen(descriptor_, 4), 0);
}

Listener::~Listener() {
    ::close(descriptor_);
}

DaemonOrder testOrder(int port, const std::string& hash, const std::vector<std::string>& options) {
    DaemonOrder order{hash, {port}, {VELT_TEST_DAEMON, "--port", std::to_string(port)}};
    order.arguments.insert(order.arguments.end(), options.begin(), options.end());
    order.sharesPorts = std::ranges::find(options, "--share") != options.end();
    return order;
}

void DaemonTest::SetUp() {
    std::string folder = (std::filesystem::temp_directory_path() / "velt-daemon-XXXXXX").string();
    ASSERT_NE(::mkdtemp(folder.data()), nullptr);
    root_ = folder;
    setStateRoot(root_);
    ASSERT_EQ(::setenv("VELT_LIBEXEC_DIR", VELT_TEST_LIBEXEC, 1), 0);
    ASSERT_EQ(::prctl(PR_SET_CHILD_SUBREAPER, 1), 0);
}

void DaemonTest::TearDown() {
    EXPECT_TRUE(waitUntil([] { return leftProcesses().empty(); }, patience)) << "a process was left behind";
    for (const ProcessId& process : leftProcesses()) {
        signalProcess(process, SIGKILL);
    }
    waitUntil([] { return leftProcesses().empty(); }, patience);
    std::filesystem::remove_all(root_);
}

std::vector<ProcessId> DaemonTest::leftProcesses() {
    while (::waitpid(-1, nullptr, WNOHANG) > 0) {
    }
    return descendantsOf(::getpid());
}

} // namespace velt::test
