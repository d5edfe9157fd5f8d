// Ranges of TCP ports as people write them.
#ifndef VELT_STANDALONE_PORTS_PORT_RANGE_H
#define VELT_STANDALONE_PORTS_PORT_RANGE_H

#include "ftp/ftp_library.h"

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace velt {

/// "80" or "8000-8010", both ends from 1 to 65535 and in this order; nothing for another text.
std::optional<VELT_FTP_PORT_RANGE> parsePortRange(std::string_view text);

/// The ports with the separator between them: "2121, 2122".
std::string joinPorts(const std::vector<int>& ports, std::string_view separator);

/// The reverse of parsePortRange.
std::string formatPortRange(const VELT_FTP_PORT_RANGE& range);

} // namespace velt

#endif
