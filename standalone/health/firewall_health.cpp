#include "standalone/control/service_firewall.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/firewall/firewall_settings.h"
#include "standalone/firewall/foreign_tables.h"
#include "standalone/firewall/loaded_rules.h"
#include "standalone/firewall/rule_script.h"
#include "standalone/firewall/ruleset.h"
#include "standalone/firewall/ruleset_generation.h"
#include "standalone/firewall/table_reading.h"
#include "standalone/health/checks.h"
#include "standalone/health/mends.h"
#include "standalone/ports/port_range.h"

#include <algorithm>
#include <mutex>

namespace velt {
namespace {

Finding finding(const char* id, Severity severity, std::string sentence, std::string mend) {
    return {id, severity, "firewall", std::move(sentence), std::move(mend)};
}

std::string afterEdit(const std::string& edit) {
    return thenRestartHost(edit + " in " + statePath(paths::firewallSettings).string());
}

bool sameRanges(const std::vector<VELT_FTP_PORT_RANGE>& some,
                const std::vector<VELT_FTP_PORT_RANGE>& others) {
    return std::ranges::equal(some, others, [](const auto& one, const auto& other) {
        return one.first == other.first && one.last == other.last;
    });
}

/// What cannot be read asks for no rules; those from before are in force as long as nobody removes them.
Finding damagedSettings(const Error& error) {
    const bool kept = readTable(listTable()).has_value();
    return finding("firewall-settings-damaged", Severity::error,
                   error.message + (kept ? " The firewall keeps its former rules."
                                         : " No rules of this system are in force: all ports of this server "
                                           "are open that others do not close."),
                   thenRestartHost("Correct the file"));
}

/// What others have done to rules of ours since they were loaded.
Findings changedRuleFindings(const std::string& listed, const std::string& script) {
    const std::string loaded = listingAfterLoading(script);
    if (loaded.empty() || loaded == tablePrint(listed)) {
        return {};
    }
    return {finding("firewall-rules-changed", Severity::error,
                    "The firewall rules of this system were changed after it had loaded them: ports may be "
                    "closed, or open to those who are banned.",
                    restartOfHost())};
}

/// Whether the table does what the settings and the services need.
Findings tableFindings(const FirewallSettings& settings, const FirewallNeeds& needs,
                       const std::string& script) {
    const bool drops = settings.mode == FirewallMode::drop;
    const std::string listed = listTable();
    const auto table = readTable(listed);
    if (!table) {
        return {finding("firewall-rules-missing", drops ? Severity::error : Severity::warning,
                        std::string("The firewall rules of this system are not in force: ") +
                            (drops ? "all ports of this server are open that others do not close."
                                   : "nobody is refused after failed logins."),
                        restartOfHost())};
    }
    std::vector<VELT_FTP_PORT_RANGE> wanted = needs.openPorts;
    if (drops) {
        wanted.insert(wanted.end(), settings.furtherPorts.begin(), settings.furtherPorts.end());
    }
    wanted = joinedRanges(std::move(wanted));
    if (table->drops == drops && sameRanges(table->openPorts, wanted)) {
        return changedRuleFindings(listed, script);
    }
    std::string ports;
    for (const VELT_FTP_PORT_RANGE& range : wanted) {
        ports += (ports.empty() ? "" : ", ") + formatPortRange(range);
    }
    return {
        finding("firewall-rules-differ", drops || table->drops ? Severity::error : Severity::warning,
                "The firewall rules in force are not those that the settings ask for, which open the ports " +
                    (ports.empty() ? "of nobody" : ports) + ".",
                restartOfHost())};
}

Findings foreignFindings(const FirewallNeeds& needs) {
    Findings findings;
    const auto rules = listRules();
    for (const ClosingChain& chain :
         rules ? closingChains(*rules, needs.openPorts, needs.onlyFromHere) : std::vector<ClosingChain>()) {
        findings.push_back(finding("firewall-foreign-drop",
                                   chain.surely ? Severity::error : Severity::warning, chain.sentence(),
                                   "nft list chain " + chain.name));
    }
    return findings;
}

Findings lockOutFindings(const FirewallSettings& settings, const FirewallNeeds& needs) {
    if (settings.mode != FirewallMode::drop || settings.force || !needs.administration) {
        return {};
    }
    const auto ports = needs.administration();
    const auto closed = ports ? firstClosed(*ports, settings, needs.openPorts) : std::nullopt;
    if (!closed) {
        return {};
    }
    const std::string port = std::to_string(closed->port);
    return {finding("firewall-locks-out", Severity::error,
                    "The firewall rules are not loaded, since they would close port " + port + ", by which " +
                        closed->program + " is reached.",
                    afterEdit("Add " + port + " to \"ports\""))};
}

/// What was found for these rules; the packet filter counts every change of them.
struct Judged {
    std::mutex mutex;
    std::uint32_t generation = 0;
    std::string script;
    std::optional<Findings> findings;
};

Findings findingsInForce(const FirewallSettings& settings, const FirewallNeeds& needs,
                         std::uint32_t generation) {
    static Judged judged;
    const std::string script = renderRuleset(settings, needs.openPorts, needs.loginPorts);
    std::string judgedBy = script;
    for (const VELT_FTP_PORT_RANGE& range : needs.openPorts) { // of which a script for no table tells nothing
        judgedBy += formatPortRange(range) + (needs.onlyFromHere ? " here\n" : "\n");
    }
    const std::lock_guard lock(judged.mutex);
    if (!judged.findings || judged.generation != generation || judged.script != judgedBy) {
        Findings findings =
            settings.mode == FirewallMode::off ? Findings() : tableFindings(settings, needs, script);
        std::ranges::move(foreignFindings(needs), std::back_inserter(findings));
        judged.generation = generation;
        judged.script = judgedBy;
        judged.findings = std::move(findings);
    }
    return *judged.findings;
}

} // namespace

Findings firewallFindings() {
    if (!mayTouchRules().valueOr(true)) {
        return {};
    }
    const auto settings = loadFirewallSettings();
    if (!settings) {
        return {damagedSettings(settings.error())};
    }
    const auto generation = rulesetGeneration();
    const auto needs = firewallNeeds();
    if (!needs || !generation) {
        return {}; // services that tell what is wrong, or no right to look
    }
    Findings findings = lockOutFindings(*settings, *needs);
    std::ranges::move(findingsInForce(*settings, *needs, *generation), std::back_inserter(findings));
    return findings;
}

} // namespace velt
