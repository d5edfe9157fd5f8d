#include "standalone/process/shared_port.h"

#include "base/number_text.h"

#include <linux/filter.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cstring>
#include <filesystem>
#include <string>
#include <system_error>

namespace velt {
namespace {

struct Address {
    sockaddr_storage bytes{};
    socklen_t size = sizeof(sockaddr_storage);

    bool operator==(const Address& other) const {
        return size == other.size && std::memcmp(&bytes, &other.bytes, size) == 0;
    }
};

Address addressOf(const UniqueFd& socket) {
    Address address;
    if (::getsockname(socket.get(), reinterpret_cast<sockaddr*>(&address.bytes), &address.size) != 0) {
        address.size = 0;
    }
    return address;
}

int portOf(const UniqueFd& socket) {
    const Address address = addressOf(socket);
    if (address.bytes.ss_family == AF_INET6) {
        return ntohs(reinterpret_cast<const sockaddr_in6&>(address.bytes).sin6_port);
    }
    return address.bytes.ss_family == AF_INET
               ? ntohs(reinterpret_cast<const sockaddr_in&>(address.bytes).sin_port)
               : 0;
}

bool isOn(const UniqueFd& socket, int option) {
    int value = 0;
    socklen_t size = sizeof value;
    return ::getsockopt(socket.get(), SOL_SOCKET, option, &value, &size) == 0 && value != 0;
}

} // namespace

UniqueFd listenerOf(pid_t pid, int port) {
    const UniqueFd process(static_cast<int>(::syscall(SYS_pidfd_open, pid, 0)));
    std::error_code error;
    const std::filesystem::path folder = "/proc/" + std::to_string(pid) + "/fd";
    for (std::filesystem::directory_iterator entry(folder, error), end; !error && entry != end;
         entry.increment(error)) {
        const auto number = parseNumber(entry->path().filename().string()).value_or(-1);
        UniqueFd found(
            static_cast<int>(::syscall(SYS_pidfd_getfd, process.get(), static_cast<int>(number), 0)));
        if (found && isOn(found, SO_ACCEPTCONN) && portOf(found) == port) {
            return found;
        }
    }
    return UniqueFd();
}

// The kernel counts the sockets of a port that is shared in the order in which they came, and puts the last
// one in the place of one that goes. A number that it does not have means to it: any of them. So this holds
// for the next successor as well, and does no harm where one listens alone.
bool steerToSuccessor(const UniqueFd& former, const UniqueFd& successor) {
    if (!former || !successor || !isOn(former, SO_REUSEPORT) || !isOn(successor, SO_REUSEPORT) ||
        !(addressOf(former) == addressOf(successor))) {
        return false;
    }
    sock_filter takeTheSecond[] = {BPF_STMT(BPF_RET | BPF_K, 1)};
    const sock_fprog program{1, takeTheSecond};
    return ::setsockopt(successor.get(), SOL_SOCKET, SO_ATTACH_REUSEPORT_CBPF, &program, sizeof program) == 0;
}

bool hasWaiting(const UniqueFd& listener) {
    tcp_info info{};
    socklen_t size = sizeof info;
    // Of a listening socket this is the length of its queue.
    return ::getsockopt(listener.get(), IPPROTO_TCP, TCP_INFO, &info, &size) == 0 && info.tcpi_unacked > 0;
}

} // namespace velt
