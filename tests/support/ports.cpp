#include "tests/support/ports.h"

#include "base/unique_fd.h"

#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <cstddef>
#include <deque>
#include <string>
#include <utility>

namespace velt::test {
namespace {

constexpr int first = 20000;
constexpr int step = 20; // for tests that ask about ranges
constexpr int blocks = 500;

bool isFree(int port) {
    const int descriptor = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(static_cast<in_port_t>(port));
    const bool bound = ::bind(descriptor, reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0;
    ::close(descriptor);
    return bound;
}

bool areFree(int port, int count) {
    int good = 0;
    while (good < count && isFree(port + good)) {
        ++good;
    }
    return good == count;
}

/// Keeps the block from other tests of this network, also while nothing listens there, until the process ends
/// or has asked for many more: by a name that only one socket can have (unix(7), abstract sockets).
bool reserve(int block) {
    constexpr std::size_t most = 40;
    static std::deque<UniqueFd> reserved;
    UniqueFd descriptor(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
    const std::string name = "velt-test-ports-" + std::to_string(block);
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    std::ranges::copy(name, address.sun_path + 1);
    const auto length = static_cast<socklen_t>(offsetof(sockaddr_un, sun_path) + 1 + name.size());
    if (::bind(descriptor.get(), reinterpret_cast<const sockaddr*>(&address), length) != 0) {
        return false;
    }
    reserved.push_back(std::move(descriptor));
    if (reserved.size() > most) {
        reserved.pop_front();
    }
    return true;
}

} // namespace

int freePorts(int count) {
    // Tests run side by side, so each process begins its search elsewhere.
    static int block = ::getpid() * 37 % blocks;
    do {
        block = (block + 1) % blocks;
    } while (!reserve(block) || !areFree(first + block * step, count));
    return first + block * step;
}

int freePort() {
    return freePorts(1);
}

} // namespace velt::test
