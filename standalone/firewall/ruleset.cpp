#include "standalone/firewall/ruleset.h"

#include "standalone/ports/port_range.h"

namespace velt {
namespace {

std::string renderPorts(const char* name, const std::vector<VELT_FTP_PORT_RANGE>& ranges) {
    std::string text = std::string("    set ") + name +
                       " {\n"
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

// A network of 64 bits stands in its set as its first address.
constexpr const char* bannedSets = "    set banned4 {\n"
                                   "        type ipv4_addr\n"
                                   "        flags timeout\n"
                                   "    }\n"
                                   "    set banned6 {\n"
                                   "        type ipv6_addr\n"
                                   "        flags timeout\n"
                                   "    }\n";

// Only the first packet of a connection: sessions that are open go on, and so do their transfers.
constexpr const char* newLogins =
    "        tcp dport @tcp_login tcp flags & (fin | syn | rst | ack) == syn jump logins\n";
constexpr const char* loginsChain = "    chain logins {\n"
                                    "        ip saddr @banned4 drop\n"
                                    "        ip6 saddr @banned6 drop\n"
                                    "        ip6 saddr & ffff:ffff:ffff:ffff:: @banned6 drop\n"
                                    "    }\n";

} // namespace

std::string renderRuleset(const FirewallSettings& settings, const std::vector<VELT_FTP_PORT_RANGE>& openPorts,
                          const std::vector<VELT_FTP_PORT_RANGE>& loginPorts) {
    // Adding a table that exists succeeds, deleting one that does not fails.
    std::string text = "add table inet velt_fileserv\n"
                       "delete table inet velt_fileserv\n";
    if (settings.mode == FirewallMode::off) {
        return text;
    }
    const bool drop = settings.mode == FirewallMode::drop;
    std::vector<VELT_FTP_PORT_RANGE> open = openPorts;
    if (drop) {
        open.insert(open.end(), settings.furtherPorts.begin(), settings.furtherPorts.end());
    }
    text += "table inet velt_fileserv {\n" + renderPorts("tcp_open", open) +
            renderPorts("tcp_login", loginPorts) + bannedSets + loginsChain +
            "    chain input {\n"
            "        type filter hook input priority filter - 1; policy ";
    text += drop ? "drop;\n" : "accept;\n";
    text += newLogins;
    text += drop ? "        ct state vmap { established : accept, related : accept, invalid : drop }\n"
                   "        iif \"lo\" accept\n"
                   "        meta l4proto { icmp, ipv6-icmp } accept\n"
                 : "";
    text += "        tcp dport @tcp_open accept\n"
            "    }\n"
            "}\n";
    return text;
}

} // namespace velt
