#include "standalone/firewall/rule_script.h"

#include "base/file.h"
#include "base/plain_text.h"
#include "base/text.h"
#include "standalone/core/error_number.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/firewall/ruleset_generation.h"
#include "standalone/process/last_words.h"
#include "standalone/process/run_program.h"

namespace velt {

namespace {

constexpr std::size_t longestReason = 400;
constexpr std::chrono::seconds listLimit{3};

Error cannotLoad(const std::string& reason) {
    return {ErrorNumber::firewall, "Cannot load the firewall rules: " + reason + "."};
}

} // namespace

Result<bool> mayTouchRules() {
    return statePath("/") == "/" ? Result<bool>(true) : isThere(statePath(paths::firewallSettings));
}

Result<std::optional<std::uint32_t>> runRuleScript(const std::string& script) {
    auto before = rulesetGeneration();
    const auto result = runProcess({"nft", "-f", "-"}, script);
    if (result && result->exitCode == 0) {
        // It takes a script that it cannot read for one that says nothing.
        const bool idle = before && rulesetGeneration() == before;
        return idle ? Result<std::optional<std::uint32_t>>(cannotLoad("nft has changed nothing")) : before;
    }
    const std::string errors = result ? result->errors : result.error().message;
    // It may be a sentence of its own.
    std::string reason(trimmedEnd(plainText(errors.substr(0, errors.find('\n')), longestReason), ". "));
    reason = reasonOfEnd(reason, result ? result->exitCode : 0);
    if (reason.find("Operation not permitted") != std::string::npos) {
        reason = "this process is not allowed to change the firewall";
    }
    return cannotLoad(reason);
}

std::string listTable() {
    const auto listed =
        runProcess({"nft", "--json", "list", "table", "inet", "velt_fileserv"}, {}, listLimit);
    return listed && listed->exitCode == 0 ? listed->output : "";
}

} // namespace velt
