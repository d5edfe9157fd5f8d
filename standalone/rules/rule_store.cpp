#include "standalone/rules/rule_store.h"

#include "base/file.h"
#include "standalone/core/boundary.h"
#include "standalone/core/effects.h"
#include "standalone/core/last_error.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_lock.h"
#include "standalone/core/state_root.h"

#include <algorithm>
#include <charconv>

namespace velt {
namespace {

constexpr std::string_view versionLine = "velt-chroot-rules 1";

std::filesystem::path rulesFile() {
    return statePath(paths::chrootRules);
}

bool isComponent(std::string_view component) {
    return !component.empty() && component != "." && component != "..";
}

std::optional<std::vector<ChrootRule>> damaged(int lineNumber) {
    fail(ErrorNumber::damaged,
         "Line " + std::to_string(lineNumber) + " of " + rulesFile().string() + " is damaged.");
    return std::nullopt;
}

} // namespace

bool isRulePath(std::string_view path) {
    if (path.empty() || path.front() != '/' ||
        std::ranges::any_of(path, [](unsigned char c) { return c < 0x20 || c == 0x7f; })) {
        return false;
    }
    while (!path.empty()) {
        path.remove_prefix(1);
        const auto end = std::min(path.find('/'), path.size());
        if (!isComponent(path.substr(0, end))) {
            return false;
        }
        path.remove_prefix(end);
    }
    return true;
}

std::string formatRule(const ChrootRule& rule) {
    return (rule.isUser ? "u:" : "g:") + std::to_string(rule.id) + ':' + rule.path;
}

std::optional<ChrootRule> parseRule(std::string_view line) {
    if (line.size() > longestRule || !(line.starts_with("u:") || line.starts_with("g:"))) {
        return std::nullopt;
    }
    ChrootRule rule;
    rule.isUser = line.front() == 'u';
    const char* const end = line.data() + line.size();
    const auto [rest, error] = std::from_chars(line.data() + 2, end, rule.id);
    if (error != std::errc() || rest == end || *rest != ':') {
        return std::nullopt;
    }
    rule.path.assign(rest + 1, end);
    // One rule has one line form; another one would not be found again by it.
    return isRulePath(rule.path) && formatRule(rule) == line ? std::optional(std::move(rule)) : std::nullopt;
}

std::optional<std::vector<ChrootRule>> parseRules(std::string_view text) {
    std::vector<ChrootRule> rules;
    for (int number = 1; number == 1 || !text.empty(); number++) {
        const auto end = text.find('\n');
        if (end == std::string_view::npos) {
            return damaged(number);
        }
        const auto line = text.substr(0, end);
        text.remove_prefix(end + 1);
        if (number == 1) {
            if (line != versionLine) {
                return damaged(number);
            }
            continue;
        }
        auto rule = parseRule(line);
        if (!rule) {
            return damaged(number);
        }
        rules.push_back(std::move(*rule));
    }
    return rules;
}

std::optional<std::vector<ChrootRule>> loadRules() {
    const auto text = readOptionalFile(rulesFile());
    if (!text) {
        fail(text.error());
        return std::nullopt;
    }
    return *text ? parseRules(**text) : std::vector<ChrootRule>();
}

int saveRules(const std::vector<ChrootRule>& rules) {
    std::string text(versionLine);
    text += '\n';
    for (const auto& rule : rules) {
        text += formatRule(rule);
        text += '\n';
    }
    const StateLock lock;
    if (!lock) {
        return -1;
    }
    return toContract(
        perform(Effect::store, "chroot rules", [&text] { return replaceFile(rulesFile(), text, 0600); }));
}

int makeRulesFile() {
    const StateLock lock;
    if (!lock) {
        return -1;
    }
    // A file that is there and cannot be read, or a link to a disk that is not mounted, holds rules that an
    // empty set would take away.
    std::error_code error;
    if (std::filesystem::symlink_status(rulesFile(), error).type() == std::filesystem::file_type::not_found) {
        return saveRules({});
    }
    return std::filesystem::exists(rulesFile(), error)
               ? 0
               : fail(ErrorNumber::store, "The file " + rulesFile().string() + " cannot be reached.");
}

} // namespace velt
