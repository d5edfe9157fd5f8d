#include "standalone/firewall/ruleset.h"

#include "standalone/ports/port_range.h"

namespace velt {
namespace {

std::string renderOpenPorts(const std::vector<VELT_FTP_PORT_RANGE>& ranges) {
    std::string text = "    set tcp_open {\n"
                       "        type inet_service\n"
                       "        flags interval\n"
                       "        auto-merge\n";
    if (!ranges.empty()) {
        text += "        elements = { ";
        const char* separator = "";
        for (const VELT_FTP_PORT_RANGE& range : ranges) {
            text += separator + formatPortRange(range);
            separator = ", ";
        }
        text += " }\n";
    }
    return text + "    }\n";
}

} // namespace

std::string renderRuleset(const FirewallSettings& settings, const std::vector<VELT_FTP_PORT_RANGE>& ports) {
    // Adding a table that exists succeeds, deleting one that does not fails.
    std::string text = "add table inet velt_fileserv\n"
                       "delete table inet velt_fileserv\n";
    if (settings.mode == FirewallMode::off) {
        return text;
    }
    const bool drop = settings.mode == FirewallMode::drop;
    std::vector<VELT_FTP_PORT_RANGE> open = ports;
    if (drop) {
        open.insert(open.end(), settings.furtherPorts.begin(), settings.furtherPorts.end());
    }
    text += "table inet velt_fileserv {\n" + renderOpenPorts(open) +
            "    chain input {\n"
            "        type filter hook input priority filter - 1; policy ";
    text += drop ? "drop;\n"
                   "        ct state vmap { established : accept, related : accept, invalid : drop }\n"
                   "        iif \"lo\" accept\n"
                   "        meta l4proto { icmp, ipv6-icmp } accept\n"
                 : "accept;\n";
    text += "        tcp dport @tcp_open accept\n"
            "    }\n"
            "}\n";
    return text;
}

} // namespace velt
