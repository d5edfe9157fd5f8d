// The description of the API against the module's table, its decisions and its answers.

#include "host/api/json_schema.h"
#include "host/api/openapi.h"
#include "host/base/json.h"
#include "tests/host/fake_standalone.h"
#include "tests/host/host_test.h"
#include "tests/support/fake_platform/fake_platform.h"

#include <valijson/adapters/jsoncpp_adapter.hpp>
#include <valijson/schema.hpp>
#include <valijson/schema_parser.hpp>
#include <valijson/validator.hpp>

#include <algorithm>
#include <cctype>
#include <set>

namespace {

using valijson::adapters::JsonCppAdapter;

const std::string ftp = "VELT.Core.FileServ.FTP";

/// Why the value is not as the schema says; "" when it is.
std::string violation(const Json::Value& schema, const Json::Value& value) {
    valijson::Schema compiled;
    valijson::SchemaParser().populateSchema(JsonCppAdapter(velt::host::withBounds(schema)), compiled);
    valijson::Validator validator(valijson::Validator::kStrongTypes);
    valijson::ValidationResults results;
    validator.validate(compiled, JsonCppAdapter(value), &results);
    std::string text;
    for (const auto& error : results) {
        text += error.context.back() + ": " + error.description + "\n";
    }
    return text;
}

class OpenApiTest : public HostTest {
protected:
    void SetUp() override {
        platform.reset();
        FakeStandalone::instance() = {};
        settings.workers = 1;
        start();
        document = get("/openapi.json").json();
    }

    static std::string pathOf(const velt::host::Row& row) {
        return "/api/" + row.api + "/v" + std::to_string(row.version) + "/" + row.method;
    }

    Json::Value answerSchema(const std::string& path, const char* method = "post") const {
        return resolved(
            document["paths"][path][method]["responses"]["200"]["content"]["application/json"]["schema"]);
    }

    Json::Value bodySchema(const std::string& path) const {
        return resolved(
            document["paths"][path]["post"]["requestBody"])["content"]["application/json"]["schema"];
    }

    /// What the schema says of each property, and that of the schemas that it consists of.
    static Json::Value propertiesOf(const Json::Value& schema) {
        Json::Value properties(Json::objectValue);
        for (const Json::Value& part : schema["allOf"]) {
            addFacts(propertiesOf(part), properties);
        }
        addFacts(schema["properties"], properties);
        return properties;
    }

    static std::set<std::string> requiredOf(const Json::Value& schema) {
        std::set<std::string> names;
        for (const Json::Value& part : schema["allOf"]) {
            names.merge(requiredOf(part));
        }
        for (const Json::Value& name : schema["required"]) {
            names.insert(name.asString());
        }
        return names;
    }

    /// The schema with those that it refers to in their places.
    Json::Value resolved(const Json::Value& schema) const {
        if (schema.isObject() && schema.isMember("$ref")) {
            std::string path = schema["$ref"].asString().substr(1);
            std::replace(path.begin(), path.end(), '/', '.');
            const Json::Path place(path);
            const Json::Value& target = place.resolve(document);
            EXPECT_TRUE(target.isObject()) << path;
            return resolved(target);
        }
        Json::Value copy = schema;
        for (Json::Value& each : copy) {
            each = resolved(each);
        }
        return copy;
    }

    static void addFacts(const Json::Value& more, Json::Value& properties) {
        for (const std::string& name : more.getMemberNames()) {
            for (const std::string& fact : more[name].getMemberNames()) {
                properties[name][fact] = more[name][fact];
            }
        }
    }

    /// Whether the value is a number that the module takes, though no service does.
    static bool isOutOfRange(const Json::Value& value, const Json::Value& property) {
        return value.isInt() &&
               ((property.isMember("minimum") && value.asInt() < property["minimum"].asInt()) ||
                (property.isMember("maximum") && value.asInt() > property["maximum"].asInt()));
    }

