#include "tests/system/support/sftp_packet.h"

#include <utility>

namespace velt::test::packet {

std::string number(std::uint32_t value) {
    return {static_cast<char>(value >> 24), static_cast<char>(value >> 16), static_cast<char>(value >> 8),
            static_cast<char>(value)};
}

std::string number64(std::uint64_t value) {
    return number(static_cast<std::uint32_t>(value >> 32)) + number(static_cast<std::uint32_t>(value));
}

std::string text(const std::string& value) {
    return number(static_cast<std::uint32_t>(value.size())) + value;
}

std::string modeAttribute(std::optional<std::uint32_t> mode) {
    return mode ? number(hasMode) + number(*mode) : number(0);
}

std::string timesAttribute(std::uint32_t seconds) {
    return number(hasTimes) + number(seconds) + number(seconds);
}

std::uint32_t takeNumber(std::string& body) {
    std::uint32_t value = 0;
    for (std::size_t i = 0; i < 4 && i < body.size(); i++) {
        value = value << 8 | static_cast<unsigned char>(body[i]);
    }
    body.erase(0, 4);
    return value;
}

std::string takeText(std::string& body) {
    const std::size_t size = takeNumber(body);
    std::string value = body.substr(0, size);
    body.erase(0, size);
    return value;
}

void skipAttributes(std::string& body) {
    const std::uint32_t flags = takeNumber(body);
    for (const auto& [flag, size] : {std::pair{hasSize, 8U}, {hasOwner, 8U}, {hasMode, 4U}, {hasTimes, 8U}}) {
        body.erase(0, (flags & flag) != 0 ? size : 0U);
    }
}

} // namespace velt::test::packet
