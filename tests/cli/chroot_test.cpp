#include "tests/cli/cli_test.h"

namespace {

constexpr const char* usersList = "POST /api/VELT.Core.FileServ.FTP.ChrootUser/v1/list";

HttpReply json(const std::string& body) {
    return {200, body, "application/json", false, false};
}

class ChrootTest : public CliTest {
protected:
    void SetUp() override {
        host.rules = jsonOf(R"([{"type": "user", "name": "anna", "path": "/docs"},
                                {"type": "group", "name": "staff", "path": "/gone"}])");
    }
};

} // namespace

TEST_F(ChrootTest, ConfinedUsersAreListed) {
    host.answerWith(usersList,
                    json(R"({"total": 7, "user": [{"id": "anna", "name": "anna", "descr": "Anna A."},
                                                             {"id": "b", "name": "b", "descr": ""}]})"));
    const RunResult result = run({"chroot", "users", "list"});
    EXPECT_EQ(result.code, 0) << result.err;
    EXPECT_EQ(result.out, "USER  DESCRIPTION\nanna  Anna A.\nb\n2 of 7 users\n");
    EXPECT_EQ(sent(usersList).at(0),
              jsonOf(R"({"chroot": true, "offset": 0, "limit": -1, "type": "local"})"));
    EXPECT_EQ(jsonOf(run({"chroot", "users", "list", "--json"}).out)["total"], 7);
}

TEST_F(ChrootTest, TheListTakesAPageASourceAndFilters) {
    host.answerWith(usersList, json(R"({"total": 0, "user": []})"));
    EXPECT_EQ(run({"chroot", "users", "list", "--others", "--offset", "5", "--limit", "10", "--type", "all",
                   "--domain", "EXAMPLE", "--filter", "an"})
                  .code,
              0);
    EXPECT_EQ(sent(usersList).at(0), jsonOf(R"({"chroot": false, "offset": 5, "limit": 10, "type": "all",
                                                "domain_name": "EXAMPLE", "substr": "an"})"));
    EXPECT_EQ(run({"chroot", "users", "list", "--type", "nis"}).code, 2);
}

TEST_F(ChrootTest, TheListSaysThatTheOthersAreConfinedAsWell) {
    host.security["user_chroot"] = true;
    host.answerWith(usersList, json(R"({"total": 0, "user": []})"));
    EXPECT_EQ(run({"chroot", "users", "list"}).out,
              "USER  DESCRIPTION\n0 of 0 users\n"
              "user_chroot is on: users without a rule are confined to their home folders, too.\n");
    EXPECT_NE(run({"chroot", "users", "list", "--others"})
                  .out.find("unless a rule says otherwise, these users are confined"),
              std::string::npos);
    EXPECT_EQ(jsonOf(run({"chroot", "users", "list", "--json"}).out)["user_chroot"], true);
}

TEST_F(ChrootTest, UsersAreConfinedAndReleased) {
    host.accounts.insert("status"); // a user may be called like a command
    EXPECT_EQ(run({"chroot", "users", "add", "ben", "status", "ben"}).out,
              "chroot_rules: add user ben /home\nchroot_rules: add user status /home\n");
    EXPECT_EQ(run({"chroot", "users", "add", "ben"}).out, "Nothing changed.\n");
    EXPECT_EQ(run({"chroot", "users", "delete", "ben", "ben"}).out, "chroot_rules: remove user ben /home\n");
    EXPECT_EQ(jsonOf(run({"--json", "chroot", "users", "delete", "status"}).out)["changes"].size(), 1U);
    EXPECT_EQ(host.rules.size(), 2U);
    EXPECT_EQ(run({"chroot", "users", "add"}).code, 2);
}

TEST_F(ChrootTest, TheOtherRuleOfAConfinedUserIsSaidToBeReplaced) {
    host.rules.append(jsonOf(R"({"type": "user", "name": "anna", "path": "/later"})"));
    EXPECT_EQ(run({"chroot", "users", "add", "anna"}).out,
              "chroot_rules: user anna /docs -> /home\nchroot_rules: remove user anna /later\n");
    EXPECT_EQ(host.rules[0], jsonOf(R"({"type": "user", "name": "anna", "path": "/home"})"));
    EXPECT_EQ(host.rules.size(), 2U);
}

