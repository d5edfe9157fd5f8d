// The stored chroot rules: "/etc/velt/chroot_rules" below the state root, a version line and then one line
// for each rule.
#ifndef VELT_STANDALONE_RULES_RULE_STORE_H
#define VELT_STANDALONE_RULES_RULE_STORE_H

#include "standalone/rules/chroot_rule.h"

#include <string>
#include <string_view>
#include <vector>

namespace velt {

/// Reads the text of the rules file. The error of a damaged one names the file and the line.
Result<std::vector<ChrootRule>> parseRules(std::string_view text);

/// The stored rules in stored order; none when nothing was stored yet. An error when they are lost.
Result<std::vector<ChrootRule>> loadRules();

/// Stores these rules in place of the stored ones; logins from now on follow them. To change what loadRules
/// returned, hold a StateLock from before that call until after this one. An error leaves the stored rules as
/// they were.
Result<> storeRules(const std::vector<ChrootRule>& rules);

/// Stores an empty set where nothing was stored yet: without the file each login over FTP is refused. To be
/// called once in the life of an installation, since later a missing file is one that was lost, with
/// everybody's confinement.
Result<> makeRulesFile();

/// Notes that makeRulesFile has had its time: from now on loadRules does not take a missing file for none.
Result<> expectRules();

/// Whether expectRules was ever called for this state root.
Result<bool> areRulesExpected();

/// How to go on without a lost file.
std::string makeRulesCommand();

} // namespace velt

#endif
