// All settings as one document.
#include "base/json_value.h"
#include "host/api/change_summary.h"
#include "host/api/document_check.h"
#include "host/base/json.h"
#include "tests/host/fake_standalone.h"
#include "tests/host/host_test.h"
#include "tests/support/fake_platform/fake_platform.h"

namespace {

class HostSettings : public HostTest {
protected:
    void SetUp() override {
        platform.reset();
        access = {};
        settings.workers = 1; // the fake platform knows one thread
        start();
    }

    Answer patch(const std::string& body, const std::string& query = "") const {
        return ask("PATCH", "/api/settings" + query, admin, body);
    }
    Answer put(const Json::Value& document, const std::string& headers = "") const {
        return ask("PUT", "/api/settings", admin + headers, velt::host::toJson(document));
    }
    Json::Value document() const { return get("/api/settings").json(); }

    static std::vector<std::string> fieldsOf(const Answer& answer) {
        std::vector<std::string> fields;
        const Json::Value problem = answer.json();
        for (const Json::Value& error : problem["errors"]) {
            fields.push_back(error["field"].asString());
        }
        return fields;
    }

    fake::Platform& platform = fake::Platform::instance();
    FakeStandalone& access = FakeStandalone::instance();
};

using Fields = std::vector<std::string>;

TEST_F(HostSettings, TheDocumentHasEverySectionAndNamesItsForm) {
    const Answer answer = get("/api/settings");
    EXPECT_EQ(answer.status, 200);
    EXPECT_EQ(answer.json().getMemberNames(),
              (Fields{"chroot_rules", "confinement", "format", "format_version", "ftp", "security", "sftp"}));
    EXPECT_EQ(answer.json()["format"], "velt-settings");
    EXPECT_EQ(ask("GET", "/api/settings", viewer).status, 200);
    EXPECT_EQ(ask("PATCH", "/api/settings", viewer, "{}").status, 403);
}

TEST_F(HostSettings, TheSameDocumentSentBackChangesNothing) {
    const Answer answer = put(document());
    EXPECT_EQ(answer.status, 200) << answer.body;
    EXPECT_TRUE(answer.json()["changes"].empty());
    EXPECT_TRUE(answer.json()["effects"].empty());
    EXPECT_EQ(platform.count("VELTFTPConfSet"), 0);
    EXPECT_EQ(platform.count("VELTSFTPConfigSet"), 0);
    EXPECT_TRUE(access.history.empty());
}

TEST_F(HostSettings, APatchChangesWhatItNames) {
    const Answer answer = patch(R"({"ftp":{"timeout":600},"sftp":{"portnum":2222,"enable":true}})");
    ASSERT_EQ(answer.status, 200) << answer.body;
    const Json::Value changes = answer.json()["changes"];
    ASSERT_EQ(changes.size(), 3U) << answer.body;
    EXPECT_EQ(changes[0]["field"], "/ftp/timeout");
    EXPECT_EQ(changes[0]["to"], 600);
    EXPECT_EQ(platform.sftp.port, 2222);
    EXPECT_EQ(document()["ftp"]["timeout"], 600);
    EXPECT_EQ(access.intended.listeners.at("sftp"), 2222);
}

TEST_F(HostSettings, ThePlatformsOwnSettingsAreOnesLikeOthers) {
    const Answer planned = patch(R"({"confinement":{"sftp":true}})", "?dry_run=true");
    ASSERT_EQ(planned.status, 200) << planned.body;
    EXPECT_EQ(velt::host::toJson(planned.json()["changes"]),
              R"([{"field":"/confinement/sftp","from":false,"to":true}])");
    EXPECT_EQ(planned.json()["effects"][0]["subject"], "confinement settings");
    EXPECT_FALSE(access.confinement.sftp);
    ASSERT_EQ(patch(R"({"confinement":{"sftp":true}})").status, 200);
    EXPECT_TRUE(access.confinement.sftp);
    EXPECT_EQ(document()["confinement"]["sftp"], true);
    ASSERT_EQ(post("/api/history/1/undo").status, 200);
    EXPECT_FALSE(access.confinement.sftp);
    ASSERT_EQ(patch(R"({"confinement":null})").status, 200);
    EXPECT_TRUE(access.confinement.sftp) << "the default";
    EXPECT_EQ(fieldsOf(patch(R"({"confinement":{"sftp":1}})")), Fields{"/confinement/sftp"});
    EXPECT_EQ(fieldsOf(patch(R"({"confinement":{"ftp":true}})")), Fields{"/confinement/ftp"});
    EXPECT_EQ(fieldsOf(patch(R"({"confinement":true})")), Fields{"/confinement"});
}

TEST_F(HostSettings, ADocumentOfAFormerVersionLeavesWhatItDoesNotKnow) {
    access.confinement.sftp = true;
    Json::Value former = document();
    former.removeMember("confinement");
    former["ftp"]["timeout"] = 600;
    const Answer answer = put(former);
    ASSERT_EQ(answer.status, 200) << answer.body;
    EXPECT_EQ(answer.json()["changes"].size(), 1U);
    EXPECT_TRUE(access.confinement.sftp);
}

TEST_F(HostSettings, WhatThePlatformRefusesChangesNothing) {
    access.confinementFails = true;
    access.sentence = "Cannot read the file.";
    EXPECT_EQ(get("/api/settings").status, 500);
    EXPECT_EQ(patch(R"({"ftp":{"timeout":600}})").status, 500);
    access.confinementFails = false;
    EXPECT_NE(document()["ftp"]["timeout"], 600);
}

TEST_F(HostSettings, RulesOfAccountsWithoutANameAreShownByNumberAndSurviveAnEditOfOthers) {
    platform.users["anna"].uid = 1000;
    const std::vector<std::string> stored{"user:4711:/home", "user:1000:/public", "group:42:/docs"};
    platform.rules = stored;
    Json::Value whole = document();
    ASSERT_EQ(whole["chroot_rules"].size(), 3U);
    EXPECT_EQ(velt::host::toJson(whole["chroot_rules"][0]),
              R"({"name":"#4711","path":"/home","type":"user"})");
    EXPECT_EQ(whole["chroot_rules"][1]["name"], "anna");
    EXPECT_EQ(whole["chroot_rules"][2]["name"], "#42");
    EXPECT_TRUE(put(whole).json()["changes"].empty());
    whole["chroot_rules"][1]["path"] = "/home";
    ASSERT_EQ(put(whole).status, 200);
    EXPECT_EQ(platform.rules,
              (std::vector<std::string>{"user:4711:/home", "user:1000:/home", "group:42:/docs"}));
    Json::Value removed;
    whole["chroot_rules"].removeIndex(0, &removed);
    ASSERT_EQ(put(whole).status, 200);
    EXPECT_EQ(platform.rules, (std::vector<std::string>{"user:1000:/home", "group:42:/docs"}));
    ASSERT_EQ(post("/api/history/2/undo").status, 200) << "what was there before can be there again";
    EXPECT_EQ(platform.rules,
              (std::vector<std::string>{"user:4711:/home", "user:1000:/home", "group:42:/docs"}));
    platform.users["back"].uid = 4711;
    EXPECT_EQ(document()["chroot_rules"][0]["name"], "back");
    ASSERT_EQ(post("/api/history/3/undo").status, 200) << "though the account has a name since";
    ASSERT_EQ(post("/api/history/4/undo").status, 200);
    EXPECT_EQ(platform.rules.size(), 3U);
    EXPECT_TRUE(patch(R"({"chroot_rules":[{"type":"user","name":"#4711","path":"/home"},
        {"type":"user","name":"anna","path":"/home"},{"type":"group","name":"#42","path":"/docs"}]})")
                    .json()["changes"]
                    .empty());
}

