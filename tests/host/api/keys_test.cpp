// The keys of users over the API.

#include "standalone/core/error_number.h"
#include "tests/host/fake_standalone.h"
#include "tests/host/host_test.h"
#include "tests/standalone/support/example_keys.h"
#include "tests/support/fake_platform/fake_platform.h"

namespace {

using velt::test::aFingerprint;
using velt::test::aKey;
using velt::test::anotherKey;

const std::string ofAnna = "/api/keys/anna/SHA256%3A";

class HostKeys : public HostTest {
protected:
    void SetUp() override {
        fake::Platform::instance().reset();
        FakeStandalone::instance() = {};
        start();
    }

    static std::string body(const std::string& user, const std::string& key) {
        Json::Value value;
        value["user"] = user;
        value["key"] = key;
        return value.toStyledString();
    }

    static std::string path() {
        std::string encoded;
        for (const char letter : aFingerprint.substr(7)) {
            encoded += letter == '/' ? "%2F" : letter == '+' ? "%2B" : std::string(1, letter);
        }
        return ofAnna + encoded;
    }

    static std::vector<velt::StoredKey>& keys() { return FakeStandalone::instance().keys; }
};

TEST_F(HostKeys, AreAddedListedAndRemoved) {
    const Answer added =
        post("/api/keys", body("anna", "from=\"192.0.2.1\",expiry-time=\"21001231Z\" " + aKey + " desk\n"));
    ASSERT_EQ(added.status, 201) << added.body;
    const Json::Value key = added.json();
    EXPECT_EQ(key["user"], "anna");
    EXPECT_EQ(key["fingerprint"], aFingerprint);
    EXPECT_EQ(key["type"], "ssh-ed25519");
    EXPECT_EQ(key["bits"], 256);
    EXPECT_EQ(key["comment"], "desk");
    EXPECT_EQ(key["from"], "192.0.2.1");
    EXPECT_EQ(key["expires"], "2100-12-31T00:00:00.000Z");
    EXPECT_EQ(key["state"], "active");
    EXPECT_EQ(key["by"], "admin");
    EXPECT_EQ(ask("GET", "/api/keys", viewer).json()["keys"][0], key);
    EXPECT_EQ(get("/api/keys?user=anna").json()["keys"].size(), 1U);
    EXPECT_EQ(get("/api/keys?user=ben").json()["keys"].size(), 0U);
    EXPECT_EQ(ask("DELETE", path(), admin).status, 204);
    EXPECT_EQ(get("/api/keys").json()["keys"].size(), 0U);
    EXPECT_EQ(ask("DELETE", path(), admin).status, 404);
}

TEST_F(HostKeys, AreWrittenDownWithWhoDidIt) {
    ASSERT_EQ(post("/api/keys", body("anna", aKey + " desk")).status, 201);
    ASSERT_EQ(ask("DELETE", path(), admin).status, 204);
    const FakeStandalone& fake = FakeStandalone::instance();
    EXPECT_EQ(fake.audit, (std::vector<std::string>{"anna: " + aFingerprint + ": ssh-ed25519, desk",
                                                    "anna: " + aFingerprint + ": ssh-ed25519, desk"}));
    EXPECT_EQ(fake.actor, "admin");
    EXPECT_EQ(fake.address, "127.0.0.1");
    EXPECT_TRUE(logged("key " + aFingerprint + " added for anna by admin"));
}

TEST_F(HostKeys, AreChangedByAdministratorsOnly) {
    EXPECT_EQ(ask("POST", "/api/keys", viewer, body("anna", aKey)).status, 403);
    ASSERT_EQ(post("/api/keys", body("anna", aKey)).status, 201);
    EXPECT_EQ(ask("DELETE", path(), viewer).status, 403);
    EXPECT_EQ(keys().size(), 1U);
}

TEST_F(HostKeys, StandThereOnce) {
    ASSERT_EQ(post("/api/keys", body("anna", aKey)).status, 201);
    for (const char* query : {"", "?dry_run=true"}) {
        const Answer again = post(std::string("/api/keys") + query, body("anna", aKey + " other"));
        EXPECT_EQ(again.status, 409);
        EXPECT_EQ(again.json()["detail"], "The key " + aFingerprint +
                                              " of anna is there already. To change what restricts it, "
                                              "remove it first. No key was added.");
    }
    EXPECT_EQ(post("/api/keys", body("ben", aKey)).status, 201);
}

TEST_F(HostKeys, AreRefusedWithTheField) {
    const auto fieldOf = [this](const std::string& text) {
        const Answer answer = post("/api/keys", text);
        EXPECT_EQ(answer.status, 422) << text;
        return answer.json()["errors"][0]["field"].asString();
    };
    EXPECT_EQ(fieldOf("{}"), "user");
    EXPECT_EQ(fieldOf(R"({"user": 7, "key": "x"})"), "user");
    EXPECT_EQ(fieldOf(body("", aKey)), "user");
    EXPECT_EQ(fieldOf(body("carla", aKey)), "user");
    EXPECT_EQ(fieldOf(R"({"user": "anna"})"), "key");
    EXPECT_EQ(fieldOf(R"({"user": "anna", "key": ["x"]})"), "key");
    EXPECT_EQ(fieldOf(body("anna", "ssh-ed25519 AAAA")), "key");
    EXPECT_EQ(fieldOf(body("anna", aKey + "\n" + anotherKey)), "key");
    EXPECT_EQ(fieldOf(body("anna", "command=\"x\" " + aKey)), "key");
    EXPECT_EQ(fieldOf(body("anna", "expiry-time=\"20200101Z\" " + aKey)), "key") << "over";
    EXPECT_EQ(post("/api/keys", "[").status, 400);
    EXPECT_EQ(post("/api/keys", body("anna", "command=\"x\" " + aKey)).json()["detail"],
              "key: expected no other option than from and expiry-time, but there is command. No key was "
              "added.");
    EXPECT_EQ(keys().size(), 0U);
}

TEST_F(HostKeys, StayInADryRun) {
    const Answer plan = post("/api/keys?dry_run=true", body("anna", aKey));
    EXPECT_EQ(plan.status, 200);
    EXPECT_EQ(plan.json()["effects"][0]["subject"], "keys");
    EXPECT_EQ(plan.json()["effects"][1]["subject"], "anna: " + aFingerprint + ": ssh-ed25519");
    EXPECT_EQ(keys().size(), 0U);
    ASSERT_EQ(post("/api/keys", body("anna", aKey)).status, 201);
    EXPECT_EQ(ask("DELETE", path() + "?dry_run=true", admin).json()["dry_run"], true);
    EXPECT_EQ(keys().size(), 1U);
    EXPECT_EQ(ask("DELETE", path() + "?dryrun=true", admin).status, 400);
    EXPECT_EQ(post("/api/keys?sessions=keep", body("ben", aKey)).status, 400);
    EXPECT_EQ(FakeStandalone::instance().audit.size(), 1U);
}

TEST_F(HostKeys, SayWhetherTheyOpenAnything) {
    velt::KeyEntry entry{velt::test::keyOf("expiry-time=\"20200101Z\" " + aKey), "then", "root"};
    keys() = {{"anna", entry, true}, {"gone", {velt::test::keyOf(anotherKey), "then", "root"}, false}};
    const Json::Value list = get("/api/keys").json()["keys"];
    EXPECT_EQ(list[0]["state"], "expired");
    EXPECT_EQ(list[1]["state"], "former-account");
    EXPECT_FALSE(list[1].isMember("expires"));
    EXPECT_FALSE(list[1].isMember("from"));
}

TEST_F(HostKeys, AreAskedForByUser) {
    EXPECT_EQ(get("/api/keys?user=carla").status, 404);
    EXPECT_EQ(get("/api/keys?user=").status, 400);
    EXPECT_EQ(get("/api/keys?user=%ff").status, 400);
    EXPECT_EQ(get("/api/keys?name=anna").status, 400);
    EXPECT_EQ(get("/api/keys?user=anna&user=ben").status, 400);
    for (const char* target :
         {"/api/keys/anna", "/api/keys/anna/", "/api/keys/..%2Fx/y", "/api/keys/anna/x/y"}) {
        EXPECT_NE(ask("DELETE", target, admin).status, 204) << target;
    }
}

TEST_F(HostKeys, ThatCannotBeReadOrStoredAreAFailure) {
    FakeStandalone& fake = FakeStandalone::instance();
    fake.sentence = "The file of the keys of anna is damaged.";
    EXPECT_EQ(get("/api/keys").json()["damaged"][0], fake.sentence);
    fake.keysFail = true;
    fake.error = velt::ErrorNumber::store;
    EXPECT_EQ(get("/api/keys").status, 500);
    const Answer added = post("/api/keys", body("anna", aKey));
    EXPECT_EQ(added.status, 500);
    EXPECT_EQ(added.json()["detail"], fake.sentence + " No key was added.");
    EXPECT_EQ(ask("DELETE", path(), admin).status, 500);
    EXPECT_TRUE(fake.audit.empty());
}

} // namespace
