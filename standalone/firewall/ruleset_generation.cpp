#include "standalone/firewall/ruleset_generation.h"

#include "base/input_wait.h"
#include "base/unique_fd.h"

#include <arpa/inet.h>
#include <linux/netfilter/nf_tables.h>
#include <linux/netfilter/nfnetlink.h>
#include <linux/netlink.h>
#include <sys/socket.h>

#include <array>
#include <cstring>

namespace velt {
namespace {

// The macros for these mix signed and unsigned numbers.
constexpr std::size_t attributeHead = sizeof(nlattr);
constexpr std::size_t attributeAlignment = NLA_ALIGNTO;

struct Request {
    nlmsghdr header;
    nfgenmsg message;
};

template<class Part> std::optional<Part> partAt(const char* bytes, std::size_t length, std::size_t at) {
    Part part{};
    if (at > length || length - at < sizeof(part)) {
        return std::nullopt;
    }
    std::memcpy(&part, bytes + at, sizeof(part));
    return part;
}

std::optional<std::uint32_t> readGeneration(const char* bytes, std::size_t length) {
    const auto header = partAt<nlmsghdr>(bytes, length, 0);
    if (!header || header->nlmsg_type != ((NFNL_SUBSYS_NFTABLES << 8) | NFT_MSG_NEWGEN)) {
        return std::nullopt;
    }
    std::size_t at = NLMSG_LENGTH(sizeof(nfgenmsg));
    auto part = partAt<nlattr>(bytes, length, at);
    while (part && part->nla_len >= attributeHead) {
        if (part->nla_type == NFTA_GEN_ID) {
            const auto number = partAt<std::uint32_t>(bytes, length, at + attributeHead);
            return number ? std::optional(ntohl(*number)) : std::nullopt;
        }
        at += (part->nla_len + attributeAlignment - 1) / attributeAlignment * attributeAlignment;
        part = partAt<nlattr>(bytes, length, at);
    }
    return std::nullopt;
}

} // namespace

std::optional<std::uint32_t> rulesetGeneration() {
    const UniqueFd socket(::socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC, NETLINK_NETFILTER));
    Request request{};
    request.header.nlmsg_len = NLMSG_LENGTH(sizeof(nfgenmsg));
    request.header.nlmsg_type = (NFNL_SUBSYS_NFTABLES << 8) | NFT_MSG_GETGEN;
    request.header.nlmsg_flags = NLM_F_REQUEST;
    request.message.version = NFNETLINK_V0;
    sockaddr_nl kernel{};
    kernel.nl_family = AF_NETLINK;
    if (!socket || ::sendto(socket.get(), &request, request.header.nlmsg_len, 0,
                            reinterpret_cast<const sockaddr*>(&kernel), sizeof(kernel)) < 0) {
        return std::nullopt;
    }
    constexpr std::chrono::seconds patience(1); // the kernel answers at once or not at all
    std::array<char, 1024> answer{};
    if (!waitForInput(socket.get(), std::chrono::steady_clock::now() + patience)) {
        return std::nullopt;
    }
    const ssize_t length = ::recv(socket.get(), answer.data(), answer.size(), MSG_DONTWAIT);
    return length > 0 ? readGeneration(answer.data(), static_cast<std::size_t>(length)) : std::nullopt;
}

} // namespace velt
