// The table of the settings, the description of the API and the module say the same.
#include "host/api/json_schema.h"
#include "host/base/json.h"
#include "schema/setting_text.h"
#include "tests/host/fake_standalone.h"
#include "tests/host/host_test.h"
#include "tests/support/fake_platform/fake_platform.h"

#include <set>

namespace {

namespace schema = velt::schema;
using schema::Setting;
using schema::SettingType;

/// The bounds that the server holds a number to; where it accepts more, also what is meant.
void addBounds(const Setting& setting, Json::Value& facts) {
    if (setting.outOfRange != schema::OutOfRange::accepted) {
        facts["minimum"] = Json::Int64(setting.least);
    }
    if (setting.outOfRange == schema::OutOfRange::refused) {
        facts["maximum"] = Json::Int64(setting.most);
    } else {
        facts["format"] = "int32";
        facts["x-expected"] = schema::rangeText(setting);
    }
}

/// What the description has to say of the setting.
Json::Value describe(const Setting& setting) {
    Json::Value facts;
    facts["description"] =
        setting.unit == nullptr ? setting.meaning : std::string(setting.meaning) + " (" + setting.unit + ")";
    switch (setting.type) {
    case SettingType::boolean:
        facts["type"] = "boolean";
        facts["default"] = setting.number != 0;
        break;
    case SettingType::number:
        facts["type"] = "integer";
        facts["default"] = Json::Int64(setting.number);
        addBounds(setting, facts);
        break;
    case SettingType::text:
        facts["type"] = "string";
        facts["default"] = setting.text;
        facts["x-expected"] = setting.form;
        break;
    }
    return facts;
}

bool hasType(const Json::Value& value, SettingType type) {
    return type == SettingType::boolean  ? value.isBool()
           : type == SettingType::number ? value.isInt()
                                         : value.isString();
}

class SettingsTableTest : public HostTest {
protected:
    void SetUp() override {
        platform.reset();
        FakeStandalone::instance() = {};
        settings.workers = 1;
        start();
        document = get("/openapi.json").json();
    }

    static std::vector<Setting> servedBy(const schema::SettingGroup& group, int version) {
        std::vector<Setting> served;
        for (const Setting& setting : group.settings) {
            if (setting.key != nullptr && (setting.apiVersion == 0 || setting.apiVersion == version)) {
                served.push_back(setting);
            }
        }
        return served;
    }

    /// The description of the method's parameters, or of its answer.
    Json::Value described(const std::string& path, bool answer) const {
        const Json::Value post = velt::host::flatSchema(document, document["paths"][path]["post"]);
        return (answer ? post["responses"]["200"]
                       : post["requestBody"])["content"]["application/json"]["schema"];
    }

    void expectDescribed(const std::vector<Setting>& served, const Json::Value& properties) const {
        EXPECT_EQ(properties.size(), served.size());
        for (const Setting& setting : served) {
            Json::Value facts = properties[setting.key];
            for (const char* ofOneMethod : {"minLength", "pattern"}) {
                facts.removeMember(ofOneMethod);
            }
            EXPECT_EQ(facts, describe(setting)) << setting.key;
        }
    }

    /// The module answers with these settings and no others, and takes and refuses values by their types.
    void expectTypes(const std::vector<Setting>& served, const std::string& path) {
        const Json::Value current = post(path + "get").json();
        EXPECT_EQ(current.size(), served.size()) << path;
        Json::Value switches(Json::objectValue);
        for (const Setting& setting : served) {
            EXPECT_TRUE(hasType(current[setting.key], setting.type)) << setting.key;
            if (setting.service != nullptr) {
                switches[setting.key] = current[setting.key];
            }
        }
        for (const Setting& setting : served) {
            Json::Value parameters = switches;
            parameters[setting.key] = describe(setting)["default"];
            const bool isEmpty = setting.type == SettingType::text && *setting.text == '\0';
            if (!isEmpty) { // the external address may not be
                EXPECT_NE(post(path + "set", velt::host::toJson(parameters)).status, 422) << setting.key;
            }
            parameters[setting.key] = Json::arrayValue;
            const Answer refusal = post(path + "set", velt::host::toJson(parameters));
            EXPECT_EQ(refusal.status, 422) << setting.key;
            EXPECT_EQ(refusal.json()["errors"][0]["field"], setting.key) << refusal.body;
        }
    }

    fake::Platform& platform = fake::Platform::instance();
    Json::Value document;
};

TEST_F(SettingsTableTest, SaysWhatTheDescriptionAndTheModuleSay) {
    for (const schema::SettingGroup& group : {schema::ftp, schema::security, schema::sftp}) {
        for (int version = 1; version <= group.newestApiVersion; ++version) {
            const std::string path = std::string("/api/") + group.api + "/v" + std::to_string(version) + "/";
            const std::vector<Setting> served = servedBy(group, version);
            expectDescribed(served, described(path + "get", true)["properties"]);
            expectDescribed(served, described(path + "set", false)["properties"]);
            expectTypes(served, path);
        }
        EXPECT_FALSE(document["paths"].isMember(std::string("/api/") + group.api + "/v" +
                                                std::to_string(group.newestApiVersion + 1) + "/get"));
    }
}

} // namespace
