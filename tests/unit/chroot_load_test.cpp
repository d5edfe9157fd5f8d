#include "module/entry_functions.h"
#include "tests/support/handler_test.h"

#include <ctime>
#include <stdexcept>

namespace {

using std::to_string;

constexpr char alloc[] = "VLIBCSzListAlloc(1024)";
constexpr char enumerate[] = "VELTFTPChrootRuleEnum(list1)";
constexpr char freeList[] = "VLIBCSzListFree(list1)";
constexpr char noRules[] = R"({"rules":[],"total":0})";

std::string parse(const std::string& line) {
    return "VELTFTPChrootRuleParseToName(\"" + line + "\", 492, 4096)";
}

/// A rule of the answer whose path is "/home", so that no share is looked up.
std::string homeRule(const std::string& type, const std::string& name) {
    return R"({"name":")" + name + R"(","path":"/home","path_exist":true,"type":")" + type + "\"}";
}

std::string answered(const std::string& rules, int total) {
    return succeeded(R"({"rules":[)" + rules + R"(],"total":)" + to_string(total) + "}");
}

class ChrootLoadTest : public HandlerTest {
protected:
    void SetUp() override {
        HandlerTest::SetUp();
        platform.users = {{"alice", {"", 1001}}, {"bob", {"", 1002}}};
        platform.groups = {{"staff", 2001}};
        platform.lastError = {0x2A, "rule.c", 7};
    }

    static std::string failureOf(const std::string& message) {
        return logLine("chroot", message + "[0x%04X %s:%d]", R"(0x2A, "rule.c", 7)");
    }

    /// The processor time, in seconds, of a request that loads `count` rules.
    double secondsToLoad(int count) {
        platform.rules.assign(static_cast<std::size_t>(count), "user:1001:/home");
        const std::clock_t begin = std::clock();
        run(FTPChrootUserLoad);
        EXPECT_EQ(answer().data["total"], Json::Value(count));
        return static_cast<double>(std::clock() - begin) / CLOCKS_PER_SEC;
    }
};

} // namespace

TEST_F(ChrootLoadTest, AnswersWithTheRulesOfUsersAndGroupsInTheirOrder) {
    platform.rules = {"group:2001:/home", "user:1002:/home", "user:1001:/home"};
    EXPECT_EQ(run(FTPChrootUserLoad),
              (Lines{alloc, enumerate, parse("group:2001:/home"), parse("user:1002:/home"),
                     parse("user:1001:/home"), freeList,
                     answered(homeRule("group", "staff") + "," + homeRule("user", "bob") + "," +
                                  homeRule("user", "alice"),
                              3)}));
    EXPECT_EQ(answer().data["total"].type(), Json::intValue);
}

TEST_F(ChrootLoadTest, AnswersWithNoRulesWhenNoneIsStored) {
    EXPECT_EQ(run(FTPChrootUserLoad), (Lines{alloc, enumerate, freeList, succeeded(noRules)}));
    EXPECT_EQ(run(FTPChrootUserLoad, "null").back(), succeeded(noRules));
}

TEST_F(ChrootLoadTest, AnswersWithTheExistenceOfASharesFolder) {
    platform.shares["media"] = {"", "/", 0};
    platform.rules = {"user:1001:/media", "user:1001:/gone/below"};
    EXPECT_EQ(run(FTPChrootUserLoad),
              (Lines{alloc, enumerate, parse("user:1001:/media"), R"(VELTShareGet("media", null))",
                     "VELTShareFree(share1)", parse("user:1001:/gone/below"), R"(VELTShareGet("gone", null))",
                     freeList,
                     answered(R"({"name":"alice","path":"/media","path_exist":true,"type":"user"},)"
                              R"({"name":"alice","path":"/gone/below","path_exist":false,"type":"user"})",
                              2)}));
}

TEST_F(ChrootLoadTest, LeavesLinesOutThatCannotBeParsedAndDoesNotCountThem) {
    platform.rules = {"no rule", "user:1001:/home", "user:9999:/home", "group:1001:/home", ""};
    EXPECT_EQ(run(FTPChrootUserLoad), (Lines{alloc, enumerate, parse("no rule"), parse("user:1001:/home"),
                                             parse("user:9999:/home"), parse("group:1001:/home"), parse(""),
                                             freeList, answered(homeRule("user", "alice"), 1)}));
}

TEST_F(ChrootLoadTest, AnswersWithNoRulesWhenNoLineCanBeParsed) {
    platform.rules = {"x", "y"};
    EXPECT_EQ(run(FTPChrootUserLoad),
              (Lines{alloc, enumerate, parse("x"), parse("y"), freeList, succeeded(noRules)}));
}

TEST_F(ChrootLoadTest, TakesAnyFlagButZeroForAUsersRule) {
    platform.rules = {"user:1001:/home", "group:2001:/home"};
    for (const int flag : {-1, 2, 256}) {
        platform.userFlag = flag;
        EXPECT_EQ(run(FTPChrootUserLoad).back(),
                  answered(homeRule("user", "alice") + "," + homeRule("group", "staff"), 2))
            << flag;
    }
}

