// Changing the chroot rules that are stored.
#ifndef VELT_CLI_RULE_CHANGE_H
#define VELT_CLI_RULE_CHANGE_H

#include "cli/change_report.h"
#include "cli/rule_list.h"

#include <functional>

namespace velt::cli {

/// Whether the document of all settings confines users without a rule, too.
bool confinesAll(const Json::Value& settings);

/// Lets `change` change the rules of the settings, stores them, and writes what that did. It runs once more,
/// from its start, when others change the settings meanwhile.
void changeRules(Context& context, const ChangeOptions& options,
                 const std::function<void(ChrootRules& rules, const Json::Value& settings)>& change);

} // namespace velt::cli

#endif
