#include "module/entry_functions.h"
#include "tests/support/handler_test.h"

#include <ctime>

namespace {

using std::to_string;

constexpr char alloc[] = "VLIBCSzListAlloc(1024)";
constexpr char freeList[] = "VLIBCSzListFree(list1)";

/// The look-up of a user; `standing` is what the look-ups before left in the record.
std::string getUser(const std::string& name, const std::string& standing = "null") {
    return "VELTUserGet(\"" + name + "\", " + standing + ")";
}

std::string getGroup(const std::string& name, const std::string& standing = "null") {
    return "VELTGroupGet(\"" + name + "\", " + standing + ")";
}

std::string format(int isUser, int id, const std::string& path) {
    return "VELTFTPChrootRuleFormat(2048, " + to_string(isUser) + ", " + to_string(id) + ", \"" + path +
           "\")";
}

std::string push(const std::string& line) {
    return "VLIBCSzListPush(list1, \"" + line + "\")";
}

std::string save(const Lines& rules) {
    std::string text;
    for (const std::string& rule : rules) {
        text += (text.empty() ? "\"" : ", \"") + rule + "\"";
    }
    return "VELTFTPChrootRuleSave(list1 flags=0 [" + text + "])";
}

Lines begun() {
    return {getParams(), alloc};
}

Lines savedAs(const Lines& rules) {
    return {save(rules), freeList, succeeded()};
}

std::string rule(const std::string& type, const std::string& name, const std::string& path) {
    return R"({"type":")" + type + R"(","name":")" + name + R"(","path":")" + path + "\"}";
}

class ChrootSaveTest : public HandlerTest {
protected:
    void SetUp() override {
        HandlerTest::SetUp();
        platform.users = {{"alice", {"", 1001}}, {"bob", {"", 1002}}};
        platform.groups = {{"staff", 2001}, {"guests", 2002}};
        platform.rules = {"user:1:/old"};
        platform.lastError = {0x2A, "account.c", 7};
    }

    static std::string failureOf(const std::string& call) {
        return logLine("chroot", "Failed to " + call + "().[0x%04X %s:%d]", R"(0x2A, "account.c", 7)");
    }

    static std::string unknown(const std::string& call, const std::string& name) {
        return logLine("chroot", "Failed to " + call + "(). [%s][0x%04X %s:%d]",
                       "\"" + name + R"(", 0x2A, "account.c", 7)");
    }

    Lines saveRules(const std::string& rules) { return run(FTPChrootUserSave, R"({"rules":)" + rules + "}"); }

    /// The processor time, in seconds, of a request that saves `count` rules.
    double secondsToSave(int count) {
        std::string rules;
        for (int i = 0; i < count; ++i) {
            rules += (i == 0 ? "" : ",") + rule("user", "alice", "/media/" + to_string(i));
        }
        const std::clock_t begin = std::clock();
        saveRules("[" + rules + "]");
        const std::clock_t end = std::clock();
        EXPECT_EQ(platform.rules.size(), static_cast<std::size_t>(count));
        return static_cast<double>(end - begin) / CLOCKS_PER_SEC;
    }
};

} // namespace

TEST_F(ChrootSaveTest, StoresTheRulesOfUsersAndGroupsInTheirOrder) {
    EXPECT_EQ(saveRules("[" + rule("group", "staff", "/media/a") + "," + rule("user", "bob", "/home") + "]"),
              (begun() +
               Lines{getGroup("staff"), format(0, 2001, "/media/a"), push("group:2001:/media/a"),
                     getUser("bob"), format(1, 1002, "/home"), push("user:1002:/home")} +
               savedAs({"group:2001:/media/a", "user:1002:/home"})));
    EXPECT_EQ(platform.rules, (Lines{"group:2001:/media/a", "user:1002:/home"}));
}

TEST_F(ChrootSaveTest, HandsTheRecordsOfEarlierLookUpsInAndReleasesNone) {
    const std::string rules = "[" + rule("user", "alice", "/a") + "," + rule("group", "staff", "/b") + "," +
                              rule("user", "ghost", "/c") + "," + rule("user", "bob", "/d") + "," +
                              rule("group", "guests", "/e") + "]";
    EXPECT_EQ(saveRules(rules),
              (begun() +
               Lines{getUser("alice"), format(1, 1001, "/a"), push("user:1001:/a"), getGroup("staff"),
                     format(0, 2001, "/b"), push("group:2001:/b"), getUser("ghost", "user1"),
                     unknown("VELTUserGet", "ghost"), getUser("bob", "user1"), format(1, 1002, "/d"),
                     push("user:1002:/d"), getGroup("guests", "group1"), format(0, 2002, "/e"),
                     push("group:2002:/e")} +
               savedAs({"user:1001:/a", "group:2001:/b", "user:1002:/d", "group:2002:/e"})));
    EXPECT_EQ(platform.userRecords(), 1);
    EXPECT_EQ(platform.groupRecords(), 1);
}

