// What "save" makes of rules that are no objects, or whose keys have other types: what the JSON library does
// with them.

#include "module/entry_functions.h"
#include "tests/support/handler_test.h"

namespace {

constexpr char alloc[] = "VLIBCSzListAlloc(1024)";
constexpr char freeList[] = "VLIBCSzListFree(list1)";

class ChrootSaveTypesTest : public HandlerTest {
protected:
    void SetUp() override {
        HandlerTest::SetUp();
        platform.users = {{"alice", {"", 1001}}, {"7", {"", 1007}}, {"true", {"", 1008}}, {"", {"", 1009}}};
        platform.groups = {{"", 2000}, {"staff", 2001}, {"2.5", 2002}};
        platform.rules = {"user:1:/old"};
    }

    /// The calls between the list's allocation and its end of a request with one rule.
    Lines callsFor(const std::string& rule) {
        platform.rules = {"user:1:/old"};
        const std::string list = "list" + std::to_string(++requests_);
        Lines journal = run(FTPChrootUserSave, R"({"rules":[)" + rule + "]}");
        EXPECT_EQ(Lines(journal.begin(), journal.begin() + 2), (Lines{getParams(), alloc}));
        EXPECT_EQ(Lines(journal.end() - 2, journal.end()),
                  (Lines{"VLIBCSzListFree(" + list + ")", succeeded()}));
        return {journal.begin() + 2, journal.end() - 2};
    }

    /// A rule that is looked up as `lookUp`, "VELTUserGet" or "VELTGroupGet", and stored as `line`.
    void expectStored(const std::string& rule, const std::string& lookUp, const std::string& name, int id,
                      const std::string& path) {
        SCOPED_TRACE(rule);
        const bool isUser = lookUp == "VELTUserGet";
        const std::string line = (isUser ? "user:" : "group:") + std::to_string(id) + ":" + path;
        const Lines calls = callsFor(rule);
        const std::string list = "list" + std::to_string(requests_);
        EXPECT_EQ(calls, (Lines{lookUp + "(\"" + name + "\", null)",
                                "VELTFTPChrootRuleFormat(2048, " + std::string(isUser ? "1, " : "0, ") +
                                    std::to_string(id) + ", \"" + path + "\")",
                                "VLIBCSzListPush(" + list + ", \"" + line + "\")",
                                "VELTFTPChrootRuleSave(" + list + " flags=0 [\"" + line + "\"])"}));
    }

    /// A request that the JSON library's error ends, after `calls`. The stored rules stay.
    void expectLogicError(const std::string& params, const Lines& calls) {
        startAfresh();
        EXPECT_EQ(runThrowing<Json::LogicError>(FTPChrootUserSave, params),
                  (Lines{getParams(), alloc} + calls + Lines{freeList}))
            << params;
        EXPECT_EQ(platform.rules, Lines{"user:1:/old"}) << params;
    }

private:
    int requests_ = 0;
};

} // namespace

TEST_F(ChrootSaveTypesTest, RefusesRulesThatAreAnObjectWithMembers) {
    expectLogicError(R"({"rules":{"0":{"type":"user"}}})", {});
    expectLogicError(R"({"rules":{"type":"user","name":"alice","path":"/a"}})", {});
}

TEST_F(ChrootSaveTypesTest, RefusesParametersThatAreNoObject) {
    for (const char* const params : {"[]", R"([{"type":"user"}])", "7", "true", R"("rules")"}) {
        expectLogicError(params, {});
    }
}

TEST_F(ChrootSaveTypesTest, RefusesRulesThatAreNoObjects) {
    for (const char* const rule : {"7", "1.5", "true", "false", R"("user")", R"("")", "[]", R"(["user"])"}) {
        expectLogicError(std::string(R"({"rules":[)") + rule + "]}", {});
    }
}

TEST_F(ChrootSaveTypesTest, TakesNullForAGroupRuleOfEmptyTexts) {
    expectStored("null", "VELTGroupGet", "", 2000, "");
}

TEST_F(ChrootSaveTypesTest, TakesAbsentAndNullKeysForEmptyTexts) {
    expectStored("{}", "VELTGroupGet", "", 2000, "");
    expectStored(R"({"type":null,"name":null,"path":null})", "VELTGroupGet", "", 2000, "");
    expectStored(R"({"type":"user"})", "VELTUserGet", "", 1009, "");
    expectStored(R"({"name":"staff"})", "VELTGroupGet", "staff", 2001, "");
    expectStored(R"({"type":"user","path":"/a"})", "VELTUserGet", "", 1009, "/a");
}

TEST_F(ChrootSaveTypesTest, TakesNumbersAndBoolsForTheirTexts) {
    expectStored(R"({"type":"user","name":7,"path":-5})", "VELTUserGet", "7", 1007, "-5");
    expectStored(R"({"type":"user","name":true,"path":false})", "VELTUserGet", "true", 1008, "false");
    expectStored(R"({"type":7,"name":2.5,"path":0.25})", "VELTGroupGet", "2.5", 2002, "0.25");
    expectStored(R"({"type":true,"name":"staff","path":18446744073709551615})", "VELTGroupGet", "staff", 2001,
                 "18446744073709551615");
}

TEST_F(ChrootSaveTypesTest, IgnoresOtherKeysOfAnyType) {
    expectStored(R"({"type":"user","name":"alice","path":"/a","path_exist":[{}],"Path":"/b"})", "VELTUserGet",
                 "alice", 1001, "/a");
}

TEST_F(ChrootSaveTypesTest, RefusesATypeThatIsNoText) {
    for (const char* const type : {"[]", R"(["user"])", "{}"}) {
        expectLogicError(std::string(R"({"rules":[{"type":)") + type + R"(,"name":"alice","path":"/a"}]})",
                         {});
    }
}

TEST_F(ChrootSaveTypesTest, RefusesANameThatIsNoText) {
    for (const char* const name : {"[]", R"(["alice"])", "{}"}) {
        expectLogicError(std::string(R"({"rules":[{"type":"user","name":)") + name + R"(,"path":"/a"}]})",
                         {});
    }
}

TEST_F(ChrootSaveTypesTest, RefusesAPathThatIsNoTextOnceTheNameIsFound) {
    for (const char* const path : {"[]", R"(["/a"])", "{}"}) {
        expectLogicError(std::string(R"({"rules":[{"type":"user","name":"alice","path":)") + path + "}]}",
                         {R"(VELTUserGet("alice", null))"});
    }
}

TEST_F(ChrootSaveTypesTest, NeverLooksAtThePathOfARuleThatIsDropped) {
    platform.lastError = {0x2A, "account.c", 7};
    EXPECT_EQ(callsFor(R"({"type":"user","name":"ghost","path":[]})"),
              (Lines{R"(VELTUserGet("ghost", null))",
                     logLine("chroot", "Failed to VELTUserGet(). [%s][0x%04X %s:%d]",
                             R"("ghost", 0x2A, "account.c", 7)"),
                     "VELTFTPChrootRuleSave(list1 flags=0 [])"}));
}

TEST_F(ChrootSaveTypesTest, StoresNothingOfTheRulesBeforeOneThatEndsTheRequest) {
    expectLogicError(R"({"rules":[{"type":"user","name":"alice","path":"/a"},7]})",
                     {R"(VELTUserGet("alice", null))", R"(VELTFTPChrootRuleFormat(2048, 1, 1001, "/a"))",
                      R"(VLIBCSzListPush(list1, "user:1001:/a"))"});
}
