#include "cli/settings_document.h"

#include "base/json_value.h"
#include "base/number_text.h"
#include "base/printable.h"
#include "base/text.h"
#include "cli/current_settings.h"

#include <algorithm>
#include <functional>

namespace velt::cli {

namespace {

constexpr const char* formatName = "velt-settings";
constexpr int formatVersion = 1;
constexpr const char* rulesSection = "chroot_rules";

bool switchesAService(const SettingGroup& group) {
    return std::ranges::any_of(group.settings, [](const Setting& each) { return each.service != nullptr; });
}

std::vector<SettingGroup> groupsInOrder() {
    std::vector<SettingGroup> groups;
    for (const schema::SettingGroup* table : schema::groups) {
        groups.push_back(newestGroupOf(*table));
    }
    std::stable_partition(groups.begin(), groups.end(), std::not_fn(switchesAService));
    return groups;
}

// Whether the port lies in a passive range such as "55536:55899".
bool inRange(const std::string& range, int port) {
    std::string_view rest = range;
    const auto first = parseNumber(cut(rest, ':'));
    const auto last = parseNumber(rest);
    return first && last && *first <= port && port <= *last;
}

// A port that the document moves from SFTP to FTP is free only after SFTP has moved.
bool sftpMovesFirst(ApiClient& api, const Json::Value& document) {
    if (!document.isMember("ftp") || !document.isMember("sftp")) {
        return false;
    }
    const int port = readSettings(api, newestGroupOf(schema::sftp))["portnum"].asInt();
    const Json::Value& ftp = document["ftp"];
    const bool inWay = ftp["portnum"] == port ||
                       (ftp["custom_port_range"] == true && inRange(ftp["custom_port"].asString(), port));
    return inWay && document["sftp"]["portnum"].isInt() && document["sftp"]["portnum"] != port;
}

// Only known keys: a document with those of a newer server could not be imported.
Json::Value knownSettings(const SettingGroup& group, const Json::Value& current) {
    Json::Value section(Json::objectValue);
    for (const Setting& setting : group.settings) {
        if (current.isMember(setting.key)) {
            section[setting.key] = current[setting.key];
        }
    }
    return section;
}

void checkSection(const SettingGroup& group, const Json::Value& section, std::vector<std::string>& faults) {
    if (!section.isObject()) {
        faults.push_back(std::string(group.command) + ": expected an object");
        return;
    }
    for (const std::string& key : section.getMemberNames()) {
        const std::string name = std::string(group.command) + "." + key;
        const Setting* setting = group.find(key);
        if (setting == nullptr) {
            faults.push_back(name + ": unknown; known keys are " + group.keys());
        } else if (!isValid(section[key], *setting)) {
            faults.push_back(group.command + ("." + expectationOf(*setting)));
        }
    }
}

void checkTop(const Json::Value& document, std::vector<std::string>& faults) {
    if (document["format"] != formatName || document["format_version"] != formatVersion) {
        faults.push_back(std::string("format: expected \"") + formatName + "\" with format_version " +
                         std::to_string(formatVersion));
    }
    std::vector<std::string> known = {"format", "format_version", rulesSection};
    for (const schema::SettingGroup* table : schema::groups) {
        known.emplace_back(table->name);
    }
    for (const std::string& name : document.getMemberNames()) {
        if (std::ranges::find(known, name) == known.end()) {
            faults.push_back(name + ": unknown section");
        }
    }
}

// While its switch is off, the server shows the default passive range, which nobody has set.
void dropIdlePassiveRange(Json::Value& wanted, const Json::Value& section, const Json::Value& current) {
    const Json::Value& range =
        section.isMember("custom_port_range") ? section["custom_port_range"] : current["custom_port_range"];
    if (range != true) {
        wanted.removeMember("custom_port");
    } else if (wanted.isMember("custom_port") || wanted.isMember("custom_port_range")) {
        wanted["custom_port_range"] = true;
        wanted["custom_port"] =
            section.isMember("custom_port") ? section["custom_port"] : current["custom_port"];
    }
}

Json::Value wantedOf(const SettingGroup& group, const Json::Value& section, const Json::Value& current) {
    Json::Value wanted(Json::objectValue);
    for (const std::string& key : section.getMemberNames()) {
        if (section[key] != current[key]) {
            wanted[key] = section[key];
        }
    }
    if (group.find("custom_port") != nullptr) {
        dropIdlePassiveRange(wanted, section, current);
    }
    return wanted;
}

// The server refuses a passive range that contains the current control port, even when the same request moves
// that port away. So the port moves first, with the default range.
std::vector<Json::Value> requestsFor(const Json::Value& wanted, const Json::Value& current) {
    if (!wanted.isMember("portnum") || !wanted.isMember("custom_port") ||
        !inRange(wanted["custom_port"].asString(), current["portnum"].asInt())) {
        return {wanted};
    }
    Json::Value first = wanted;
    first.removeMember("custom_port");
    first["custom_port_range"] = false;
    return {first, jsonObject({{"custom_port_range", true}, {"custom_port", wanted["custom_port"]}})};
}

void change(ApiClient& api, const SettingGroup& group, const Json::Value& wanted) {
    api.changeWhatWasRead([&] {
        api.call(group.method("set"),
                 completeChange(group, wanted, readCurrentSettings(api, group, wanted).stored));
    });
}

void planGroup(ApiClient& api, const SettingGroup& group, const Json::Value& section, ImportPlan& plan) {
    const Json::Value current = readCurrentSettings(api, group).stored;
    const Json::Value wanted = wantedOf(group, section, current);
    ImportStep step;
    step.section = group.command;
    for (const Setting& setting : group.settings) {
        if (!wanted.isMember(setting.key) || wanted[setting.key] == current[setting.key]) {
            continue;
        }
        const SettingChange change{setting.key, current[setting.key], wanted[setting.key]};
        step.changes.push_back(changeToText(change));
        step.changesJson.append(changeToJson(change));
    }
    if (step.changes.empty()) {
        return;
    }
    step.apply = [&api, group, requests = requestsFor(wanted, current)] {
        for (const Json::Value& request : requests) {
            change(api, group, request);
        }
    };
    plan.steps.push_back(std::move(step));
}

void planRules(ApiClient& api, const Json::Value& array, ImportPlan& plan) {
    std::vector<std::string> faults;
    const ChrootRules wanted = rulesFromJson(array, faults);
    const ChrootRules current = loadRules(api);
    if (wanted == current) {
        return;
    }
    const auto holds = [](const ChrootRules& rules, const ChrootRule& rule) {
        return std::ranges::find(rules, rule) != rules.end();
    };
    ImportStep step;
    step.section = rulesSection;
    for (const ChrootRule& rule : current) {
        if (!holds(wanted, rule)) {
            step.changes.push_back("remove " + printable(ruleToText(rule)));
        }
    }
    for (const ChrootRule& rule : wanted) {
        if (!holds(current, rule)) {
            step.changes.push_back("add " + printable(ruleToText(rule)));
        }
    }
    if (step.changes.empty()) {
        step.changes.emplace_back("the same rules in another order");
    }
    step.changesJson.append(changeToJson({"rules", rulesToJson(current), rulesToJson(wanted)}));
    step.apply = [&api, wanted] { api.changeWhatWasRead([&] { storeRules(api, wanted, loadRules(api)); }); };
    plan.steps.push_back(std::move(step));
}

} // namespace

Json::Value exportSettings(ApiClient& api) {
    Json::Value document = jsonObject({{"format", formatName},
                                       {"format_version", formatVersion},
                                       {rulesSection, rulesToJson(loadRules(api))}});
    for (const SettingGroup& group : groupsInOrder()) {
        document[group.command] = knownSettings(group, readCurrentSettings(api, group).stored);
    }
    return document;
}

std::vector<std::string> documentFaults(const Json::Value& document) {
    std::vector<std::string> faults;
    if (!document.isObject()) {
        faults.emplace_back("expected an object");
        return faults;
    }
    checkTop(document, faults);
    for (const SettingGroup& group : groupsInOrder()) {
        if (document.isMember(group.command)) {
            checkSection(group, document[group.command], faults);
        }
    }
    if (document.isMember(rulesSection)) {
        std::vector<std::string> ruleFaults;
        rulesFromJson(document[rulesSection], ruleFaults);
        for (const std::string& fault : ruleFaults) {
            faults.push_back(rulesSection + (": " + fault));
        }
    }
    return faults;
}

ImportPlan planImport(ApiClient& api, const Json::Value& document) {
    ImportPlan plan;
    if (document.isMember(rulesSection)) {
        planRules(api, document[rulesSection], plan);
    }
    std::vector<SettingGroup> groups = groupsInOrder();
    if (sftpMovesFirst(api, document)) {
        const auto place = [&](std::string_view command) {
            return std::ranges::find(groups, command, &SettingGroup::command);
        };
        std::iter_swap(place(schema::ftp.name), place(schema::sftp.name));
    }
    for (const SettingGroup& group : groups) {
        if (document.isMember(group.command)) {
            planGroup(api, group, document[group.command], plan);
        }
    }
    return plan;
}

} // namespace velt::cli