TEST_F(HostSettings, NullIsTheDefault) {
    ASSERT_EQ(patch(R"({"ftp":{"timeout":600},"security":{"user_chroot":true}})").status, 200);
    ASSERT_EQ(patch(R"({"ftp":{"timeout":null},"security":null})").status, 200);
    EXPECT_EQ(document()["ftp"]["timeout"], 300);
    EXPECT_EQ(document()["security"]["user_chroot"], false);
}

TEST_F(HostSettings, EachFaultIsNamedByItsPlace) {
    const std::map<std::string, Fields> wrong{
        {R"({"ftp":{"timeout":"x"}})", {"/ftp/timeout"}},
        {R"({"ftp":{"timeout":-1}})", {"/ftp/timeout"}},
        {R"({"ftp":{"timeout":86401}})", {"/ftp/timeout"}},
        {R"({"ftp":{"maxuploadrate":-1}})", {"/ftp/maxuploadrate"}},
        {R"({"ftp":{"timeout":3e2}})", {"/ftp/timeout"}},
        {R"({"ftp":{"a/b~c":1},"d/e":1})", {"/d~1e", "/ftp/a~1b~0c"}},
        {R"({"ftp":{"portnum":70000},"sftp":{"portnum":0}})", {"/ftp/portnum", "/sftp/portnum"}},
        {R"({"ftp":{"enable_ftp":1}})", {"/ftp/enable_ftp"}},
        {R"({"ftp":{"enable_utf8":true}})", {"/ftp/enable_utf8"}},
        {R"({"ftp":{"ext_ip":"foo"}})", {"/ftp/ext_ip"}},
        {R"({"ftp":{"custom_port_range":true,"custom_port":"50000-50100"}})", {"/ftp/custom_port"}},
        {R"({"ftp":{"custom_port_range":true,"custom_port":"1023:1100"}})", {"/ftp/custom_port"}},
        {R"({"ftp":{"custom_port_range":true,"custom_port":"5000:5000"}})", {"/ftp/custom_port"}},
        {R"({"ftp":{"custom_port_range":true,"custom_port":"2000:3000","portnum":2500}})",
         {"/ftp/custom_port"}},
        {R"({"security":{"anonymous_chroot":true}})", {"/security/anonymous_chroot_share"}},
        {R"({"ftp":{"enable_ftp":true,"portnum":2022},"sftp":{"enable":true,"portnum":2022}})",
         {"/ftp/portnum"}},
        {R"({"ftp":{"custom_port":"2000:2010"}})", {"/ftp/custom_port"}},
        {R"({"ftp":7})", {"/ftp"}},
        {R"({"ftps":{}})", {"/ftps"}},
        {R"({"format_version":2})", {"/format_version"}},
        {R"({"chroot_rules":{}})", {"/chroot_rules"}},
        {R"({"chroot_rules":[1]})", {"/chroot_rules/0"}},
        {R"({"chroot_rules":[{"type":"users","name":"a","path":"/home"}]})", {"/chroot_rules/0/type"}},
        {R"({"chroot_rules":[{"type":"user","name":"","path":"/home"}]})", {"/chroot_rules/0/name"}},
        {R"({"chroot_rules":[{"type":"user","name":"a","path":"home"}]})", {"/chroot_rules/0/path"}},
        {R"({"chroot_rules":[{"type":"user","name":"a","path":"/home","x":1}]})", {"/chroot_rules/0/x"}},
        {R"({"chroot_rules":[{"type":"user","name":"a","path":"/home"},{"type":"user","name":"a","path":"/s"}]})",
         {"/chroot_rules/1/name"}},
    };
    for (const auto& [body, fields] : wrong) {
        const Answer answer = patch(body);
        EXPECT_EQ(answer.status, 422) << body;
        EXPECT_EQ(fieldsOf(answer), fields) << answer.body;
        EXPECT_TRUE(answer.json()["detail"].asString().ends_with(" Nothing was changed."));
    }
    EXPECT_EQ(platform.count("VELTFTPConfSet"), 0);
    EXPECT_EQ(platform.count("VELTFTPChrootRuleSave"), 0);
}

