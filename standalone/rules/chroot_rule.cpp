#include "standalone/rules/chroot_rule.h"

#include "base/text.h"
#include "standalone/accounts/user_directory.h"
#include "standalone/core/error_number.h"

#include <algorithm>
#include <charconv>

namespace velt {
namespace {

bool isComponent(std::string_view component) {
    return !component.empty() && component != "." && component != "..";
}

} // namespace

bool isRulePath(std::string_view path) {
    if (path.empty() || path.front() != '/' || std::ranges::any_of(path, isControl)) {
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

Result<ChrootRule> makeRule(bool isUser, int id, std::string path) {
    while (path.size() > 1 && path.back() == '/') {
        path.pop_back();
    }
    if (id < 0 || !isRulePath(path)) {
        return Error(ErrorNumber::invalid, "A chroot rule needs a path like \"/share/folder\" or \"/home\".");
    }
    ChrootRule rule{isUser, static_cast<unsigned>(id), std::move(path)};
    if (formatRule(rule).size() > longestRule) {
        return Error(ErrorNumber::invalid, "The path of the chroot rule is too long.");
    }
    return rule;
}

std::string formatRule(const ChrootRule& rule) {
    return (rule.isUser ? "u:" : "g:") + std::to_string(rule.id) + ':' + rule.path;
}

Result<ChrootRule> parseRule(std::string_view line) {
    const Error refused(ErrorNumber::damaged,
                        "expected a rule like \"u:1000:/share/folder\" or \"g:100:/home\"");
    if (line.size() > longestRule || !(line.starts_with("u:") || line.starts_with("g:"))) {
        return refused;
    }
    ChrootRule rule;
    rule.isUser = line.front() == 'u';
    const char* const end = line.data() + line.size();
    const auto [rest, error] = std::from_chars(line.data() + 2, end, rule.id);
    if (error != std::errc() || rest == end || *rest != ':') {
        return refused;
    }
    rule.path.assign(rest + 1, end);
    // Each rule has exactly one line form, so that lines can be compared.
    if (!isRulePath(rule.path) || formatRule(rule) != line) {
        return refused;
    }
    return rule;
}

Result<std::string> ownerOf(const ChrootRule& rule) {
    if (rule.isUser) {
        if (const auto user = userById(rule.id)) {
            return user->name;
        }
    } else if (const auto group = groupById(rule.id)) {
        return group->name;
    }
    return Error(ErrorNumber::notFound, "There is no " + std::string(rule.isUser ? "user" : "group") +
                                            " with the ID " + std::to_string(rule.id) + ".");
}

const ChrootRule* ruleFor(const std::vector<ChrootRule>& rules, uid_t uid, const std::vector<gid_t>& gids) {
    const ChrootRule* ofGroup = nullptr;
    for (const ChrootRule& rule : rules) {
        if (rule.isUser && rule.id == uid) {
            return &rule;
        }
        if (!rule.isUser && ofGroup == nullptr && std::ranges::find(gids, rule.id) != gids.end()) {
            ofGroup = &rule;
        }
    }
    return ofGroup;
}

} // namespace velt
