#include "standalone/rules/rule_store.h"

#include "base/file.h"
#include "base/text.h"
#include "standalone/core/effects.h"
#include "standalone/core/error_number.h"
#include "standalone/core/paths.h"
#include "standalone/core/staged_files.h"
#include "standalone/core/state_lock.h"
#include "standalone/core/state_root.h"

namespace velt {
namespace {

constexpr std::string_view versionLine = "velt-chroot-rules 1";

std::filesystem::path rulesFile() {
    return statePath(paths::chrootRules);
}

Error damaged(int lineNumber, const std::string& why) {
    return {ErrorNumber::damaged, "Cannot read " + rulesFile().string() + ", line " +
                                      std::to_string(lineNumber) + ": " + why + "."};
}

} // namespace

Result<std::vector<ChrootRule>> parseRules(std::string_view text) {
    std::vector<ChrootRule> rules;
    for (int number = 1; number == 1 || !text.empty(); number++) {
        if (!text.empty() && text.find('\n') == std::string_view::npos) {
            return damaged(number, "the line is cut off");
        }
        const auto line = cut(text, '\n');
        if (number == 1) {
            if (line != versionLine) {
                return damaged(number, "expected \"" + std::string(versionLine) + "\"");
            }
            continue;
        }
        auto rule = parseRule(line);
        if (!rule) {
            return damaged(number, rule.error().message);
        }
        rules.push_back(std::move(*rule));
    }
    return rules;
}

Result<std::vector<ChrootRule>> loadRules() {
    VELT_ASSIGN_OR_RETURN(const auto text, readOptionalFile(rulesFile()));
    if (text) {
        return parseRules(*text);
    }
    VELT_ASSIGN_OR_RETURN(const bool expected, areRulesExpected());
    if (expected) {
        return Error(ErrorNumber::damaged, "The file of the chroot rules, " + rulesFile().string() +
                                               ", is missing. Put your copy back; 'veltctl doctor' has the "
                                               "command for going on without rules.");
    }
    return std::vector<ChrootRule>();
}

Result<> storeRules(const std::vector<ChrootRule>& rules) {
    std::string text(versionLine);
    text += '\n';
    for (const auto& rule : rules) {
        text += formatRule(rule);
        text += '\n';
    }
    VELT_ASSIGN_OR_RETURN(const auto lock, StateLock::take());
    return perform(Effect::store, "chroot rules", [&text]() -> Result<> {
        VELT_ASSIGN_OR_RETURN(const auto place, storePath(paths::chrootRules));
        return replaceFile(place, text, 0600);
    });
}

Result<> makeRulesFile() {
    VELT_ASSIGN_OR_RETURN(const auto lock, StateLock::take());
    // Only where there is nothing: an unreadable file, or a link to a disk that is not mounted, holds rules
    // that an empty set would replace.
    std::error_code error;
    if (std::filesystem::symlink_status(rulesFile(), error).type() == std::filesystem::file_type::not_found) {
        return storeRules({});
    }
    if (!std::filesystem::exists(rulesFile(), error)) {
        return cannot("open", rulesFile(), error ? error.value() : ENOENT);
    }
    return {};
}

Result<> expectRules() {
    return replaceFile(statePath(paths::initialized), "", 0644);
}

Result<bool> areRulesExpected() {
    return isThere(statePath(paths::initialized));
}

std::string makeRulesCommand() {
    return "echo " + std::string(versionLine) + " | install -m 600 /dev/stdin " + rulesFile().string();
}

} // namespace velt
