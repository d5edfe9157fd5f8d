#include "host/api/settings_document.h"

#include "base/json_value.h"
#include "base/number_text.h"
#include "base/text.h"
#include "host/api/rules_section.h"
#include "host/module/module_call.h"

#include <algorithm>
#include <array>
#include <optional>

namespace velt::host {

namespace {

constexpr const char* formatName = "velt-settings";
constexpr int formatVersion = 1;
constexpr const char* rulesApi = "VELT.Core.FileServ.FTP.ChrootUser";
constexpr int rulesVersion = 2;

/// Restrictions before what they restrict.
constexpr std::array groupsInOrder{&schema::confinement, &schema::security, &schema::ftp, &schema::sftp};

Result<Json::Value> ask(const Row& row, const Principal& principal) {
    Outcome outcome = callRow(row, Json::Value(Json::objectValue), principal.actor, principal.address);
    if (outcome.kind == Outcome::Kind::success && outcome.data.isObject()) {
        return std::move(outcome.data);
    }
    if (!outcome.platform.sentence.empty()) {
        return Error(outcome.platform.sentence);
    }
    return Error("The module does not answer " + row.name() + ".");
}

/// The stored switch of the service; nothing when the settings cannot be read.
std::optional<bool> storedSwitch(std::string_view service) {
    const auto services = storedServices();
    const auto found = std::ranges::find(services, service, &StoredService::name);
    return found == services.end() ? std::nullopt : found->enabled;
}

Json::Value sectionOf(const schema::SettingGroup& group, const Json::Value& answer) {
    Json::Value section(Json::objectValue);
    for (const schema::Setting* setting : documentSettings(group)) {
        const Json::Value& value = answer[setting->key];
        // Modules answer with signed and unsigned numbers, which are not the same to a comparison.
        section[setting->key] = value.isInt64() ? Json::Value(Json::Int64{value.asInt64()}) : value;
        if (setting->service != nullptr) {
            if (const auto stored = storedSwitch(setting->service)) {
                section[setting->key] = *stored;
            }
        }
    }
    return section;
}

Json::Value rulesIn(const Json::Value& answer) {
    return jsonArray(answer["rules"], [](const Json::Value& rule) {
        return jsonObject({{"type", rule["type"]}, {"name", rule["name"]}, {"path", rule["path"]}});
    });
}

Result<Json::Value> readRules(const Row& load, const Principal& principal) {
    for (int attempt = 0; attempt < 3; ++attempt) {
        VELT_ASSIGN_OR_RETURN(const auto answer, ask(load, principal));
        VELT_ASSIGN_OR_RETURN(auto rules, allRules(rulesIn(answer)));
        if (rules) {
            return std::move(*rules);
        }
    }
    return Error("The accounts of the chroot rules come and go while they are looked up. Try again.");
}

bool usesRange(const Json::Value& section) {
    return section.isObject() && section["custom_port_range"] == true;
}

bool isIdleRange(const std::string& key, const Json::Value& before, const Json::Value& after) {
    return key == "custom_port" && !usesRange(before) && !usesRange(after);
}

void compareSections(const std::string& name, const Json::Value& before, const Json::Value& after,
                     std::vector<FieldChange>& changes) {
    for (const std::string& key : after.getMemberNames()) {
        if (before[key] != after[key] && !isIdleRange(key, before, after)) {
            changes.push_back(
                {std::string("/").append(name).append("/").append(key), before[key], after[key]});
        }
    }
}

Json::Value changedSettings(const schema::SettingGroup& group, const Json::Value& before,
                            const Json::Value& wanted) {
    Json::Value parameters(Json::objectValue);
    for (const schema::Setting* setting : documentSettings(group)) {
        const std::string key = setting->key;
        if (wanted[key] != before[key] && !isIdleRange(key, before, wanted)) {
            parameters[key] = wanted[key];
        }
    }
    return parameters;
}

/// What the methods ask for beside the settings that change.
Json::Value completed(const schema::SettingGroup& group, Json::Value parameters, const Json::Value& wanted) {
    for (const schema::Setting* setting : documentSettings(group)) {
        if (setting->service != nullptr) {
            parameters[setting->key] = wanted[setting->key];
        }
    }
    // A range is taken with its switch only, and the switch with a range only.
    if (parameters.isMember("custom_port") || parameters.isMember("custom_port_range")) {
        parameters["custom_port_range"] = wanted["custom_port_range"];
        parameters.removeMember("custom_port");
        if (usesRange(wanted)) {
            parameters["custom_port"] = wanted["custom_port"];
        }
    }
    // An empty address is refused; a blank one is stored as none.
    if (parameters.isMember("ext_ip") && parameters["ext_ip"].asString().empty()) {
        parameters["ext_ip"] = " ";
    }
    return parameters;
}

std::optional<VELT_FTP_PORT_RANGE> rangeIn(const Json::Value& section) {
    if (!usesRange(section)) {
        return VELT_FTP_PORT_RANGE{schema::firstPassivePort, schema::lastPassivePort};
    }
    const std::string text = section["custom_port"].asString();
    std::string_view rest = text;
    const auto first = parseNumber(cut(rest, ':'));
    const auto last = parseNumber(rest);
    if (!first || !last) {
        return std::nullopt;
    }
    return VELT_FTP_PORT_RANGE{static_cast<int>(*first), static_cast<int>(*last)};
}

} // namespace

std::vector<const schema::Setting*> documentSettings(const schema::SettingGroup& group) {
    std::vector<const schema::Setting*> settings;
    for (const schema::Setting& setting : group.settings) {
        if (setting.key != nullptr &&
            (setting.apiVersion == 0 || setting.apiVersion == group.newestApiVersion)) {
            settings.push_back(&setting);
        }
    }
    return settings;
}

Result<Json::Value> readSettingsDocument(const ModuleTable& table, const Principal& principal) {
    Json::Value document = jsonObject({{"format", formatName}, {"format_version", formatVersion}});
    for (const schema::SettingGroup* group : schema::groups) {
        if (const Row* const row = table.find(group->api, group->newestApiVersion, "get")) {
            VELT_ASSIGN_OR_RETURN(const auto answer, ask(*row, principal));
            document[group->name] = sectionOf(*group, answer);
        }
    }
    VELT_ASSIGN_OR_RETURN(const auto confinement, loadConfinementSettings());
    document[schema::confinement.name] = jsonObject({{"sftp", confinement.sftp}});
    if (const Row* const row = table.find(rulesApi, rulesVersion, "load")) {
        VELT_ASSIGN_OR_RETURN(document[std::string(rulesSection)], readRules(*row, principal));
    }
    return document;
}

std::vector<FieldChange> differences(const Json::Value& before, const Json::Value& after) {
    std::vector<FieldChange> changes;
    const std::string rules(rulesSection);
    if (before[rules] != after[rules]) {
        changes.push_back({"/" + rules, before[rules], after[rules]});
    }
    for (const schema::SettingGroup* group : groupsInOrder) {
        if (after[group->name].isObject()) {
            compareSections(group->name, before[group->name], after[group->name], changes);
        }
    }
    return changes;
}

Json::Value toObject(const FieldChange& change) {
    return jsonObject({{"field", change.field}, {"from", change.from}, {"to", change.to}});
}

IntendedPorts portsIn(const Json::Value& document) {
    IntendedPorts ports;
    for (const char* const name : {schema::ftp.name, schema::sftp.name}) {
        if (document[name].isObject() && document[name]["portnum"].isInt()) {
            ports.listeners[name] = document[name]["portnum"].asInt();
        }
    }
    if (const Json::Value& section = document[schema::ftp.name]; section.isObject()) {
        if (const auto range = rangeIn(section)) {
            ports.ofSessions[schema::ftp.name] = *range;
        }
    }
    return ports;
}

Result<> storePlatformSettings(const Json::Value& before, const Json::Value& wanted) {
    const char* const name = schema::confinement.name;
    if (wanted[name] == before[name]) {
        return {};
    }
    return changeConfinement({.sftp = wanted[name]["sftp"].asBool()});
}

std::vector<SettingsCall> callsFor(const Json::Value& before, const Json::Value& wanted) {
    std::vector<SettingsCall> calls;
    const std::string rules(rulesSection);
    if (wanted[rules] != before[rules]) {
        calls.push_back(
            {rules, rulesApi, rulesVersion, "save", jsonObject({{"rules", namedRules(wanted[rules])}})});
    }
    for (const schema::SettingGroup* group : groupsInOrder) {
        const Json::Value changed = changedSettings(*group, before[group->name], wanted[group->name]);
        if (!changed.empty() && !group->isPlatforms()) {
            calls.push_back({group->name, group->api, group->newestApiVersion, "set",
                             completed(*group, changed, wanted[group->name])});
        }
    }
    return calls;
}

} // namespace velt::host
