#include "standalone/process/socket_diagnosis.h"

#include "base/unique_fd.h"

#include <arpa/inet.h>
#include <linux/inet_diag.h>
#include <linux/netlink.h>
#include <linux/sock_diag.h>
#include <netinet/tcp.h>
#include <sys/socket.h>

#include <array>
#include <cstring>
#include <string_view>

namespace velt {
namespace {

struct Question {
    nlmsghdr head{};
    inet_diag_req_v2 wanted{};
};

bool ask(int socket, int family) {
    Question question;
    question.head.nlmsg_len = sizeof question;
    question.head.nlmsg_type = SOCK_DIAG_BY_FAMILY;
    question.head.nlmsg_flags = NLM_F_REQUEST | NLM_F_DUMP;
    question.wanted.sdiag_family = static_cast<unsigned char>(family);
    question.wanted.sdiag_protocol = IPPROTO_TCP;
    question.wanted.idiag_states = 1U << TCP_LISTEN;
    return ::send(socket, &question, sizeof question, 0) == static_cast<ssize_t>(sizeof question);
}

/// A value of this type from the beginning of the text, which need not be aligned.
template<class Value> std::optional<Value> valueIn(std::string_view text) {
    Value value{};
    if (text.size() < sizeof value) {
        return std::nullopt;
    }
    std::memcpy(&value, text.data(), sizeof value);
    return value;
}

/// Whether it listens on 127.x.x.x, also as an IPv6 address, or on ::1.
bool isLoopback(const inet_diag_msg& message) {
    constexpr unsigned char loopback = 127;
    std::array<unsigned char, sizeof(in6_addr)> bytes{};
    std::memcpy(bytes.data(), message.id.idiag_src, bytes.size());
    if (message.idiag_family == AF_INET) {
        return bytes[0] == loopback;
    }
    in6_addr address{};
    std::memcpy(&address, bytes.data(), sizeof address);
    return IN6_IS_ADDR_LOOPBACK(&address) || (IN6_IS_ADDR_V4MAPPED(&address) && bytes[12] == loopback);
}

enum class Reading {
    goesOn,
    ended,
    failed,
};

/// Takes the messages of one packet.
Reading take(std::string_view packet, std::vector<ListeningSocket>& sockets) {
    while (const auto head = valueIn<nlmsghdr>(packet)) {
        if (head->nlmsg_type == NLMSG_DONE) {
            return Reading::ended;
        }
        const auto message = valueIn<inet_diag_msg>(packet.substr(NLMSG_HDRLEN));
        if (head->nlmsg_type != SOCK_DIAG_BY_FAMILY || !message || head->nlmsg_len < NLMSG_HDRLEN) {
            return Reading::failed;
        }
        sockets.push_back(
            {ntohs(message->id.idiag_sport), message->idiag_inode, message->idiag_uid, isLoopback(*message)});
        packet.remove_prefix(std::min<std::size_t>(packet.size(), NLMSG_ALIGN(head->nlmsg_len)));
    }
    return Reading::goesOn;
}

bool readAnswer(int socket, std::vector<ListeningSocket>& sockets) {
    std::array<char, 32768> buffer{};
    auto state = Reading::goesOn;
    while (state == Reading::goesOn) {
        const ssize_t length = ::recv(socket, buffer.data(), buffer.size(), 0);
        if (length <= 0) {
            return false;
        }
        state = take({buffer.data(), static_cast<std::size_t>(length)}, sockets);
    }
    return state == Reading::ended;
}

} // namespace

std::optional<std::vector<ListeningSocket>> diagnoseListeningSockets() {
    const UniqueFd socket(::socket(AF_NETLINK, SOCK_DGRAM | SOCK_CLOEXEC, NETLINK_SOCK_DIAG));
    std::vector<ListeningSocket> sockets;
    for (const int family : {AF_INET, AF_INET6}) {
        if (!socket || !ask(socket.get(), family) || !readAnswer(socket.get(), sockets)) {
            return std::nullopt;
        }
    }
    return sockets;
}

} // namespace velt
