// IPv4 addresses as text.
#ifndef VELT_BASE_IPV4_H
#define VELT_BASE_IPV4_H

#include <array>
#include <optional>
#include <string>
#include <string_view>

namespace velt {

using IPv4Address = std::array<unsigned char, 4>;

/// The address that a text like "192.0.2.1" names: four decimal numbers, nothing before or after. Nothing for
/// any other text.
std::optional<IPv4Address> parseIPv4(std::string_view text);

std::string toText(const IPv4Address& address);

/// What addresses are like this one, at which no other machine reaches a server: "a loopback address". Null
/// for one that may be a server's (RFC 6890).
const char* unreachableKindOf(const IPv4Address& address);

} // namespace velt

#endif
