#include "standalone/firewall/foreign_tables.h"

#include "standalone/ports/port_range.h"
#include "standalone/process/run_program.h"

#include <algorithm>

namespace velt {
namespace {

constexpr std::chrono::seconds nftLimit{3};

/// The families whose chains see what comes in over TCP.
constexpr const char* ipv6Family = "ip6";

bool isOurs(const InputChain& chain) {
    return chain.family == "inet" && chain.table == "velt_fileserv";
}

bool concerns(const InputChain& chain) {
    return chain.family == "inet" || chain.family == "ip" || chain.family == ipv6Family;
}

bool closes(const ListedRules& rules, const InputChain& chain, int port, bool fromHere, Doubt doubt) {
    return rules.drops(chain, {port, fromHere, chain.family == ipv6Family}, doubt);
}

ClosingChain judge(const ListedRules& rules, const InputChain& chain,
                   const std::vector<VELT_FTP_PORT_RANGE>& ports, bool fromHere) {
    ClosingChain closing{chain.fullName(), {}, false};
    for (const VELT_FTP_PORT_RANGE& range : ports) {
        const auto isClosed = [&](Doubt doubt) {
            return closes(rules, chain, range.first, fromHere, doubt) ||
                   closes(rules, chain, range.last, fromHere, doubt);
        };
        if (isClosed(Doubt::meetsNone)) {
            closing.ports.push_back(range);
            // Who cannot come in by IPv6 may by IPv4.
            closing.surely =
                closing.surely || (chain.family != ipv6Family && isClosed(Doubt::meetsAccepting));
        }
    }
    return closing;
}

std::optional<ListedRules> listed(std::vector<std::string> what) {
    what.insert(what.begin(), {"nft", "--json", "list"});
    const auto list = runProcess(std::move(what), {}, nftLimit);
    return list && list->exitCode == 0 ? ListedRules::read(list->output) : std::nullopt;
}

} // namespace

std::string ClosingChain::sentence() const {
    std::string list;
    for (const VELT_FTP_PORT_RANGE& range : ports) {
        list += (list.empty() ? "" : ", ") + formatPortRange(range);
    }
    return "The chain \"" + name + "\" of another firewall " + (surely ? "closes" : "may close") +
           " ports of the file services: " + list + ".";
}

std::vector<ClosingChain> closingChains(const ListedRules& rules,
                                        const std::vector<VELT_FTP_PORT_RANGE>& ports, bool fromHere) {
    std::vector<ClosingChain> all;
    for (const InputChain& chain : rules.inputChains()) {
        if (!isOurs(chain) && concerns(chain)) {
            if (auto closing = judge(rules, chain, ports, fromHere); !closing.ports.empty()) {
                all.push_back(std::move(closing));
            }
        }
    }
    return all;
}

bool closesToThisServer(const ListedRules& rules, int port) {
    return std::ranges::any_of(rules.inputChains(), [&](const InputChain& chain) {
        return concerns(chain) && chain.family != ipv6Family &&
               closes(rules, chain, port, true, Doubt::meetsAccepting);
    });
}

std::optional<ListedRules> listRules() {
    auto rules = listed({"ruleset"});
    return rules ? std::move(rules) : listed({"chains"});
}

} // namespace velt
