// The stored chroot rules: "/etc/velt/chroot_rules" below the state root, a version line and then one line
// for each rule.
#ifndef VELT_STANDALONE_RULES_RULE_STORE_H
#define VELT_STANDALONE_RULES_RULE_STORE_H

#include "standalone/rules/chroot_rule.h"

#include <string_view>
#include <vector>

namespace velt {

/// Reads the text of the rules file. The error of a damaged one names the file and the line.
Result<std::vector<ChrootRule>> parseRules(std::string_view text);

/// The stored rules in stored order; none when nothing was stored yet.
Result<std::vector<ChrootRule>> loadRules();

/// Stores these rules in place of the stored ones; logins from now on follow them. To change what loadRules
/// returned, hold a StateLock from before that call until after this one. An error leaves the stored rules as
/// they were.
Result<> storeRules(const std::vector<ChrootRule>& rules);

/// Stores an empty set where nothing was stored yet: without the file the FTP daemon refuses each login.
Result<> makeRulesFile();

} // namespace velt

#endif
