#include "cli/setting.h"

#include "cli/failure.h"

#include <algorithm>
#include <charconv>
#include <optional>

namespace velt::cli {

namespace {

constexpr SettingType boolean = SettingType::boolean;
constexpr SettingType integer = SettingType::integer;
constexpr SettingType text = SettingType::text;

std::string lowerCase(std::string word) {
    std::transform(word.begin(), word.end(), word.begin(),
                   [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; });
    return word;
}

std::optional<Json::Value> parseBoolean(const std::string& word) {
    const std::string lower = lowerCase(word);
    if (lower == "true" || lower == "on" || lower == "yes") {
        return Json::Value(true);
    }
    if (lower == "false" || lower == "off" || lower == "no") {
        return Json::Value(false);
    }
    return std::nullopt;
}

std::optional<Json::Value> parseInteger(const std::string& word) {
    int number = 0;
    const char* const end = word.data() + word.size();
    const auto [rest, error] = std::from_chars(word.data(), end, number);
    if (error != std::errc() || rest != end) {
        return std::nullopt;
    }
    return Json::Value(number);
}

std::optional<Json::Value> parseValue(const std::string& word, SettingType type) {
    switch (type) {
    case SettingType::boolean:
        return parseBoolean(word);
    case SettingType::integer:
        return parseInteger(word);
    case SettingType::text:
        break;
    }
    return Json::Value(word);
}

Setting utf8Setting(int version) {
    switch (version) {
    case 1:
        return {"enable_utf8", boolean, "UTF-8 is supported"};
    case 2:
        return {"use_utf8", boolean, "UTF-8 is used"};
    default:
        return {"utf8_mode", integer, "0: no UTF-8, 1: supported, 2: supported and used"};
    }
}

// A passive range without the switch, and the switch without a range, are refused or passed over by the
// server.
void completePassiveRange(Json::Value& change, const Json::Value& current) {
    if (change.isMember("custom_port") && !change.isMember("custom_port_range")) {
        change["custom_port_range"] = true;
    }
    const bool ranged = change.isMember("custom_port_range") && change["custom_port_range"] == true;
    if (ranged && !change.isMember("custom_port")) {
        change["custom_port"] = current["custom_port"];
    }
}

} // namespace

const Setting* SettingGroup::find(const std::string& key) const {
    const auto found = std::find_if(settings.begin(), settings.end(),
                                    [&](const Setting& setting) { return key == setting.key; });
    return found == settings.end() ? nullptr : &*found;
}

std::string SettingGroup::keys() const {
    std::string list;
    for (const Setting& setting : settings) {
        list += (list.empty() ? "" : ", ") + std::string(setting.key);
    }
    return list;
}

SettingGroup ftpSettings(int version) {
    return {"ftp",
            ftpApi,
            version,
            {{"enable_ftp", boolean, "plain FTP runs", "ftp"},
             {"enable_ftps", boolean, "FTP over TLS runs", "ftps"},
             {"timeout", integer, "seconds after which an idle connection ends"},
             {"portnum", integer, "control port"},
             {"custom_port_range", boolean, "the passive range is custom_port, not the default"},
             {"custom_port", text, "passive port range, FIRST:LAST"},
             {"use_ext_ip", boolean, "announce ext_ip in passive mode"},
             {"ext_ip", text, "address to announce in passive mode"},
             utf8Setting(version),
             {"enable_fxp", boolean, "transfers between two servers"},
             {"enable_ascii", boolean, "ASCII mode"},
             {"enable_fips", boolean, "only cryptography approved by FIPS"},
             {"enable_flow_ctrl", boolean, "the two bandwidth limits apply"},
             {"maxuploadrate", integer, "upload limit in KB/s"},
             {"maxdownloadrate", integer, "download limit in KB/s"},
             {"max_conn_per_ip", integer, "connections per client address"}}};
}

SettingGroup securitySettings() {
    return {"security",
            securityApi,
            1,
            {{"user_chroot", boolean, "users are confined to their home folders"},
             {"anonymous", boolean, "anonymous login"},
             {"anonymous_chroot", boolean, "anonymous users are confined to one share"},
             {"anonymous_chroot_share", text, "the share that anonymous users are confined to"},
             {"enable_umask", boolean, "the umask applies to new files"}}};
}

SettingGroup sftpSettings() {
    return {"sftp", sftpApi, 1, {{"enable", boolean, "SFTP runs", "sftp"}, {"portnum", integer, "port"}}};
}

const char* describe(SettingType type) {
    switch (type) {
    case SettingType::boolean:
        return "on or off";
    case SettingType::integer:
        return "a whole number";
    case SettingType::text:
        break;
    }
    return "a text";
}

bool hasType(const Json::Value& value, SettingType type) {
    switch (type) {
    case SettingType::boolean:
        return value.isBool();
    case SettingType::integer:
        return value.isInt();
    case SettingType::text:
        break;
    }
    return value.isString();
}

Json::Value parseAssignments(const SettingGroup& group, const std::vector<std::string>& words) {
    Json::Value result(Json::objectValue);
    for (const std::string& word : words) {
        const std::size_t equals = word.find('=');
        if (equals == std::string::npos) {
            throw Failure(ExitCode::usage, "\"" + word + "\" is not of the form key=value.",
                          std::string("Known keys: ") + group.keys() + ".");
        }
        const std::string key = word.substr(0, equals);
        const Setting* setting = group.find(key);
        if (setting == nullptr) {
            throw Failure(ExitCode::usage, "\"" + key + "\" is no setting of " + group.command + ".",
                          std::string("Known keys: ") + group.keys() + ".");
        }
        if (result.isMember(key)) {
            throw Failure(ExitCode::usage, "\"" + key + "\" is given twice.", "Give each key once.");
        }
        const std::optional<Json::Value> value = parseValue(word.substr(equals + 1), setting->type);
        if (!value) {
            throw Failure(ExitCode::usage, "\"" + word.substr(equals + 1) + "\" is no value for " + key + ".",
                          "Give " + std::string(describe(setting->type)) + ".");
        }
        if (key == "custom_port" && value->asString().empty()) {
            throw Failure(ExitCode::usage, "custom_port cannot be empty.",
                          "Give FIRST:LAST, or custom_port_range=off for the default range.");
        }
        result[key] = *value;
    }
    return result;
}

Json::Value completeChange(const SettingGroup& group, const Json::Value& wanted, const Json::Value& current) {
    Json::Value change = wanted;
    for (const Setting& setting : group.settings) {
        if (setting.service != nullptr && !change.isMember(setting.key)) {
            change[setting.key] = current[setting.key];
        }
    }
    if (group.find("custom_port") != nullptr) {
        completePassiveRange(change, current);
    }
    // The server takes no empty address, but one that is blank it keeps as none.
    if (change.isMember("ext_ip") && change["ext_ip"].asString().empty()) {
        change["ext_ip"] = " ";
    }
    return change;
}

} // namespace velt::cli
