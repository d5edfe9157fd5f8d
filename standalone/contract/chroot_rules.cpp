// The chroot rules of the contract (ftp/ftp_library.h).
#include "ftp/ftp_library.h"
#include "standalone/accounts/user_directory.h"
#include "standalone/core/boundary.h"
#include "standalone/core/last_error.h"
#include "standalone/core/state_lock.h"
#include "standalone/rules/rule_store.h"

#include <algorithm>
#include <cstring>

namespace velt {
namespace {

std::optional<std::string> nameOf(const ChrootRule& rule) {
    if (rule.isUser) {
        const auto user = userById(rule.id);
        return user ? std::optional(user->name) : std::nullopt;
    }
    const auto group = groupById(rule.id);
    return group ? std::optional(group->name) : std::nullopt;
}

bool copyText(const std::string& text, char* buffer, int size) {
    if (size <= 0 || text.size() >= static_cast<std::size_t>(size)) {
        return false;
    }
    std::memcpy(buffer, text.c_str(), text.size() + 1);
    return true;
}

int parseToName(const char* line, int* isUser, char* name, int nameSize, char* path, int pathSize) {
    const auto rule = line != nullptr ? parseRule(line) : std::nullopt;
    if (!rule) {
        return fail(ErrorNumber::damaged, "The chroot rule cannot be read.");
    }
    const auto owner = nameOf(*rule);
    if (!owner) {
        return fail(ErrorNumber::notFound, "There is no " + std::string(rule->isUser ? "user" : "group") +
                                               " with the number " + std::to_string(rule->id) + ".");
    }
    if (owner->size() >= static_cast<std::size_t>(std::max(nameSize, 0)) ||
        !copyText(rule->path, path, pathSize)) {
        return fail(ErrorNumber::invalid, "The chroot rule of " + *owner + " is too long.");
    }
    *isUser = rule->isUser ? 1 : 0;
    copyText(*owner, name, nameSize);
    return 0;
}

int format(char* buffer, int size, int isUser, int id, std::string path) {
    // A share's folder may be written with a slash at its end.
    while (path.size() > 1 && path.back() == '/') {
        path.pop_back();
    }
    if (id < 0 || !isRulePath(path)) {
        return fail(ErrorNumber::invalid, "A chroot rule needs a path like \"/share/folder\" or \"/home\".");
    }
    const std::string line = formatRule({isUser != 0, static_cast<unsigned>(id), path});
    if (line.size() > longestRule || !copyText(line, buffer, size)) {
        return fail(ErrorNumber::invalid, "The path of the chroot rule is too long.");
    }
    return 0;
}

int save(const VLIBCSzList* list) {
    std::vector<ChrootRule> rules;
    for (int i = 0; list != nullptr && i < list->count; i++) {
        auto rule = parseRule(VLIBCSzListGet(list, i));
        if (!rule) {
            return fail(ErrorNumber::invalid, "Chroot rule " + std::to_string(i + 1) + " cannot be read.");
        }
        rules.push_back(std::move(*rule));
    }
    const StateLock lock;
    return lock ? saveRules(rules) : -1;
}

int enumerate(VLIBCSzList** list) {
    const auto rules = loadRules();
    if (!rules) {
        return -1;
    }
    for (const auto& rule : *rules) {
        if (VLIBCSzListPush(list, formatRule(rule).c_str()) < 0) {
            return -1;
        }
    }
    return 0;
}

} // namespace
} // namespace velt

int VELTFTPChrootRuleEnum(VLIBCSzList** list) {
    return velt::atBoundary([&] { return velt::enumerate(list); });
}

int VELTFTPChrootRuleParseToName(const char* line, int* isUser, char* name, int nameSize, char* path,
                                 int pathSize) {
    return velt::atBoundary([&] { return velt::parseToName(line, isUser, name, nameSize, path, pathSize); });
}

int VELTFTPChrootRuleFormat(char* buf, int size, int isUser, int id, const char* path) {
    return velt::atBoundary([&] { return velt::format(buf, size, isUser, id, path != nullptr ? path : ""); });
}

int VELTFTPChrootRuleSave(VLIBCSzList* list) {
    return velt::atBoundary([&] { return velt::save(list); });
}
