#include "cli/setting_change.h"

#include "cli/json_io.h"
#include "cli/printable.h"

namespace velt::cli {

Json::Value changeToJson(const SettingChange& change) {
    Json::Value result;
    result["key"] = change.key;
    result["from"] = change.from;
    result["to"] = change.to;
    return result;
}

std::string changeToText(const SettingChange& change) {
    const auto shown = [](const Json::Value& value) {
        const std::string text = displayValue(value);
        return text.empty() ? std::string("(empty)") : printable(text);
    };
    return change.key + ": " + shown(change.from) + " -> " + shown(change.to);
}

} // namespace velt::cli
