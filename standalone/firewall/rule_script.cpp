#include "standalone/firewall/rule_script.h"

#include "base/file.h"
#include "base/plain_text.h"
#include "base/text.h"
#include "standalone/core/error_number.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/process/last_words.h"
#include "standalone/process/run_program.h"

namespace velt {

namespace {

constexpr std::size_t longestReason = 400;

} // namespace

bool mayTouchRules() {
    return statePath("/") == "/" || fileExists(statePath(paths::firewallSettings));
}

Result<> runRuleScript(const std::string& script) {
    const auto result = runProcess({"nft", "-f", "-"}, script);
    if (result && result->exitCode == 0) {
        return {};
    }
    const std::string errors = result ? result->errors : result.error().message;
    // It may be a sentence of its own.
    std::string reason(trimmedEnd(plainText(errors.substr(0, errors.find('\n')), longestReason), ". "));
    reason = reasonOfEnd(reason, result ? result->exitCode : 0);
    if (reason.find("Operation not permitted") != std::string::npos) {
        reason = "this process is not allowed to change the firewall";
    }
    return Error(ErrorNumber::firewall, "Cannot load the firewall rules: " + reason + ".");
}

} // namespace velt
