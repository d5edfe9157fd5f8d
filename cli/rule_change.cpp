#include "cli/rule_change.h"

#include "base/json_value.h"

namespace velt::cli {

bool confinesAll(const Json::Value& settings) {
    return settings["security"].isObject() && settings["security"]["user_chroot"] == true;
}

void changeRules(Context& context, const ChangeOptions& options,
                 const std::function<void(ChrootRules&, const Json::Value&)>& change) {
    Json::Value report;
    context.api.changeWhatWasRead([&] {
        const Json::Value settings = context.api.get(settingsPath);
        ChrootRules rules = rulesOf(settings);
        change(rules, settings);
        report = context.api.patch(settingsPath + options.query(),
                                   jsonObject({{"chroot_rules", rulesToJson(rules)}}));
    });
    writeReport(context, report);
}

} // namespace velt::cli
