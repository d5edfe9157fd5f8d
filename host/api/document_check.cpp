#include "host/api/document_check.h"

#include "base/ipv4.h"
#include "base/json_value.h"
#include "base/number_text.h"
#include "base/text.h"
#include "host/api/settings_document.h"
#include "host/base/json.h"
#include "schema/setting_text.h"

#include <algorithm>
#include <array>
#include <set>
#include <utility>

namespace velt::host {

namespace {

using schema::Setting;
using schema::SettingType;
using Errors = std::vector<FieldError>;

constexpr int lowestPassivePort = 1024;

std::string pointer(const std::string& section, const std::string& key) {
    return "/" + section + "/" + pointerToken(key);
}

Json::Value defaultOf(const Setting& setting) {
    switch (setting.type) {
    case SettingType::boolean:
        return setting.number != 0;
    case SettingType::number:
        return Json::Value(Json::Int64{setting.number});
    case SettingType::text:
        break;
    }
    return setting.text;
}

Json::Value defaultsOf(const schema::SettingGroup& group) {
    Json::Value section(Json::objectValue);
    for (const Setting* setting : documentSettings(group)) {
        section[setting->key] = defaultOf(*setting);
    }
    return section;
}

void patchSection(const schema::SettingGroup& group, const Json::Value& patch, Json::Value& section) {
    if (patch.isNull()) {
        section = defaultsOf(group);
    } else if (!patch.isObject()) {
        section = patch;
    } else {
        const Json::Value defaults = defaultsOf(group);
        for (const std::string& key : patch.getMemberNames()) {
            section[key] = patch[key].isNull() ? defaults[key] : patch[key];
        }
    }
}

/// Not 1e2 or 100.0, though they are this number: modules take none of them.
bool isInDigits(const Json::Value& value) {
    return value.type() == Json::intValue || value.type() == Json::uintValue;
}

bool hasType(const Json::Value& value, SettingType type) {
    switch (type) {
    case SettingType::boolean:
        return value.isBool();
    case SettingType::number:
        return value.isInt() && isInDigits(value);
    case SettingType::text:
        break;
    }
    return value.isString() && std::ranges::none_of(value.asString(), isControl);
}

std::string expectationFor(const Setting& setting, const Json::Value& value) {
    const bool isNumber = setting.type == SettingType::number && value.isInt() && !isInDigits(value);
    return schema::expectation(setting, schema::trueFalse) +
           (isNumber ? ", in digits without fraction or exponent" : "");
}

bool isInRange(const Setting& setting, const Json::Value& value) {
    return setting.type != SettingType::number ||
           (setting.least <= value.asInt64() && value.asInt64() <= setting.most);
}

struct Range {
    std::int64_t first = 0;
    std::int64_t last = 0;
};

/// "55536:55899"; nothing for another text, or for ports that passive transfers cannot use.
std::optional<Range> passiveRange(const Json::Value& value) {
    const std::string text = value.isString() ? value.asString() : "";
    std::string_view rest = text;
    const auto first = parseNumber(cut(rest, ':'));
    const auto last = parseNumber(rest);
    const bool good =
        first && last && lowestPassivePort <= *first && *first < *last && *last <= schema::highestPort;
    return good ? std::optional(Range{*first, *last}) : std::nullopt;
}

void checkPassiveRange(const Json::Value& ftp, const Json::Value& current, Errors& errors) {
    if (ftp["custom_port_range"] != true) {
        // The default stands there when no range is set, in a document of another server as well.
        if (ftp["custom_port"] != current["custom_port"] && ftp["custom_port"] != schema::passiveRange) {
            errors.push_back({"/ftp/custom_port", "nothing else than now unless custom_port_range is true"});
        }
        return;
    }
    const auto range = passiveRange(ftp["custom_port"]);
    if (!range) {
        errors.push_back({"/ftp/custom_port", "first and last port from 1024 to 65535, such as 55536:55899"});
    } else if (ftp["portnum"].isInt() && range->first <= ftp["portnum"].asInt() &&
               ftp["portnum"].asInt() <= range->last) {
        errors.push_back(
            {"/ftp/custom_port", "a range without the control port " + ftp["portnum"].asString()});
    }
}

void checkAddress(const Json::Value& ftp, Errors& errors) {
    const std::string address = ftp["ext_ip"].isString() ? ftp["ext_ip"].asString() : "";
    const auto parsed = parseIPv4(address);
    if (!address.empty() && !parsed) {
        errors.push_back({"/ftp/ext_ip", "an IPv4 address such as 192.0.2.1, or an empty text"});
    } else if (const char* const kind = parsed ? unreachableKindOf(*parsed) : nullptr) {
        errors.push_back(
            {"/ftp/ext_ip", std::string("an address at which clients reach this server, not ") + kind});
    }
}

/// What no single setting shows.
void checkFtp(const Json::Value& wanted, const Json::Value& current, Errors& errors) {
    const auto differs = [&](const char* key) { return wanted[key] != current[key]; };
    if (differs("custom_port_range") || differs("custom_port") || differs("portnum")) {
        checkPassiveRange(wanted, current, errors);
    }
    if (differs("ext_ip")) {
        checkAddress(wanted, errors);
    }
}

void checkSecurity(const Json::Value& wanted, Errors& errors) {
    if (wanted["anonymous_chroot"] == true && wanted["anonymous_chroot_share"].asString().empty()) {
        errors.push_back({"/security/anonymous_chroot_share", "the name of a share, for anonymous_chroot"});
    }
}

void checkPorts(const Json::Value& wanted, const Json::Value& current, Errors& errors) {
    const Json::Value& ftp = wanted[schema::ftp.name];
    const Json::Value& sftp = wanted[schema::sftp.name];
    if (!ftp.isObject() || !sftp.isObject() || !sftp["portnum"].isInt()) {
        return;
    }
    const bool both = sftp["enable"] == true && (ftp["enable_ftp"] == true || ftp["enable_ftps"] == true);
    if (both && ftp["portnum"] == sftp["portnum"]) {
        const bool ftpMoves = ftp["portnum"] != current[schema::ftp.name]["portnum"];
        errors.push_back(ftpMoves ? FieldError{"/ftp/portnum", "another port than SFTP's"}
                                  : FieldError{"/sftp/portnum", "another port than FTP's"});
    }
}

std::string namesOf(const std::vector<const Setting*>& settings) {
    std::string names;
    for (const Setting* setting : settings) {
        names += (names.empty() ? "" : ", ") + std::string(setting->key);
    }
    return names;
}

void checkSection(const schema::SettingGroup& group, const Json::Value& wanted, const Json::Value& current,
                  Errors& errors) {
    if (!wanted.isObject()) {
        errors.push_back({std::string("/") + group.name, "an object"});
        return;
    }
    const auto settings = documentSettings(group);
    for (const Setting* setting : settings) {
        const Json::Value& value = wanted[setting->key];
        const bool unchanged = wanted.isMember(setting->key) && value == current[setting->key];
        if (!unchanged && (!hasType(value, setting->type) || !isInRange(*setting, value))) {
            errors.push_back({pointer(group.name, setting->key), expectationFor(*setting, value)});
        }
    }
    for (const std::string& key : wanted.getMemberNames()) {
        if (std::ranges::find(settings, key, [](const Setting* each) { return each->key; }) ==
            settings.end()) {
            errors.push_back({pointer(group.name, key), "one of the settings " + namesOf(settings)});
        }
    }
}

std::optional<FieldError> faultOfRule(const Json::Value& rule, const std::string& place) {
    if (!rule.isObject()) {
        return FieldError{place, "an object with type, name and path"};
    }
    for (const std::string& key : rule.getMemberNames()) {
        if (key != "type" && key != "name" && key != "path") {
            return FieldError{place + "/" + pointerToken(key), "only type, name and path"};
        }
    }
    const auto text = [&](const char* key) { return rule[key].isString() ? rule[key].asString() : ""; };
    if (text("type") != "user" && text("type") != "group") {
        return FieldError{place + "/type", "\"user\" or \"group\""};
    }
    if (text("name").empty()) {
        return FieldError{place + "/name", "the name of a user or group"};
    }
    if (!text("path").starts_with('/')) {
        return FieldError{place + "/path", "/home, /SHARE or /SHARE/FOLDER"};
    }
    return std::nullopt;
}

void checkRules(const Json::Value& rules, Errors& errors) {
    const std::string section = "/" + std::string(rulesSection);
    if (!rules.isArray()) {
        errors.push_back({section, "a list"});
        return;
    }
    std::set<std::pair<std::string, std::string>> owners;
    for (Json::ArrayIndex i = 0; i < rules.size(); ++i) {
        const std::string place = section + "/" + std::to_string(i);
        if (auto fault = faultOfRule(rules[i], place)) {
            errors.push_back(std::move(*fault));
        } else if (!owners.emplace(rules[i]["type"].asString(), rules[i]["name"].asString()).second) {
            const std::string type = rules[i]["type"].asString();
            errors.push_back({place + "/name", "one rule for each " + type + ", not a second one for " +
                                                   rules[i]["name"].asString() +
                                                   ": remove the first, or change its path"});
        }
    }
}

std::string sectionNames(const Json::Value& document) {
    std::string names;
    for (const std::string& name : document.getMemberNames()) {
        names += (names.empty() ? "" : ", ") + name;
    }
    return names;
}

void checkTop(const Json::Value& wanted, const Json::Value& current, Errors& errors) {
    for (const std::string& name : wanted.getMemberNames()) {
        if (!current.isMember(name)) {
            errors.push_back({"/" + pointerToken(name), "one of the sections " + sectionNames(current)});
        }
    }
    for (const char* const name : {"format", "format_version"}) {
        if (wanted[name] != current[name]) {
            errors.push_back({std::string("/") + name, toJson(current[name])});
        }
    }
}

} // namespace

Json::Value patched(const Json::Value& document, const Json::Value& patch) {
    Json::Value result = document;
    for (const std::string& name : patch.getMemberNames()) {
        const auto* const group = std::ranges::find(schema::groups, name, &schema::SettingGroup::name);
        if (group != std::end(schema::groups)) {
            patchSection(**group, patch[name], result[name]);
        } else if (name == rulesSection && patch[name].isNull()) {
            result[name] = Json::arrayValue;
        } else {
            result[name] = patch[name];
        }
    }
    return result;
}

std::vector<FieldError> checkSettings(const Json::Value& wanted, const Json::Value& current) {
    Errors errors;
    checkTop(wanted, current, errors);
    for (const schema::SettingGroup* group : schema::groups) {
        if (current.isMember(group->name)) {
            checkSection(*group, wanted[group->name], current[group->name], errors);
        }
    }
    const std::string rules(rulesSection);
    if (current.isMember(rules) && wanted[rules] != current[rules]) {
        checkRules(wanted[rules], errors);
    }
    if (errors.empty() && current.isMember(schema::ftp.name)) {
        checkFtp(wanted[schema::ftp.name], current[schema::ftp.name], errors);
        checkPorts(wanted, current, errors);
    }
    if (errors.empty() && wanted[schema::security.name] != current[schema::security.name]) {
        checkSecurity(wanted[schema::security.name], errors);
    }
    return errors;
}

} // namespace velt::host