    struct Operation {
        std::string method;
        std::string path;
        Json::Value responses;
        bool isForEverybody = false; ///< who shows no token is answered, too
    };

    std::vector<Operation> operations() const {
        std::vector<Operation> all;
        for (const std::string& path : document["paths"].getMemberNames()) {
            for (const std::string& method : document["paths"][path].getMemberNames()) {
                std::string upper = method;
                std::ranges::transform(upper, upper.begin(),
                                       [](unsigned char c) { return static_cast<char>(std::toupper(c)); });
                const Json::Value& operation = document["paths"][path][method];
                const bool isForEverybody = operation.isMember("security");
                all.push_back({upper, path, operation["responses"], isForEverybody});
            }
        }
        return all;
    }

    /// That the host gave the wanted answer, and that the description tells of it.
    static void expectDescribed(const Operation& operation, int status, int wanted) {
        EXPECT_EQ(status, wanted) << operation.method << " " << operation.path;
        EXPECT_TRUE(operation.responses.isMember(std::to_string(wanted)))
            << operation.method << " " << operation.path << " " << wanted;
    }

    /// Every value that a parameter is tried with, right and wrong.
    static std::vector<Json::Value> values() {
        std::vector<Json::Value> all;
        for (const char* text :
             {"null", "true", "false", "0", "1", "2", "3", "-1", "65535", "65536", "2147483648", "1.5",
              "\"\"", "\"x\"", "\"50000:50010\"", "[]", "[\"bob\"]", "[1]", "{}"}) {
            all.push_back((*velt::host::parseObject(R"({"v":)" + std::string(text) + "}"))["v"]);
        }
        return all;
    }

