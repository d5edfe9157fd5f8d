#include "base/ipv4.h"

#include <arpa/inet.h>

namespace velt {

std::optional<IPv4Address> parseIPv4(std::string_view text) {
    // The parser would stop at a NUL byte, whatever comes after it.
    if (text.find('\0') != std::string_view::npos)
        return std::nullopt;
    IPv4Address address{};
    if (::inet_pton(AF_INET, std::string(text).c_str(), address.data()) != 1)
        return std::nullopt;
    return address;
}

std::string toText(const IPv4Address& address) {
    std::string text;
    for (const unsigned char byte : address)
        text += (text.empty() ? "" : ".") + std::to_string(byte);
    return text;
}

const char* unreachableKindOf(const IPv4Address& address) {
    constexpr int firstMulticast = 224;
    constexpr int firstReserved = 240;
    if (address[0] == 0)
        return "one of no host";
    if (address[0] == 127)
        return "a loopback address";
    if (address[0] == 169 && address[1] == 254)
        return "a link-local address";
    if (address[0] >= firstReserved)
        return "a broadcast or reserved address";
    return address[0] >= firstMulticast ? "a multicast address" : nullptr;
}

} // namespace velt
