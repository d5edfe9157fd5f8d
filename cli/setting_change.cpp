#include "cli/setting_change.h"

#include "base/json_value.h"
#include "base/printable.h"
#include "cli/json_io.h"

namespace velt::cli {

Json::Value changeToJson(const SettingChange& change) {
    return jsonObject({{"key", change.key}, {"from", change.from}, {"to", change.to}});
}

std::string changeToText(const SettingChange& change) {
    const auto shown = [](const Json::Value& value) {
        const std::string text = displayValue(value);
        return text.empty() ? std::string("(empty)") : printable(text);
    };
    return change.key + ": " + shown(change.from) + " -> " + shown(change.to);
}

} // namespace velt::cli
