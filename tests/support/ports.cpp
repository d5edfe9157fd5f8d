#include "tests/support/ports.h"

#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

namespace velt::test {
namespace {

constexpr int first = 20000;
constexpr int range = 10000;
constexpr int step = 20; // for tests that ask about ranges

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

} // namespace

int freePorts(int count) {
    // Tests run side by side, so each process begins its search elsewhere.
    static int next = (::getpid() * 370) % range;
    do {
        next = (next + step) % range;
    } while (!areFree(first + next, count));
    return first + next;
}

int freePort() {
    return freePorts(1);
}

} // namespace velt::test