TEST_F(ChrootSaveTest, StoresAnEmptySetForAnEmptyArray) {
    EXPECT_EQ(saveRules("[]"), begun() + savedAs({}));
    EXPECT_EQ(platform.rules, Lines{});
}

TEST_F(ChrootSaveTest, RemovesEveryRuleWhenTheRequestHoldsNoArray) {
    for (const char* const params :
         {"{}", "null", R"({"rules":null})", R"({"rules":"all"})", R"({"rules":""})", R"({"rules":7})",
          R"({"rules":1.5})", R"({"rules":true})", R"({"rules":{}})", R"({"Rules":[7]})"}) {
        startAfresh();
        platform.rules = {"user:1:/old"};
        EXPECT_EQ(run(FTPChrootUserSave, params), begun() + savedAs({})) << params;
        EXPECT_EQ(platform.rules, Lines{}) << params;
    }
}

TEST_F(ChrootSaveTest, TakesOnlyTheExactWordForAUser) {
    for (const char* const type : {"User", "USER", "useR", "user ", " user", "users", "group", "Group", ""}) {
        startAfresh();
        platform.users["staff"] = {"", 1001};
        platform.groups["staff"] = 2001;
        EXPECT_EQ(saveRules("[" + rule(type, "staff", "/a") + "]"),
                  (begun() + Lines{getGroup("staff"), format(0, 2001, "/a"), push("group:2001:/a")} +
                   savedAs({"group:2001:/a"})))
            << type;
    }
}

TEST_F(ChrootSaveTest, DropsTheRuleOfAnUnknownUserWithALogLine) {
    EXPECT_EQ(saveRules("[" + rule("user", "gh%sost", "/a") + "," + rule("user", "bob", "/b") + "]"),
              (begun() +
               Lines{getUser("gh%sost"), unknown("VELTUserGet", "gh%sost"), getUser("bob"),
                     format(1, 1002, "/b"), push("user:1002:/b")} +
               savedAs({"user:1002:/b"})));
    const std::string& text = platform.logLines.front().rendered;
    EXPECT_EQ(text.substr(text.find(' ')), " Failed to VELTUserGet(). [gh%sost][0x002A account.c:7]");
}

TEST_F(ChrootSaveTest, DropsTheRuleOfAnUnknownGroupWithALogLine) {
    EXPECT_EQ(saveRules("[" + rule("User", "alice", "/a") + "," + rule("group", "staff", "/b") + "]"),
              (begun() +
               Lines{getGroup("alice"), unknown("VELTGroupGet", "alice"), getGroup("staff"),
                     format(0, 2001, "/b"), push("group:2001:/b")} +
               savedAs({"group:2001:/b"})));
}

TEST_F(ChrootSaveTest, AsksForTheLastErrorOnceInTheOrderOfTheLogLine) {
    platform.journalErrorGets = true;
    EXPECT_EQ(saveRules("[" + rule("user", "ghost", "/a") + "]"),
              (begun() +
               Lines{getUser("ghost"), "VLIBCErrGet()", "VLIBCErrorGetFile()", "VLIBCErrorGetLine()",
                     unknown("VELTUserGet", "ghost")} +
               savedAs({})));
}

TEST_F(ChrootSaveTest, DropsARuleThatCannotBeFormattedWithoutAMessage) {
    platform.fail("VELTFTPChrootRuleFormat", 1);
    EXPECT_EQ(saveRules("[" + rule("user", "alice", "/a") + "," + rule("user", "bob", "/b") + "]"),
              (begun() +
               Lines{getUser("alice"), format(1, 1001, "/a"), getUser("bob", "user1"), format(1, 1002, "/b"),
                     push("user:1002:/b")} +
               savedAs({"user:1002:/b"})));
}

TEST_F(ChrootSaveTest, DropsARuleThatExceedsTheLineBuffer) {
    const std::string longest(2048 - 1 - 10, 'p'); // beside "user:1001:" and the NUL
    EXPECT_EQ(
        saveRules("[" + rule("user", "alice", longest + "p") + "," + rule("user", "alice", longest) + "]"),
        (begun() +
         Lines{getUser("alice"), format(1, 1001, longest + "p"), getUser("alice", "user1"),
               format(1, 1001, longest), push("user:1001:" + longest)} +
         savedAs({"user:1001:" + longest})));
}

