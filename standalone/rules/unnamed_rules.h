// Stored chroot rules whose accounts have no name now: deleted ones, and those of a directory that does not
// answer. Who edits rules by names has to keep them, or their users would be free.
#ifndef VELT_STANDALONE_RULES_UNNAMED_RULES_H
#define VELT_STANDALONE_RULES_UNNAMED_RULES_H

#include "standalone/rules/chroot_rule.h"

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

namespace velt {

struct UnnamedRule {
    std::size_t place = 0; ///< among all rules, in stored order, from 0
    ChrootRule rule;

    bool operator==(const UnnamedRule&) const = default;
};

struct RulesByName {
    std::size_t named = 0; ///< how many rules have an account with a name
    std::vector<UnnamedRule> unnamed;
};

/// Looks up each rule's account. Thread-safe.
Result<RulesByName> countRulesByName();

/// Puts each rule at its place among the stored ones, the first places first; at the end, where there are
/// fewer. To be called in the change that stored the others. Thread-safe.
Result<> putUnnamedRules(const std::vector<UnnamedRule>& rules);

/// The name of the user (or, with isUser false, of the group) with this number; nothing when there is none.
/// Thread-safe.
std::optional<std::string> ruleOwnerName(bool isUser, unsigned id);

/// Whether a user (or a group, with isUser false) of this name is known. Thread-safe.
bool isRuleOwner(bool isUser, const std::string& name);

} // namespace velt

#endif
