// Addresses and networks of both families, as text and as numbers.
#ifndef VELT_BASE_IP_NETWORK_H
#define VELT_BASE_IP_NETWORK_H

#include <array>
#include <optional>
#include <string>
#include <string_view>

namespace velt {

/// All addresses that begin with the same bits; one address, when these are all of them.
struct IpNetwork {
    /// In the form of IPv6; an IPv4 address is mapped: ::ffff:192.0.2.1. The bits after the prefix are 0.
    std::array<unsigned char, 16> first{};
    unsigned prefix = 128; ///< in bits of `first`

    bool isIPv4() const;
    /// Whether all of the other network, of the same family, lies in this one.
    bool contains(const IpNetwork& other) const;
    bool operator==(const IpNetwork&) const = default;
};

/// The network of one address: "192.0.2.1", "2001:db8::1", "::ffff:192.0.2.1" (which is taken for IPv4), or
/// "fe80::1%eth0", whose interface is left out. Nothing for any other text.
std::optional<IpNetwork> parseIpAddress(std::string_view text);

/// An address or a network: "192.0.2.0/24", "2001:db8::/32". Nothing for any other text, nor for a network
/// with further bits set after its prefix.
std::optional<IpNetwork> parseIpNetwork(std::string_view text);

/// The network that the first bits of this one make.
IpNetwork widened(const IpNetwork& network, unsigned prefix);

/// "192.0.2.1", "2001:db8::1", "192.0.2.0/24", "2001:db8::/32".
std::string toText(const IpNetwork& network);

} // namespace velt

#endif
