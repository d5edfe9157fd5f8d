#include "tests/system/support/setting_table.h"

#include "schema/settings_table.h"

namespace velt::test {
namespace {

std::string wordFor(const Json::Value& value) {
    if (value.isBool()) {
        return value.asBool() ? "on" : "off";
    }
    return value.asString();
}

std::vector<std::string> versionWords(const SettingCase& setting) {
    return setting.group == "ftp" ? std::vector<std::string>{"--api-version", std::to_string(setting.version)}
                                  : std::vector<std::string>{};
}

} // namespace

void SettingTable::check(const std::vector<SettingCase>& cases) const {
    for (const SettingCase& setting : cases) {
        const testing::ScopedTrace trace(__FILE__, __LINE__, setting.group + " " + setting.key);
        if (!setting.before.empty()) {
            Words words{setting.group, "set"};
            words.insert(words.end(), setting.before.begin(), setting.before.end());
            done(words);
        }
        checkOne(setting);
    }
}

void SettingTable::checkOne(const SettingCase& setting) const {
    const auto expect = [&](const Json::Value& value) {
        expectValue(setting, value);
        setting.prove(value);
    };
    setByVeltctl(setting, setting.one);
    expect(setting.one);
    setByCurl(setting, setting.other);
    expect(setting.other);
}

void SettingTable::setByVeltctl(const SettingCase& setting, const Json::Value& value) const {
    if (setting.group == "ftp" && setting.version != schema::ftp.newestApiVersion) {
        setByCurl(setting, value); // the command line sets the newest version's settings only
        return;
    }
    const ProcessResult result = veltctl({setting.group, "set", setting.key + "=" + wordFor(value)});
    EXPECT_EQ(result.exitCode, 0) << result.errors;
    EXPECT_EQ(result.errors, "");
}

void SettingTable::setByCurl(const SettingCase& setting, const Json::Value& value) const {
    Json::Value body = jsonOf(setting.along.empty() ? "{}" : setting.along);
    body[setting.key] = value;
    // The switches of the services have to be there, as they are.
    const Json::Value current = curl(pathOf(setting) + "get").json;
    for (const char* name : {"enable_ftp", "enable_ftps", "enable"}) {
        if (current.isMember(name) && !body.isMember(name)) {
            body[name] = current[name];
        }
    }
    const HttpResult result = curl(pathOf(setting) + "set", textOf(body));
    EXPECT_EQ(result.status, 204) << result.body;
}

void SettingTable::expectValue(const SettingCase& setting, const Json::Value& value) const {
    EXPECT_EQ(curl(pathOf(setting) + "get").json[setting.key], value);
    Words words{setting.group, "get", "--json"};
    const Words version = versionWords(setting);
    words.insert(words.end(), version.begin(), version.end());
    EXPECT_EQ(jsonOf(done(words))[setting.key], value);
}

std::string SettingTable::pathOf(const SettingCase& setting) const {
    if (setting.group == "security") {
        return securityApi;
    }
    if (setting.group == "sftp") {
        return sftpApi;
    }
    return "/api/VELT.Core.FileServ.FTP/v" + std::to_string(setting.version) + "/";
}

} // namespace velt::test
