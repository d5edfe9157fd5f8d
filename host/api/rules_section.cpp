#include "host/api/rules_section.h"

#include "base/json_value.h"
#include "base/number_text.h"
#include "host/api/settings_document.h"
#include "standalone/standalone.h"

#include <limits>

namespace velt::host {

namespace {

/// The number in "#4711".
std::optional<unsigned> numberIn(const std::string& name) {
    const auto number = name.starts_with('#') ? parseNumber(std::string_view(name).substr(1)) : std::nullopt;
    const bool fits = number && *number >= 0 && *number <= std::numeric_limits<unsigned>::max();
    return fits ? std::optional(static_cast<unsigned>(*number)) : std::nullopt;
}

Json::Value toObject(const ChrootRule& rule) {
    return jsonObject({{"type", rule.isUser ? "user" : "group"},
                       {"name", "#" + std::to_string(rule.id)},
                       {"path", rule.path}});
}

} // namespace

bool isUnnamed(const Json::Value& rule) {
    return rule.isObject() && rule["name"].isString() && numberIn(rule["name"].asString());
}

Result<std::optional<Json::Value>> allRules(const Json::Value& named) {
    VELT_ASSIGN_OR_RETURN(const auto stored, countRulesByName());
    if (stored.named != named.size()) {
        return std::optional<Json::Value>();
    }
    Json::Value rules = named;
    for (const UnnamedRule& each : stored.unnamed) {
        rules.insert(static_cast<Json::ArrayIndex>(each.place), toObject(each.rule));
    }
    return std::optional(rules);
}

Json::Value withNames(Json::Value document) {
    if (!document.isMember(std::string(rulesSection))) {
        return document;
    }
    Json::Value& rules = document[std::string(rulesSection)];
    for (Json::ArrayIndex i = 0; rules.isArray() && i < rules.size(); ++i) {
        if (isUnnamed(rules[i])) {
            const auto number = numberIn(rules[i]["name"].asString());
            const auto name = ruleOwnerName(rules[i]["type"] == "user", *number);
            rules[i]["name"] = name ? Json::Value(*name) : rules[i]["name"];
        }
    }
    return document;
}

Json::Value namedRules(const Json::Value& rules) {
    Json::Value named(Json::arrayValue);
    for (const Json::Value& rule : rules) {
        if (!isUnnamed(rule)) {
            named.append(rule);
        }
    }
    return named;
}

Result<> storeUnnamedRules(const Json::Value& rules) {
    std::vector<UnnamedRule> unnamed;
    for (Json::ArrayIndex i = 0; i < rules.size(); ++i) {
        if (isUnnamed(rules[i])) {
            const auto number = numberIn(rules[i]["name"].asString());
            unnamed.push_back({i, {rules[i]["type"] == "user", *number, rules[i]["path"].asString()}});
        }
    }
    return putUnnamedRules(unnamed);
}

} // namespace velt::host
