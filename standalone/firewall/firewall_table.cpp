#include "standalone/firewall/firewall_table.h"

#include "base/file.h"
#include "standalone/core/error_number.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_lock.h"
#include "standalone/core/state_root.h"
#include "standalone/firewall/firewall_settings.h"
#include "standalone/firewall/foreign_tables.h"
#include "standalone/firewall/loaded_rules.h"
#include "standalone/firewall/rule_script.h"
#include "standalone/firewall/ruleset.h"
#include "standalone/firewall/table_reading.h"

#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <filesystem>
#include <string>
#include <vector>

namespace velt {
namespace {

/// For the administrator: why ports may be closed although we opened them.
std::filesystem::path warningFile() {
    return statePath(paths::firewallWarning);
}

std::string firstLine(const std::string& text) {
    return text.substr(0, text.find('\n'));
}

void warnOfForeignTables(const FirewallNeeds& needs) {
    const auto rules = listRules();
    std::string text;
    for (const ClosingChain& each :
         rules ? closingChains(*rules, needs.openPorts, needs.onlyFromHere) : std::vector<ClosingChain>()) {
        text += each.sentence() + "\n";
    }
    if (text.empty()) {
        ::unlink(warningFile().c_str());
        return;
    }
    ::syslog(LOG_WARNING, "%s", firstLine(text).c_str());
    // The rules are in force by now; only the note is missing.
    if (const auto noted = replaceFile(warningFile(), text, 0644); !noted) {
        ::syslog(LOG_WARNING, "%s", noted.error().message.c_str());
    }
}

Result<> removeRules(const std::string& script) {
    VELT_ASSIGN_OR_RETURN(const auto before, runRuleScript(script));
    (void)before; // there is nothing left to which it would belong
    noteRemoved();
    ::unlink(warningFile().c_str());
    return {};
}

bool covers(const std::vector<VELT_FTP_PORT_RANGE>& ranges, int port) {
    return std::ranges::any_of(ranges, [port](const VELT_FTP_PORT_RANGE& range) {
        return port >= range.first && port <= range.last;
    });
}

Result<> checkAdministration(const FirewallSettings& firewall, const FirewallNeeds& needs) {
    if (firewall.mode != FirewallMode::drop || firewall.force || !needs.administration) {
        return {};
    }
    VELT_ASSIGN_OR_RETURN(const auto ports, needs.administration());
    const auto closed = firstClosed(ports, firewall, needs.openPorts);
    if (!closed) {
        return {};
    }
    const std::string port = std::to_string(closed->port);
    return Error(ErrorNumber::firewall, "The firewall rules are not loaded: they would close port " + port +
                                            ", by which " + closed->program + " is reached. Add " + port +
                                            " to \"ports\" in " +
                                            statePath(paths::firewallSettings).string() +
                                            ", or, if you want it closed, a line \"force = 1\".");
}

// Each start of a service comes here, and most change no port.
Result<> replaceRules(const FirewallSettings& firewall, const std::string& script,
                      const FirewallNeeds& needs) {
    if (rulesAreInForce(script)) {
        return {};
    }
    VELT_RETURN_IF_ERROR(checkAdministration(firewall, needs));
    // Noted before it is done, since a note without rules does no harm.
    VELT_RETURN_IF_ERROR(noteLoading());
    // Those who are banned are no part of what is compared: they come and go with the rules in force.
    VELT_ASSIGN_OR_RETURN(const auto before, runRuleScript(script + renderBannedSources(needs.banned)));
    noteLoaded(script, before);
    noteListing(script, tablePrint(listTable()));
    warnOfForeignTables(needs);
    return {};
}

} // namespace

std::optional<AdministrationPort> firstClosed(const std::vector<AdministrationPort>& ports,
                                              const FirewallSettings& firewall,
                                              const std::vector<VELT_FTP_PORT_RANGE>& openPorts) {
    if (firewall.mode != FirewallMode::drop) {
        return std::nullopt;
    }
    const auto closed = std::ranges::find_if(ports, [&](const AdministrationPort& each) {
        return !covers(openPorts, each.port) && !covers(firewall.furtherPorts, each.port);
    });
    return closed == ports.end() ? std::nullopt : std::optional(*closed);
}

Result<> loadFirewallRules(const std::function<Result<FirewallNeeds>()>& askNeeds) {
    VELT_ASSIGN_OR_RETURN(const bool allowed, mayTouchRules());
    if (!allowed) {
        return {};
    }
    // Held until the rules are loaded: of two processes the one with the older settings must not load its
    // rules last.
    VELT_ASSIGN_OR_RETURN(const auto lock, StateLock::take());
    VELT_ASSIGN_OR_RETURN(const auto firewall, loadFirewallSettings());
    const bool off = firewall.mode == FirewallMode::off;
    VELT_ASSIGN_OR_RETURN(const bool loaded, rulesWereLoaded());
    if (off && !loaded) {
        return {}; // nothing to take away, and perhaps no right to do it
    }
    VELT_ASSIGN_OR_RETURN(const auto needs, askNeeds());
    const std::string script = renderRuleset(firewall, needs.openPorts, needs.loginPorts);
    return off ? removeRules(script) : replaceRules(firewall, script, needs);
}

Result<> checkFirewallRules(const std::function<Result<FirewallNeeds>()>& askNeeds) {
    VELT_ASSIGN_OR_RETURN(const bool allowed, mayTouchRules());
    if (!allowed) {
        return {};
    }
    VELT_ASSIGN_OR_RETURN(const auto firewall, loadFirewallSettings());
    if (firewall.mode != FirewallMode::drop) {
        return {};
    }
    VELT_ASSIGN_OR_RETURN(const auto needs, askNeeds());
    return checkAdministration(firewall, needs);
}

} // namespace velt