    fake::Platform& platform = fake::Platform::instance();
    Json::Value document;
};

TEST_F(OpenApiTest, EveryRowIsOnePathAndNoOther) {
    std::set<std::string> rows;
    for (const auto* row : table->rows()) {
        const std::string path = pathOf(*row);
        rows.insert(path);
        const Json::Value& item = document["paths"][path];
        EXPECT_TRUE(item["post"].isObject()) << path;
        EXPECT_EQ(item["get"].isObject(), row->callableByGet()) << path;
    }
    for (const std::string& path : document["paths"].getMemberNames()) {
        if (path.find("/v") != std::string::npos) {
            EXPECT_TRUE(rows.contains(path)) << path;
        }
    }
}

TEST_F(OpenApiTest, EveryOtherPathIsServedAsDescribed) {
    velt::LogEntry entry;
    entry.event = 0x11B00012;
    FakeStandalone::instance().log = {entry};
    FakeStandalone::instance().down = {{"ftp", "No luck.", false, "FTP"}};
    for (const std::string& path : document["paths"].getMemberNames()) {
        if (path.find("/v") != std::string::npos || path == "/events") {
            continue;
        }
        for (const std::string& method : document["paths"][path].getMemberNames()) {
            std::string upper = method;
            std::transform(upper.begin(), upper.end(), upper.begin(),
                           [](unsigned char c) { return static_cast<char>(std::toupper(c)); });
            const Answer answer = ask(upper, path, admin);
            const std::string status = std::to_string(answer.status);
            EXPECT_TRUE(document["paths"][path][method]["responses"].isMember(status))
                << upper << " " << path << " " << status;
            if (answer.status == 200 && path != "/metrics" && path != "/openapi.json") {
                EXPECT_EQ(violation(answerSchema(path, method.c_str()), answer.json()), "") << path;
            }
        }
    }
}

/// What any request may get, whatever it asks for.
// A new operation is for administrators unless it is in this list.
TEST_F(OpenApiTest, AViewerIsRefusedWhateverMayChangeSomething) {
    std::set<std::string> allowed;
    for (const Operation& each : operations()) {
        const int status = ask(each.method, each.path, viewer).status;
        if (each.method != "GET" && status != 403) {
            allowed.insert(each.method + " " + each.path);
        }
    }
    const std::string rows = "POST /api/VELT.Core.FileServ.FTP";
    EXPECT_EQ(allowed, (std::set<std::string>{
                           "POST /api/diff", rows + "/v1/get", rows + "/v2/get", rows + "/v3/get",
                           rows + ".ChrootUser/v1/list", rows + ".ChrootUser/v2/load", rows + ".SFTP/v1/get",
                           rows + ".Security/v1/get", rows + ".Security/v1/list_ftp_share"}));
}

TEST_F(OpenApiTest, EveryOperationTellsOfRefusalsThatComeBeforeIt) {
    const std::string manyBytes = "Content-Length: 2000000\r\n";
    for (const Operation& each : operations()) {
        const std::string token = each.isForEverybody ? "Authorization: Bearer wrong\r\n" : "";
        expectDescribed(each, ask(each.method, each.path, token).status, 401);
        expectDescribed(each, ask(each.method, each.path, admin + "Origin: http://elsewhere\r\n").status,
                        403);
        expectDescribed(each, ask(each.method, each.path, admin + manyBytes).status, 413);
        const std::string pad = "X-Pad: " + std::string(limits.head, 'a') + "\r\n";
        expectDescribed(each, ask(each.method, each.path, admin + pad).status, 431);
        expectDescribed(
            each, connect().ask(each.method + " " + each.path + " HTTP/1.1\r\n" + admin + "\r\n").status,
            400);
        EXPECT_TRUE(each.responses.isMember("503")) << each.path;
    }
    const auto anHour = std::chrono::system_clock::now() + std::chrono::hours(1);
    FakeStandalone::instance().setBans({{velt::parseIpNetwork("127.0.0.1").value(), anHour, "sftp", 10}});
    for (const Operation& each : operations()) {
        expectDescribed(each, ask(each.method, each.path, admin).status, 429);
    }
}

TEST_F(OpenApiTest, EveryOperationTellsOfBodiesThatDoNotArrive) {
    stop();
    limits.bodyTime = std::chrono::milliseconds(200);
    start();
    const std::vector<Operation> all = operations();
    std::vector<Client> clients;
    for (const Operation& each : all) {
        clients.push_back(connect());
        clients.back().send(requestText(each.method, each.path, admin + "Content-Length: 10\r\n"));
    }
    for (std::size_t i = 0; i < all.size(); ++i) {
        expectDescribed(all[i], clients[i].receive().status, 408);
    }
}

TEST_F(OpenApiTest, RealAnswersAreAsDescribed) {
    platform.shares["public"] = {"", "/", 1};
    platform.ftpShares = {"public"};
    platform.users["bob"] = {"Bob", 1000};
    platform.chrootUsers = {"bob"};
    platform.rules = {"user:1000:/public"};
    const std::map<std::string, std::string> parameters{{"list", R"({"chroot":true})"},
                                                        {"add", R"({"id":["eve"]})"}};
    int answers = 0;
    for (const auto* row : table->rows()) {
        const std::string path = pathOf(*row);
        const Json::Value schema = answerSchema(path);
        const auto given = parameters.find(row->method);
        if (!row->reads() && given == parameters.end()) {
            EXPECT_TRUE(document["paths"][path]["post"]["responses"].isMember("204")) << path;
            continue;
        }
        const Answer answer = post(path, given == parameters.end() ? "" : given->second);
        EXPECT_EQ(answer.status, 200) << path;
        EXPECT_EQ(violation(schema, answer.json()), "") << path;
        for (const std::string& name : answer.json().getMemberNames()) {
            EXPECT_TRUE(propertiesOf(schema).isMember(name)) << path << " " << name;
        }
        ++answers;
    }
    EXPECT_EQ(answers, 9);
}

TEST_F(OpenApiTest, AnAnswerWithAnotherVersionsKeyWouldBeNoticed) {
    const Json::Value second = post("/api/" + ftp + "/v2/get").json();
    EXPECT_EQ(violation(answerSchema("/api/" + ftp + "/v2/get"), second), "");
    EXPECT_NE(violation(answerSchema("/api/" + ftp + "/v1/get"), second), "");
    EXPECT_NE(violation(answerSchema("/api/" + ftp + "/v3/get"), second), "");
}

TEST_F(OpenApiTest, ProblemsAreAsDescribed) {
    const Json::Value schema = resolved(document["components"]["schemas"]["Problem"]);
    FakeStandalone::instance().commitFails = true;
    EXPECT_EQ(violation(schema, post("/api/" + ftp + ".SFTP/v1/set", R"({"enable":true})").json()), "");
    EXPECT_EQ(violation(schema, ask("PATCH", "/api/settings", admin, R"({"ftp":{"timeout":"x"}})").json()),
              "");
    EXPECT_EQ(violation(schema, get("/api/log?limit=x").json()), "");
    EXPECT_EQ(violation(schema, get("/nowhere").json()), "");
    EXPECT_EQ(violation(schema, post("/api/" + ftp + "/v3/set", "{}").json()), "");
    EXPECT_EQ(violation(schema, ask("GET", "/api").json()), "");
}

/// Where the module says 1901, the description says what is wrong; where it accepts, the description does
/// too, but for numbers out of a range that the services have.
TEST_F(OpenApiTest, TheDescriptionAgreesWithTheModuleOnEveryParameter) {
    const std::map<std::string, std::string> required{{"set", R"({"enable_ftp":true,"enable_ftps":true})"},
                                                      {"list", R"({"chroot":true})"}};
    const velt::host::OpenApi description;
    int refused = 0;
    int accepted = 0;
    for (const auto* row : table->rows()) {
        const std::string path = pathOf(*row);
        const Json::Value properties = propertiesOf(bodySchema(path));
        Json::Value base(Json::objectValue);
        if (row->method == "set" && row->api == ftp) {
            base = *velt::host::parseObject(required.at("set"));
        } else if (row->method == "list") {
            base = *velt::host::parseObject(required.at("list"));
        } else if (row->api == ftp + ".SFTP" && row->method == "set") {
            base["enable"] = true;
        }
        for (const std::string& name : properties.getMemberNames()) {
            for (const Json::Value& value : values()) {
                Json::Value parameters = base;
                parameters[name] = value;
                platform.reset();
                const Answer answer = post(path, velt::host::toJson(parameters));
                const bool says = answer.status == 422;
                (says ? refused : accepted) += 1;
                if (row->method == "save") {
                    // Rules that are no list the module takes for none: the description says so in words.
                    const bool holdsOthers = value.isArray() && !value.empty() && !value[0].isObject();
                    EXPECT_EQ(says, holdsOthers) << velt::host::toJson(parameters) << " " << answer.body;
                } else if (!says && isOutOfRange(value, properties[name])) {
                    EXPECT_EQ(description.explain(*row, parameters).size(), 1U) << path << name;
                } else if (answer.status != 500) {
                    EXPECT_EQ(says, !description.explain(*row, parameters).empty())
                        << path << " " << velt::host::toJson(parameters) << " " << answer.body;
                }
                if (says) {
                    EXPECT_GT(answer.json()["errors"].size(), 0U) << path << answer.body;
                }
            }
        }
    }
    EXPECT_GT(refused, 300);
    EXPECT_GT(accepted, 100);
}

TEST_F(OpenApiTest, EachRequiredKeyIsRequired) {
    for (const auto* row : table->rows()) {
        const std::string path = pathOf(*row);
        const std::set<std::string> required = requiredOf(bodySchema(path));
        const Answer answer = post(path, "{}");
        EXPECT_EQ(answer.status == 422, !required.empty()) << path;
        if (answer.status == 422) {
            EXPECT_EQ(answer.json()["errors"].size(), required.size()) << path << answer.body;
        }
    }
}

} // namespace
