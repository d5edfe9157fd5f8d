#include "base/ip_network.h"

#include "base/number_text.h"

#include <arpa/inet.h>
#include <netinet/in.h>

#include <algorithm>

namespace velt {
namespace {

constexpr std::array<unsigned char, 12> mapped{0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0xff, 0xff};
constexpr unsigned mappedBits = 96;
constexpr unsigned allBits = 128;
constexpr unsigned byteBits = 8;

bool isMapped(const std::array<unsigned char, 16>& address) {
    return std::equal(mapped.begin(), mapped.end(), address.begin());
}

/// The text up to an interface's name, which only addresses of one link have.
std::string withoutInterface(std::string_view text) {
    const bool ofOneLink = text.starts_with("fe80:") || text.starts_with("FE80:");
    return std::string(ofOneLink ? text.substr(0, text.find('%')) : text);
}

} // namespace

bool IpNetwork::isIPv4() const {
    return prefix >= mappedBits && isMapped(first);
}

bool IpNetwork::contains(const IpNetwork& other) const {
    return isIPv4() == other.isIPv4() && other.prefix >= prefix && widened(other, prefix).first == first;
}

std::optional<IpNetwork> parseIpAddress(std::string_view text) {
    // The parser would stop at a NUL byte, whatever comes after it.
    if (text.find('\0') != std::string_view::npos) {
        return std::nullopt;
    }
    IpNetwork network;
    if (::inet_pton(AF_INET6, withoutInterface(text).c_str(), network.first.data()) == 1) {
        return network;
    }
    std::ranges::copy(mapped, network.first.begin());
    return ::inet_pton(AF_INET, std::string(text).c_str(), network.first.data() + mapped.size()) == 1
               ? std::optional(network)
               : std::nullopt;
}

std::optional<IpNetwork> parseIpNetwork(std::string_view text) {
    const std::size_t slash = text.find('/');
    const auto address = parseIpAddress(text.substr(0, slash));
    if (!address || slash == std::string_view::npos) {
        return address;
    }
    const unsigned before = address->isIPv4() ? mappedBits : 0;
    const auto bits = parseNumber(text.substr(slash + 1));
    if (!bits || *bits < 0 || *bits > allBits - before) {
        return std::nullopt;
    }
    const IpNetwork network = widened(*address, before + static_cast<unsigned>(*bits));
    return network.first == address->first ? std::optional(network) : std::nullopt;
}

IpNetwork widened(const IpNetwork& network, unsigned prefix) {
    IpNetwork wide = network;
    wide.prefix = std::min(prefix, network.prefix);
    for (unsigned bit = wide.prefix; bit < allBits; ++bit) {
        const unsigned mask = 0x80U >> (bit % byteBits);
        wide.first.at(bit / byteBits) &= static_cast<unsigned char>(~mask);
    }
    return wide;
}

std::string toText(const IpNetwork& network) {
    std::array<char, INET6_ADDRSTRLEN> text{};
    const bool four = network.isIPv4();
    ::inet_ntop(four ? AF_INET : AF_INET6, network.first.data() + (four ? mapped.size() : 0), text.data(),
                text.size());
    const std::string address = text.data();
    return network.prefix == allBits
               ? address
               : address + "/" + std::to_string(network.prefix - (four ? mappedBits : 0));
}

} // namespace velt
