#include "standalone/firewall/banned_sources.h"

#include "standalone/core/state_lock.h"
#include "standalone/firewall/loaded_rules.h"
#include "standalone/firewall/rule_script.h"

#include <algorithm>

namespace velt {
namespace {

/// "element inet velt_fileserv banned4 { 192.0.2.1 timeout 600s }"; `what` follows the address.
std::string renderElement(const IpNetwork& source, const std::string& what) {
    const IpNetwork first{source.first,
                          IpNetwork().prefix}; // the set holds no networks, the rule cuts addresses
    return std::string("element inet velt_fileserv ") + (source.isIPv4() ? "banned4" : "banned6") + " { " +
           toText(first) + what + " }\n";
}

std::string renderTimed(const BannedSource& source) {
    const auto left = std::max<std::chrono::seconds::rep>(source.left.count(), 1);
    return renderElement(source.source, " timeout " + std::to_string(left) + "s");
}

Result<bool> hasRules() {
    VELT_ASSIGN_OR_RETURN(const bool allowed, mayTouchRules());
    return allowed ? rulesWereLoaded() : false;
}

Result<bool> change(const std::string& script) {
    VELT_ASSIGN_OR_RETURN(const auto lock, StateLock::take());
    VELT_ASSIGN_OR_RETURN(const bool loaded, hasRules());
    if (loaded) {
        VELT_ASSIGN_OR_RETURN(const auto before, runRuleScript(script));
        noteChanged(before);
    }
    return loaded;
}

} // namespace

std::string renderBannedSources(const std::vector<BannedSource>& sources) {
    std::string script;
    for (const BannedSource& source : sources) {
        script += "add " + renderTimed(source);
    }
    return script;
}

Result<bool> banSource(const BannedSource& source) {
    // Deleting one that is not there fails, and adding one that is there leaves it the time that it has.
    return change("add " + renderTimed(source) + "delete " + renderElement(source.source, "") + "add " +
                  renderTimed(source));
}

Result<bool> admitSource(const IpNetwork& source) {
    return change("add " + renderElement(source, " timeout 1s") + "delete " + renderElement(source, ""));
}

// Without the lock, which a change of settings holds for seconds: what is asked is written at once.
Result<bool> firewallRefuses() {
    return hasRules();
}

} // namespace velt