TEST_F(ChrootTest, WhoIsNotConfinedIsNotReleased) {
    const RunResult result = run({"chroot", "users", "delete", "anna"});
    EXPECT_EQ(result.code, 3);
    EXPECT_EQ(result.err, "veltctl: There is no rule that confines the user anna to the home folder.\n"
                          "  Nothing was changed.\n"
                          "  The rule of this user is for /docs.\n"
                          "What to do: See 'veltctl chroot rules load' for the rules.\n");
    host.security["user_chroot"] = true;
    EXPECT_NE(run({"chroot", "users", "delete", "ben"})
                  .err.find("  user_chroot is on, which confines all users without a rule.\n"),
              std::string::npos);
    EXPECT_EQ(run({"chroot", "users", "delete", "staff"}).code, 3); // a group
    EXPECT_TRUE(sent(change).empty());
}

TEST_F(ChrootTest, WhoIsReleasedFromARuleIsToldOfTheGeneralSetting) {
    host.security["user_chroot"] = true;
    host.rules = jsonOf(R"([{"type": "user", "name": "anna", "path": "/home"}])");
    EXPECT_EQ(run({"chroot", "users", "delete", "anna"}).out,
              "chroot_rules: remove user anna /home\n"
              "user_chroot is on: users without a rule are confined to their home folders.\n");
}

TEST_F(ChrootTest, UsersAreConfinedAsOtherSettingsAreChanged) {
    const RunResult result = run({"chroot", "users", "add", "ben", "--dry-run"});
    EXPECT_EQ(result.code, 7);
    EXPECT_EQ(result.out, "chroot_rules: add user ben /home\nNothing was changed: this was a dry run.\n");
    EXPECT_EQ(run({"chroot", "users", "add", "ben", "--keep-sessions", "--confirm-within", "60"}).code, 0);
    EXPECT_EQ(sent("PATCH /api/settings?sessions=keep&confirm_within=60").size(), 1U);
    EXPECT_EQ(run({"chroot", "users", "delete", "ben", "--end-sessions"}).code, 0);
    EXPECT_EQ(sent("PATCH /api/settings?sessions=end").size(), 1U);
    host.etag = "\"a-1\"";
    host.outdated = 1; // somebody else adds a rule first
    EXPECT_EQ(run({"chroot", "users", "add", "anna"}).code, 0);
    EXPECT_EQ(host.rules.size(), 3U);
}

TEST_F(ChrootTest, RulesAreShown) {
    EXPECT_EQ(run({"chroot", "rules", "load"}).out, "TYPE   NAME   FOLDER  EXISTS\n"
                                                    "user   anna   /docs   yes\n"
                                                    "group  staff  /gone   no\n");
    EXPECT_EQ(jsonOf(run({"chroot", "rules", "load", "--json"}).out)["total"], 2);
}

