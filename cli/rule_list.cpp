#include "cli/rule_list.h"

#include "base/json_value.h"
#include "cli/failure.h"
#include "cli/json_io.h"
#include "cli/server_refusal.h"

#include <algorithm>

namespace velt::cli {

namespace {

const ApiMethod loadMethod{chrootApi, 2, "load"};
const ApiMethod saveMethod{chrootApi, 2, "save"};

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

void replaceRules(ApiClient& api, const ChrootRules& rules) {
    api.call(saveMethod, jsonObject({{"rules", rulesToJson(rules)}}));
}

} // namespace

std::string ruleToText(const ChrootRule& rule) {
    return rule.type + " " + rule.name + " " + rule.path;
}

// The server takes any type but "user" for a group, and fails to load a rule with an empty path.
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

ChrootRules loadRules(ApiClient& api) {
    const Json::Value answer = api.read(loadMethod);
    ChrootRules rules;
    if (!answer.isObject() || !answer["rules"].isArray()) {
        throw unexpectedAnswer("The server's answer contains no chroot rules.");
    }
    for (const Json::Value& rule : answer["rules"]) {
        rules.push_back(ruleFromJson(rule));
    }
    return rules;
}

void storeRules(ApiClient& api, const ChrootRules& rules, const ChrootRules& before) {
    replaceRules(api, rules);
    const ChrootRules stored = loadRules(api);
    Failure dropped(ExitCode::refused,
                    "The server does not know the user or group of a rule, or does not accept its folder.",
                    "Correct these rules and try again.");
    for (const ChrootRule& rule : rules) {
        if (std::ranges::find(stored, rule) == stored.end()) {
            dropped.note("left out: " + ruleToText(rule));
        }
    }
    if (!dropped.notes().empty()) {
        replaceRules(api, before);
        dropped.note("The rules are as they were before.");
        throw Failure(dropped);
    }
}

} // namespace velt::cli