TEST_F(ChrootSaveTest, ZeroesTheLineOnceAndNotForEachRule) {
    platform.fail("VELTFTPChrootRuleFormat", 1, 0); // it writes nothing
    platform.fail("VELTFTPChrootRuleFormat", 3, 1);
    EXPECT_EQ(saveRules("[" + rule("user", "alice", "/a") + "," + rule("user", "alice", "/b") + "," +
                        rule("user", "alice", "/c") + "]"),
              (begun() +
               Lines{getUser("alice"), format(1, 1001, "/a"), push(""), getUser("alice", "user1"),
                     format(1, 1001, "/b"), push("user:1001:/b"), getUser("alice", "user1"),
                     format(1, 1001, "/c"), push("user:1001:/b")} +
               savedAs({"", "user:1001:/b", "user:1001:/b"})));
}

TEST_F(ChrootSaveTest, DoesNotLookAtAFailedPush) {
    platform.fail("VLIBCSzListPush", 1);
    EXPECT_EQ(saveRules("[" + rule("user", "alice", "/a") + "," + rule("user", "bob", "/b") + "]"),
              (begun() +
               Lines{getUser("alice"), format(1, 1001, "/a"), push("user:1001:/a"), getUser("bob", "user1"),
                     format(1, 1002, "/b"), push("user:1002:/b")} +
               savedAs({"user:1002:/b"})));
}

TEST_F(ChrootSaveTest, StoresTheSameRuleTwiceAndAnyPath) {
    EXPECT_EQ(saveRules("[" + rule("user", "alice", "") + "," + rule("user", "alice", "") + "," +
                        rule("user", "alice", "no slash: %s") + "]"),
              (begun() +
               Lines{getUser("alice"), format(1, 1001, ""), push("user:1001:"), getUser("alice", "user1"),
                     format(1, 1001, ""), push("user:1001:"), getUser("alice", "user1"),
                     format(1, 1001, "no slash: %s"), push("user:1001:no slash: %s")} +
               savedAs({"user:1001:", "user:1001:", "user:1001:no slash: %s"})));
}

TEST_F(ChrootSaveTest, FollowsTheListThatAPushMoves) {
    platform.pushMovesList = true;
    EXPECT_EQ(saveRules("[" + rule("user", "alice", "/a") + "," + rule("user", "alice", "/b") + "]").back(),
              succeeded());
    EXPECT_EQ(platform.rules, (Lines{"user:1001:/a", "user:1001:/b"}));
}

TEST_F(ChrootSaveTest, FailsWithoutAList) {
    platform.fail("VLIBCSzListAlloc");
    EXPECT_EQ(saveRules("[]"), begun() +
                                   Lines{logLine("chroot", "Failed to malloc for list.[0x%04X %s:%d]",
                                                 R"(0x2A, "account.c", 7)")} +
                                   failed("chroot", 1902, R"({"rules":[]})"));
}

TEST_F(ChrootSaveTest, FreesTheListWhenTheRulesCannotBeStored) {
    platform.fail("VELTFTPChrootRuleSave");
    EXPECT_EQ(saveRules("[]"), (begun() + Lines{save({}), failureOf("VELTFTPChrootRuleSave"), freeList} +
                                failed("chroot", 1902, R"({"rules":[]})")));
    EXPECT_EQ(platform.rules, Lines{"user:1:/old"});
}

TEST_F(ChrootSaveTest, TakesAPositiveResultForNoFailure) {
    platform.fail("VELTFTPChrootRuleSave", 1, 1);
    EXPECT_EQ(saveRules("[]"), begun() + savedAs({}));
}

TEST_F(ChrootSaveTest, StoresTheSameRulesWhenLoadedOnesAreSavedUnchanged) {
    const Lines rules = {"group:2002:/media", "user:1001:/home", "user:1002:/media/b", "user:1001:/home"};
    platform.rules = rules;
    run(FTPChrootUserLoad);
    Json::Value params;
    params["rules"] = answer().data["rules"];
    ASSERT_EQ(params["rules"].size(), 4U);
    ASSERT_TRUE(params["rules"][0].isMember("path_exist"));
    run(FTPChrootUserSave, params.toStyledString());
    EXPECT_EQ(platform.rules, rules);
    run(FTPChrootUserLoad);
    EXPECT_EQ(answer().data["rules"], params["rules"]);
}

TEST_F(ChrootSaveTest, FreesTheListWhenAnExceptionPasses) {
    const std::string params = R"({"rules":[)" + rule("user", "alice", "/a") + "]}";
    platform.throwFrom("VLIBCSzListPush");
    EXPECT_EQ(runThrowing<fake::Thrown>(FTPChrootUserSave, params),
              begun() + Lines({getUser("alice"), format(1, 1001, "/a"), push("user:1001:/a"), freeList}));
}

TEST_F(ChrootSaveTest, TakesTimeInProportionToTheRules) {
    const double small = secondsToSave(2000);
    EXPECT_LT(secondsToSave(20000), 40 * small + 0.5); // a quadratic one takes a hundred times as long
}
