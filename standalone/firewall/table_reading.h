// Our table as the packet filter has it.
#ifndef VELT_STANDALONE_FIREWALL_TABLE_READING_H
#define VELT_STANDALONE_FIREWALL_TABLE_READING_H

#include "ftp/ftp_library.h"

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace velt {

struct TableInForce {
    bool drops = false;                         ///< what nothing in it accepts
    std::vector<VELT_FTP_PORT_RANGE> openPorts; ///< see joinedRanges
};

/// From nft's list of our table in JSON; nothing for a text that is not one, or has no chain of ours for what
/// comes in.
std::optional<TableInForce> readTable(std::string_view tableAsJson);

/// What tells two states of our table apart, from nft's list of it in JSON: its rules in their order and its
/// sets, without those who are banned, who come and go. Another version of nft may tell the same table in
/// other words, so that it has another print. "" for a text that is no such list.
std::string tablePrint(std::string_view tableAsJson);

/// The same ports in ascending order, in as few ranges as possible.
std::vector<VELT_FTP_PORT_RANGE> joinedRanges(std::vector<VELT_FTP_PORT_RANGE> ranges);

} // namespace velt

#endif