TEST_F(ChrootTest, ARuleOfAnAccountWithoutANameIsShownAndCanBeRemoved) {
    Json::Value whole = host.rules;
    whole.insert(0, jsonOf(R"({"type": "user", "name": "#4711", "path": "/home"})"));
    host.rules = whole;
    EXPECT_EQ(run({"chroot", "rules", "load"}).out, "TYPE   NAME   FOLDER  EXISTS\n"
                                                    "user   #4711  /home   account unknown\n"
                                                    "user   anna   /docs   yes\n"
                                                    "group  staff  /gone   no\n");
    EXPECT_EQ(run({"chroot", "rules", "remove", "user", "#4711"}).out,
              "chroot_rules: remove user #4711 /home\n");
}

TEST_F(ChrootTest, ARuleIsAddedToTheOthers) {
    const RunResult result = run({"chroot", "rules", "add", "user", "ben", "/home"});
    EXPECT_EQ(result.code, 0) << result.err;
    EXPECT_EQ(result.out, "chroot_rules: add user ben /home\n");
    EXPECT_EQ(sent(change).at(0)["chroot_rules"],
              jsonOf(R"([{"type": "user", "name": "anna", "path": "/docs"},
                         {"type": "group", "name": "staff", "path": "/gone"},
                         {"type": "user", "name": "ben", "path": "/home"}])"));
    EXPECT_EQ(run({"chroot", "rules", "add", "user", "anna", "/docs"}).out, "Nothing changed.\n");
    EXPECT_EQ(run({"chroot", "rules", "remove", "user", "ben", "--dry-run"}).code, 7);
    EXPECT_EQ(host.rules.size(), 3U);
}

TEST_F(ChrootTest, ARuleOfSomebodyElseInBetweenIsKept) {
    host.etag = "\"a-1\"";
    host.outdated = 1; // somebody else adds a rule first
    EXPECT_EQ(run({"chroot", "rules", "add", "group", "staff", "/home"}).code, 0);
    EXPECT_EQ(host.rules.size(), 4U);
    EXPECT_EQ(host.conditions, (std::vector<std::string>{"\"a-1\"", "\"a-1\""}));
    host.outdated = 1000;
    const RunResult result = run({"chroot", "rules", "add", "user", "ben", "/home"});
    EXPECT_EQ(result.code, 4);
    EXPECT_EQ(result.err, "veltctl: Others keep changing the settings at the same time.\n"
                          "  Nothing was changed.\n"
                          "What to do: Try again later.\n");
}

TEST_F(ChrootTest, ARuleForAnUnknownUserIsReported) {
    const RunResult result = run({"chroot", "rules", "add", "user", "nobody-knows", "/docs"});
    EXPECT_EQ(result.code, 3);
    EXPECT_NE(result.err.find("expected a user that exists"), std::string::npos) << result.err;
    EXPECT_EQ(host.rules.size(), 2U);
}

TEST_F(ChrootTest, ARuleThatTheServerWouldMisreadIsNotSent) {
    EXPECT_EQ(run({"chroot", "rules", "add", "User", "anna", "/docs"}).code, 2);
    EXPECT_EQ(run({"chroot", "rules", "add", "user", "anna", ""}).code, 2);
    EXPECT_EQ(run({"chroot", "rules", "add", "user", "anna", "docs"}).err,
              "veltctl: Invalid rule: path: expected /home, /SHARE or /SHARE/FOLDER.\n"
              "What to do: Write it as in 'veltctl chroot rules add user NAME /SHARE'.\n");
    EXPECT_EQ(run({"chroot", "rules", "add", "user", "anna", "docs"}).code, 2);
    EXPECT_EQ(run({"chroot", "rules", "add", "user", "", "/docs"}).code, 2);
    EXPECT_EQ(run({"chroot", "rules", "add", "user", "anna"}).code, 2);
    EXPECT_TRUE(asked().empty());
}

TEST_F(ChrootTest, RulesAreRemovedByNameOrByFolder) {
    EXPECT_EQ(run({"chroot", "rules", "remove", "user", "anna", "/other"}).code, 3);
    EXPECT_EQ(run({"chroot", "rules", "remove", "group", "anna"}).code, 3);
    EXPECT_TRUE(sent(change).empty());
    EXPECT_EQ(run({"chroot", "rules", "remove", "group", "staff", "/gone"}).code, 0);
    EXPECT_EQ(run({"chroot", "rules", "remove", "user", "anna"}).out,
              "chroot_rules: remove user anna /docs\n");
    EXPECT_EQ(host.rules.size(), 0U);
}

TEST_F(ChrootTest, AllRulesAreReplacedFromAFileOrTheInput) {
    const std::string rules = R"([{"type": "user", "name": "ben", "path": "/home", "path_exist": false}])";
    EXPECT_EQ(run({"chroot", "rules", "save", folder.write("rules.json", rules)}).code, 0);
    EXPECT_EQ(host.rules, jsonOf(R"([{"type": "user", "name": "ben", "path": "/home"}])"));
    EXPECT_EQ(run({"chroot", "rules", "save", "-"}, R"({"rules": []})").code, 0);
    EXPECT_EQ(host.rules.size(), 0U);
}

TEST_F(ChrootTest, AnInvalidSetOfRulesIsNotSent) {
    const RunResult result =
        run({"chroot", "rules", "save", "-"}, R"([{"type": "users", "name": "a", "path": "/x"}, 5,
                                                  {"type": "user", "name": "a", "path": ""}])");
    EXPECT_EQ(result.code, 3);
    EXPECT_NE(result.err.find("rule 1: type: expected user or group"), std::string::npos) << result.err;
    EXPECT_NE(result.err.find("rule 2: expected an object"), std::string::npos) << result.err;
    EXPECT_NE(result.err.find("rule 3: path: expected"), std::string::npos) << result.err;
    // Without an array the server would remove every rule.
    EXPECT_EQ(run({"chroot", "rules", "save", "-"}, "{}").code, 3);
    EXPECT_EQ(run({"chroot", "rules", "save", "-"}, R"({"rules": null})").code, 3);
    EXPECT_EQ(run({"chroot", "rules", "save", "-"}, "").code, 3);
    EXPECT_EQ(run({"chroot", "rules", "save", folder.path("absent")}).code, 1);
    EXPECT_TRUE(asked().empty());
}
