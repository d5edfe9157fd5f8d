#include "standalone/firewall/firewall_table.h"

#include "base/file.h"
#include "base/text.h"
#include "standalone/core/error_number.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_lock.h"
#include "standalone/core/state_root.h"
#include "standalone/firewall/firewall_settings.h"
#include "standalone/firewall/foreign_tables.h"
#include "standalone/firewall/loaded_rules.h"
#include "standalone/firewall/ruleset.h"
#include "standalone/firewall/ruleset_generation.h"
#include "standalone/process/last_words.h"
#include "standalone/process/run_program.h"

#include <syslog.h>
#include <unistd.h>

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

Result<> load(const std::string& script) {
    const auto result = runProcess({"nft", "-f", "-"}, script);
    if (result && result->exitCode == 0) {
        return {};
    }
    const std::string errors = result ? result->errors : result.error().message;
    std::string reason(trimmedEnd(firstLine(errors), ". ")); // it may be a sentence of its own
    reason = reasonOfEnd(reason, result ? result->exitCode : 0);
    if (reason.find("Operation not permitted") != std::string::npos) {
        reason = "this process is not allowed to change the firewall";
    }
    return Error(ErrorNumber::firewall, "Cannot load the firewall rules: " + reason + ".");
}

void warnOfForeignTables() {
    const auto listed = runProcess({"nft", "--json", "list", "chains"});
    const std::vector<std::string> chains = foreignDropChains(listed ? listed->output : "");
    if (chains.empty()) {
        ::unlink(warningFile().c_str());
        return;
    }
    std::string text;
    for (const std::string& chain : chains) {
        text += "The chain \"" + chain +
                "\" of another firewall drops what it does not accept itself, so ports of the file-transfer "
                "services may stay closed.\n";
    }
    ::syslog(LOG_WARNING, "%s", firstLine(text).c_str());
    // The rules are in force by now; only the note is missing.
    if (const auto noted = replaceFile(warningFile(), text, 0644); !noted) {
        ::syslog(LOG_WARNING, "%s", noted.error().message.c_str());
    }
}

/// The rules belong to the machine, so an installation below another root leaves them alone unless it was
/// told about a firewall: its defaults would take away what the machine's own installation drops.
bool mayTouchRules() {
    return statePath("/") == "/" || fileExists(statePath(paths::firewallSettings));
}

Result<> removeRules(const std::string& script) {
    VELT_RETURN_IF_ERROR(load(script));
    noteRemoved();
    ::unlink(warningFile().c_str());
    return {};
}

// Each start of a service comes here, and most change no port.
Result<> replaceRules(const std::string& script) {
    if (rulesAreInForce(script)) {
        return {};
    }
    // Noted before it is done, since a note without rules does no harm.
    VELT_RETURN_IF_ERROR(noteLoading());
    const auto before = rulesetGeneration();
    VELT_RETURN_IF_ERROR(load(script));
    noteLoaded(script, before);
    warnOfForeignTables();
    return {};
}

} // namespace

Result<> loadFirewallRules(const std::function<Result<std::vector<VELT_FTP_PORT_RANGE>>()>& openPorts) {
    if (!mayTouchRules()) {
        return {};
    }
    // Held until the rules are loaded: of two processes the one with the older settings must not load its
    // rules last.
    VELT_ASSIGN_OR_RETURN(const auto lock, StateLock::take());
    VELT_ASSIGN_OR_RETURN(const auto firewall, loadFirewallSettings());
    const bool off = firewall.mode == FirewallMode::off;
    if (off && !rulesWereLoaded()) {
        return {}; // nothing to take away, and perhaps no right to do it
    }
    VELT_ASSIGN_OR_RETURN(const auto ports, openPorts());
    const std::string script = renderRuleset(firewall, ports);
    return off ? removeRules(script) : replaceRules(script);
}

} // namespace velt