TEST_F(HostSettings, OneOwnerMayHaveARuleAsAUserAndAsAGroup) {
    const Json::Value before =
        *velt::host::parseObject(R"({"format":"velt-settings","format_version":1,"chroot_rules":[]})");
    Json::Value wanted = before;
    for (const char* const type : {"user", "group"}) {
        Json::Value rule;
        rule["type"] = type;
        rule["name"] = "staff";
        rule["path"] = "/home";
        wanted["chroot_rules"].append(rule);
    }
    EXPECT_TRUE(velt::host::checkSettings(wanted, before).empty());
}

TEST_F(HostSettings, AWholeDocumentNeedsAllOfIt) {
    Json::Value without = document();
    without["ftp"].removeMember("timeout");
    without.removeMember("sftp");
    EXPECT_EQ(fieldsOf(put(without)), (Fields{"/ftp/timeout", "/sftp"}));
}

TEST_F(HostSettings, WhatIsStoredAlreadyIsNotJudged) {
    platform.conf.maxuploadrate = -1; // as the module takes it
    EXPECT_EQ(patch(R"({"ftp":{"timeout":500}})").status, 200);
    EXPECT_EQ(put(document()).status, 200);
}

TEST_F(HostSettings, AnAddressAtWhichNobodyReachesTheServerIsNamed) {
    for (const char* address : {"127.0.0.1", "300.1.1.1", "224.0.0.1"}) {
        const Answer answer = patch(std::string(R"({"ftp":{"ext_ip":")") + address + R"("}})");
        EXPECT_EQ(answer.status, 422);
        EXPECT_EQ(fieldsOf(answer), Fields{"/ftp/ext_ip"}) << answer.body;
    }
}

TEST_F(HostSettings, AnOptionThatComesTwiceIsRefused) {
    for (const char* query : {"?dry_run=true&dry_run=false", "?sessions=keep&sessions=end",
                              "?confirm_within=5&confirm_within=6"}) {
        EXPECT_EQ(patch(R"({"ftp":{"timeout":600}})", query).status, 400) << query;
    }
    EXPECT_EQ(post("/api/restart?dry_run=true&dry_run=false").status, 400);
    EXPECT_EQ(document()["ftp"]["timeout"], 300);
    EXPECT_TRUE(access.askedRestarts.empty());
}

TEST_F(HostSettings, OptionsInABodyAreNotOverlooked) {
    ASSERT_EQ(patch(R"({"ftp":{"timeout":600}})").status, 200);
    EXPECT_EQ(post("/api/history/1/undo", R"({"dry_run":true})").status, 400);
    EXPECT_EQ(post("/api/history/1/confirm", R"({"dry_run":true})").status, 400);
    EXPECT_EQ(post("/api/restart", R"({"service":"sftp"})").status, 400);
    EXPECT_EQ(document()["ftp"]["timeout"], 600);
    EXPECT_TRUE(access.askedRestarts.empty());
}

TEST_F(HostSettings, ARuleForSomebodyUnknownIsNamed) {
    const Answer answer = patch(R"({"chroot_rules":[{"type":"user","name":"nobody-knows","path":"/home"}]})");
    EXPECT_EQ(answer.status, 422) << answer.body;
    EXPECT_EQ(fieldsOf(answer), Fields{"/chroot_rules/0/name"}) << answer.body;
    EXPECT_NE(answer.body.find("a user that exists, not nobody-knows"), std::string::npos) << answer.body;
}

TEST_F(HostSettings, AChangeOfRulesIsWrittenDownRuleByRule) {
    platform.users["anna"].uid = 1001;
    platform.groups["staff"] = 100;
    const auto stored = [&](const std::string& rules) {
        EXPECT_EQ(patch(R"({"chroot_rules":)" + rules + "}").status, 200);
        return access.audit.back();
    };
    const std::string user = R"({"type":"user","name":"anna","path":"/home"})";
    const std::string group = R"({"type":"group","name":"staff","path":"/docs"})";
    EXPECT_EQ(stored("[" + user + "," + group + "]"),
              "settings: /chroot_rules (added user anna /home, group staff /docs)");
    EXPECT_EQ(stored("[" + group + "," + user + "]"), "settings: /chroot_rules (in another order)");
    EXPECT_EQ(stored(R"([{"type":"user","name":"anna","path":"/docs"}])"),
              "settings: /chroot_rules (removed group staff /docs, user anna /home; added user anna /docs)");
}

TEST(ChangeSummaryTest, OfManyRulesTheFirstAreNamed) {
    Json::Value rules(Json::arrayValue);
    for (int i = 0; i < 200; ++i) {
        rules.append(
            velt::jsonObject({{"type", "user"}, {"name", "u" + std::to_string(i)}, {"path", "/home"}}));
    }
    const std::string text =
        velt::host::summaryOf({{"/ftp/timeout", 1, 2}, {"/chroot_rules", rules, Json::arrayValue}});
    EXPECT_TRUE(
        text.starts_with("/ftp/timeout from 1 to 2, /chroot_rules (removed user u0 /home, user u1 /home"))
        << text;
    EXPECT_TRUE(text.ends_with("user u19 /home and 180 more)")) << text;
}

TEST_F(HostSettings, WhatCannotBeReadIsSaidToHaveChangedNothing) {
    platform.fail("VELTSFTPConfigGet");
    access.sentence = "Cannot read sftp.conf.";
    const Answer answer = patch(R"({"ftp":{"timeout":600}})");
    EXPECT_EQ(answer.status, 500);
    EXPECT_EQ(answer.json()["title"], "The operation failed");
    EXPECT_EQ(answer.json()["detail"], "Cannot read sftp.conf. Nothing was changed.");
    EXPECT_EQ(answer.json()["changed"], false);
}

TEST_F(HostSettings, ATakenPortIsAConflictOfItsField) {
    platform.takenPorts["web"] = {2222};
    access.conflict = {2222, "nginx (process 812)", ""};
    const Answer answer = patch(R"({"ftp":{"timeout":600},"sftp":{"portnum":2222}})");
    EXPECT_EQ(answer.status, 409) << answer.body;
    EXPECT_EQ(fieldsOf(answer), Fields{"/sftp/portnum"});
    EXPECT_EQ(answer.json()["holder"], "nginx (process 812)");
}

TEST_F(HostSettings, OnlyWhatWasSeenIsReplaced) {
    const Answer seen = get("/api/settings");
    const std::string condition = "If-Match: " + seen.header("etag") + "\r\n";
    Json::Value wanted = seen.json();
    wanted["ftp"]["timeout"] = 600;
    const Answer first = put(wanted, condition);
    EXPECT_EQ(first.status, 200);
    EXPECT_EQ(get("/api/settings").header("etag"), first.header("etag"));
    wanted["ftp"]["timeout"] = 700;
    EXPECT_EQ(put(wanted, condition).status, 412);
    EXPECT_EQ(document()["ftp"]["timeout"], 600);
    wanted["ftp"]["timeout"] = 300;
    EXPECT_EQ(put(wanted).status, 200);
    EXPECT_EQ(get("/api/settings").header("etag"), seen.header("etag"))
        << "the same settings have the same tag";
}

TEST_F(HostSettings, ADryRunIsNoChange) {
    const Answer answer = patch(R"({"sftp":{"portnum":2222}})", "?dry_run=true");
    EXPECT_EQ(answer.status, 200);
    EXPECT_EQ(answer.json()["dry_run"], true);
    EXPECT_EQ(answer.json()["changes"][0]["field"], "/sftp/portnum");
    EXPECT_TRUE(access.history.empty());
    EXPECT_TRUE(access.audit.empty());
}

TEST_F(HostSettings, AChangeIsWrittenDown) {
    const Answer answer = patch(R"({"ftp":{"timeout":600}})");
    ASSERT_EQ(access.history.size(), 1U);
    EXPECT_EQ(answer.json()["id"], 1);
    EXPECT_EQ(access.history[0].way, "settings");
    EXPECT_EQ(access.history[0].actor, "admin");
    EXPECT_EQ(access.history[0].fields, R"([{"field":"/ftp/timeout","from":300,"to":600}])");
    EXPECT_EQ(access.audit, Fields{"settings: /ftp/timeout from 300 to 600"});
    ASSERT_EQ(post("/api/VELT.Core.FileServ.FTP/v3/set",
                   R"({"enable_ftp":false,"enable_ftps":false,"timeout":900})")
                  .status,
              204);
    ASSERT_EQ(access.history.size(), 2U);
    EXPECT_EQ(access.history[1].way, "VELT.Core.FileServ.FTP v3 set");
}

TEST_F(HostSettings, WhatCannotBeWrittenDownIsAWarning) {
    access.historyFails = true;
    access.logFails = true;
    access.sentence = "The disk is full.";
    const Answer answer = patch(R"({"ftp":{"timeout":600}})");
    EXPECT_EQ(answer.status, 200);
    EXPECT_EQ(answer.json()["warnings"][0], "The change is not in the history. The disk is full.");
    EXPECT_EQ(answer.json()["warnings"][1], "The change is not in the administrator log. The disk is full.");
    EXPECT_EQ(patch(R"({"ftp":{"timeout":700}})", "?confirm_within=60").status, 500)
        << "it could not be taken back after a crash";
}

} // namespace
