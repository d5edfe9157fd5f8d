// The words of SFTP, version 3 of the protocol.
#ifndef VELT_TESTS_SYSTEM_SUPPORT_SFTP_PACKET_H
#define VELT_TESTS_SYSTEM_SUPPORT_SFTP_PACKET_H

#include <cstdint>
#include <optional>
#include <string>

namespace velt::test::packet {

/// Of packets.
enum Kind {
    kindInit = 1,
    kindOpen = 3,
    kindClose = 4,
    kindRead = 5,
    kindWrite = 6,
    kindSet = 9,
    kindSetOpen = 10,
    kindOpenFolder = 11,
    kindReadFolder = 12,
    kindRemove = 13,
    kindMakeFolder = 14,
    kindRemoveFolder = 15,
    kindRealPath = 16,
    kindLook = 17,
    kindRename = 18,
    kindTarget = 19,
    kindSymbolicLink = 20,
    kindStatus = 101,
    kindHandle = 102,
    kindData = 103,
    kindName = 104,
    kindExtended = 200,
};

/// Which attributes of a file follow.
enum Attribute : std::uint32_t {
    hasSize = 1,
    hasOwner = 2,
    hasMode = 4,
    hasTimes = 8
};

std::string number(std::uint32_t value);
std::string number64(std::uint64_t value);
std::string text(const std::string& value);
std::string modeAttribute(std::optional<std::uint32_t> mode);
std::string timesAttribute(std::uint32_t seconds);

// Take a part off the front of a packet's body.
std::uint32_t takeNumber(std::string& body);
std::string takeText(std::string& body);
void skipAttributes(std::string& body);

} // namespace velt::test::packet

#endif