TEST_F(ChrootLoadTest, KeepsWhatAParserLeavesAloneFromTheLineBefore) {
    platform.rules = {"user:1001:/home", "second", "group:2001:/home", "fourth"};
    for (const int nth : {2, 4}) {
        platform.fail("VELTFTPChrootRuleParseToName", nth, nth == 2 ? 0 : 1); // it fills nothing in
    }
    run(FTPChrootUserLoad);
    EXPECT_EQ(answer().data,
              json(R"({"rules":[)" + homeRule("user", "alice") + "," + homeRule("user", "alice") + "," +
                   homeRule("group", "staff") + "," + homeRule("group", "staff") + R"(],"total":4})"));
}

TEST_F(ChrootLoadTest, StartsFromAnEmptyPath) {
    platform.rules = {"first"};
    platform.fail("VELTFTPChrootRuleParseToName", 1, 0); // it fills nothing in
    EXPECT_EQ(runThrowing<std::out_of_range>(FTPChrootUserLoad),
              (Lines{alloc, enumerate, parse("first"), freeList}));
}

TEST_F(ChrootLoadTest, LetsTheLibrarysErrorPassForARuleWithAnEmptyPath) {
    platform.shares["media"] = {"", "/", 0};
    platform.rules = {"user:1001:/media", "user:1001:", "user:1001:/home"};
    EXPECT_EQ(runThrowing<std::out_of_range>(FTPChrootUserLoad),
              (Lines{alloc, enumerate, parse("user:1001:/media"), R"(VELTShareGet("media", null))",
                     "VELTShareFree(share1)", parse("user:1001:"), freeList}));
}

TEST_F(ChrootLoadTest, TakesNamesAndPathsOfTheLargestSizeThatItsBuffersHold) {
    const std::string name(491, 'n');
    const std::string share(4094, 's');
    platform.users[name] = {"", 1003};
    platform.users[name + "n"] = {"", 1004};
    platform.rules = {"user:1003:/" + share, "user:1003:/s" + share, "user:1004:/home"};
    run(FTPChrootUserLoad);
    Json::Value rule;
    rule["name"] = name;
    rule["type"] = "user";
    rule["path"] = "/" + share;
    rule["path_exist"] = false;
    ASSERT_EQ(answer().data["total"], Json::Value(1));
    EXPECT_EQ(answer().data["rules"][0], rule);
}

TEST_F(ChrootLoadTest, UsesAndFreesTheListThatTheEnumeratorPutInPlace) {
    platform.enumeratorsReplaceList = true;
    platform.rules = {"user:1001:/home"};
    EXPECT_EQ(run(FTPChrootUserLoad), (Lines{alloc, enumerate, parse("user:1001:/home"), freeList,
                                             answered(homeRule("user", "alice"), 1)}));
}

TEST_F(ChrootLoadTest, FailsWithoutAList) {
    platform.fail("VLIBCSzListAlloc");
    EXPECT_EQ(
        run(FTPChrootUserLoad, R"({"unread":1})"),
        (Lines{alloc, failureOf("Failed to malloc for list.")} + failed("chroot", 1902, R"({"unread":1})")));
    const std::string& text = platform.logLines.front().rendered;
    EXPECT_EQ(text.substr(text.find(' ')), " Failed to malloc for list.[0x002A rule.c:7]");
}

TEST_F(ChrootLoadTest, AsksForTheLastErrorOnceInTheOrderOfTheFailuresLogLine) {
    platform.journalErrorGets = true;
    platform.fail("VELTFTPChrootRuleEnum");
    EXPECT_EQ(run(FTPChrootUserLoad),
              (Lines{alloc, enumerate, "VLIBCErrGet()", "VLIBCErrorGetFile()", "VLIBCErrorGetLine()",
                     failureOf("Failed to VELTFTPChrootRuleEnum()."), freeList} +
               failed("chroot", 1902, "{}")));
}

TEST_F(ChrootLoadTest, FreesTheListWhenTheRulesCannotBeListed) {
    for (const bool replaced : {false, true}) {
        startAfresh();
        platform.failedEnumeratorsReplaceList = replaced;
        platform.fail("VELTFTPChrootRuleEnum");
        EXPECT_EQ(run(FTPChrootUserLoad),
                  (Lines{alloc, enumerate, failureOf("Failed to VELTFTPChrootRuleEnum()."), freeList} +
                   failed("chroot", 1902, "{}")));
    }
}

TEST_F(ChrootLoadTest, TakesAPositiveResultForNoFailure) {
    platform.fail("VELTFTPChrootRuleEnum", 1, 2);
    EXPECT_EQ(run(FTPChrootUserLoad), (Lines{alloc, enumerate, freeList, succeeded(noRules)}));
}

TEST_F(ChrootLoadTest, FreesTheListWhenAnExceptionPasses) {
    platform.rules = {"user:1001:/media"};
    platform.throwFrom("VELTShareGet");
    EXPECT_EQ(
        runThrowing<fake::Thrown>(FTPChrootUserLoad),
        (Lines{alloc, enumerate, parse("user:1001:/media"), R"(VELTShareGet("media", null))", freeList}));
}

TEST_F(ChrootLoadTest, TakesTimeInProportionToTheRules) {
    const double small = secondsToLoad(2000);
    EXPECT_LT(secondsToLoad(20000), 40 * small + 0.5); // a quadratic one takes a hundred times as long
}
