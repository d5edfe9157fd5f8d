#include "cli/rule_list.h"

#include "base/json_value.h"
#include "cli/failure.h"
#include "cli/json_io.h"
#include "cli/server_refusal.h"

namespace velt::cli {

namespace {

ChrootRule ruleFromJson(const Json::Value& object) {
    return {textAt(object, "type"), textAt(object, "name"), textAt(object, "path")};
}

std::optional<std::string> faultIn(const Json::Value& object) {
    if (!object.isObject() || !object["type"].isString() || !object["name"].isString() ||
        !object["path"].isString()) {
        return "expected an object with the strings type, name and path";
    }
    return faultOf(ruleFromJson(object));
}

} // namespace

// What the server would refuse as well, said before it is asked.
std::optional<std::string> faultOf(const ChrootRule& rule) {
    if (rule.type != "user" && rule.type != "group") {
        return "type: expected user or group";
    }
    if (rule.name.empty()) {
        return "name: expected the name of a user or group";
    }
    if (rule.path.empty() || rule.path.front() != '/') {
        return "path: expected /home, /SHARE or /SHARE/FOLDER";
    }
    return std::nullopt;
}

Json::Value rulesToJson(const ChrootRules& rules) {
    return jsonArray(rules, [](const ChrootRule& rule) {
        return jsonObject({{"type", rule.type}, {"name", rule.name}, {"path", rule.path}});
    });
}

ChrootRules rulesFromJson(const Json::Value& array, std::vector<std::string>& faults) {
    ChrootRules rules;
    if (!array.isArray()) {
        faults.emplace_back("rules: expected a list");
        return rules;
    }
    for (Json::ArrayIndex i = 0; i < array.size(); ++i) {
        if (const auto fault = faultIn(array[i])) {
            faults.push_back("rule " + std::to_string(i + 1) + ": " + *fault);
        } else {
            rules.push_back(ruleFromJson(array[i]));
        }
    }
    return rules;
}

ChrootRules rulesOf(const Json::Value& settings) {
    ChrootRules rules;
    if (!settings.isObject() || !settings["chroot_rules"].isArray()) {
        throw unexpectedAnswer("The server's answer contains no chroot rules.");
    }
    for (const Json::Value& rule : settings["chroot_rules"]) {
        rules.push_back(ruleFromJson(rule));
    }
    return rules;
}

} // namespace velt::cli
