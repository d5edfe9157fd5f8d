#include "module/entry_functions.h"
#include "security/security.h"
#include "tests/support/handler_test.h"

#include <limits>

namespace {

constexpr char alloc[] = "VLIBCSzListAlloc(1024)";
constexpr char enumerate[] = "VELTFTPShareEnum(list1, 0x207)";
constexpr char freeList[] = "VLIBCSzListFree(list1)";
constexpr char getShare[] = R"(VELTShareGet("media", null))";
constexpr char getPrivilege[] = R"(VELTShareUGPrivGetLocal("ftp", share1))";
constexpr char freeShare[] = "VELTShareFree(share1)";

class ShareListTest : public HandlerTest {};

class ShareAccessTest : public HandlerTest {
protected:
    void SetUp() override {
        HandlerTest::SetUp();
        platform.shares["media"] = {"", "/volume1/media", 2};
        platform.lastError = {0x2A, "share.c", 7};
    }

    /// Asks for access to "media". The handler has neither request nor response, so it would not get away
    /// with an answer.
    bool isAccessible() {
        FTPSecurityServiceHandler handler(nullptr, nullptr);
        platform.journal.clear();
        return handler.IsFTPShare("media");
    }

    static std::string failureOf(const std::string& call) {
        return logLine("security", "Fail to " + call + "().[0x%04X %s:%d]", R"(0x2A, "share.c", 7)");
    }
};

} // namespace

TEST_F(ShareListTest, AnswersWithTheSharesInTheirOrder) {
    platform.ftpShares = {"web", "Media", "backup", "web"};
    EXPECT_EQ(run(FTPSecurityShareGet),
              (Lines{alloc, enumerate, freeList, succeeded(R"({"share":["web","Media","backup","web"]})")}));
}

TEST_F(ShareListTest, LeavesTheHomeFoldersOutWhateverTheirLetterCase) {
    platform.ftpShares = {"HOMES", "Homes", "media"};
    EXPECT_EQ(run(FTPSecurityShareGet),
              (Lines{alloc, enumerate, freeList, succeeded(R"({"share":["media"]})")}));
    platform.ftpShares = {"homes", "hOmEs"};
    run(FTPSecurityShareGet);
    EXPECT_EQ(answer().data, json(R"({"share":[]})"));
}

TEST_F(ShareListTest, KeepsNamesThatOnlyContainHomes) {
    platform.ftpShares = {"home", "homes2", "myhomes", " homes", ""};
    EXPECT_EQ(run(FTPSecurityShareGet),
              (Lines{alloc, enumerate, freeList,
                     succeeded(R"({"share":["home","homes2","myhomes"," homes",""]})")}));
}

TEST_F(ShareListTest, AnswersWithAnEmptyArrayWhenThereIsNoShare) {
    EXPECT_EQ(run(FTPSecurityShareGet), (Lines{alloc, enumerate, freeList, succeeded(R"({"share":[]})")}));
}

TEST_F(ShareListTest, ReadsNoParameters) {
    platform.ftpShares = {"media"};
    EXPECT_EQ(run(FTPSecurityShareGet, "null").back(), succeeded(R"({"share":["media"]})"));
}

TEST_F(ShareListTest, UsesAndFreesTheListThatTheEnumeratorPutInPlace) {
    platform.enumeratorsReplaceList = true;
    for (int i = 0; i < 1500; ++i) {
        platform.ftpShares.push_back("share" + std::to_string(i));
    }
    EXPECT_EQ(run(FTPSecurityShareGet).size(), 4U);
    EXPECT_EQ(answer().data["share"].size(), 1500U);
    EXPECT_EQ(answer().data["share"][1499], Json::Value("share1499"));
}

TEST_F(ShareListTest, AsksForNoPrivilege) {
    platform.shares["media"] = {"", "/volume1/media", 0};
    platform.ftpShares = {"media"};
    EXPECT_EQ(run(FTPSecurityShareGet),
              (Lines{alloc, enumerate, freeList, succeeded(R"({"share":["media"]})")}));
}

TEST_F(ShareListTest, FailsWithoutAList) {
    platform.lastError = {0xBEEF, "list.c", 3};
    platform.fail("VLIBCSzListAlloc");
    EXPECT_EQ(run(FTPSecurityShareGet, R"({"unread":1})"),
              (Lines{alloc, logLine("security", "Failed to VLIBCSzListAlloc. Err = [%X]", "0xBEEF")} +
               failed("security", 1902, R"({"unread":1})")));
}

TEST_F(ShareListTest, FreesTheListWhenTheEnumerationFails) {
    platform.lastError = {0xBEEF, "list.c", 3};
    for (const bool replaced : {false, true}) {
        platform.failedEnumeratorsReplaceList = replaced;
        platform.fail("VELTFTPShareEnum", replaced ? 2 : 1);
        const std::string list = replaced ? "list2" : "list1";
        EXPECT_EQ(run(FTPSecurityShareGet),
                  (Lines{alloc, "VELTFTPShareEnum(" + list + ", 0x207)",
                         logLine("security", "Failed to VELTFTPShareEnum. Err = [%X]", "0xBEEF"),
                         "VLIBCSzListFree(" + list + ")"} +
                   failed("security", 1902, "{}")));
    }
    const std::string& text = platform.logLines.front().rendered;
    EXPECT_EQ(text.substr(text.find(' ')), " Failed to VELTFTPShareEnum. Err = [BEEF]");
}

TEST_F(ShareListTest, TakesAPositiveResultForNoFailure) {
    platform.fail("VELTFTPShareEnum", 1, 3);
    EXPECT_EQ(run(FTPSecurityShareGet), (Lines{alloc, enumerate, freeList, succeeded(R"({"share":[]})")}));
}

TEST_F(ShareListTest, FreesTheListWhenAnExceptionPasses) {
    platform.throwFrom("VELTFTPShareEnum");
    EXPECT_EQ(runThrowing<fake::Thrown>(FTPSecurityShareGet), (Lines{alloc, enumerate, freeList}));
    platform.ftpShares = {"media", "web"};
    platform.throwFrom("VLIBCSzListGet", 2);
    EXPECT_EQ(runThrowing<fake::Thrown>(FTPSecurityShareGet),
              (Lines{alloc, "VELTFTPShareEnum(list2, 0x207)", "VLIBCSzListFree(list2)"}));
}

TEST_F(ShareAccessTest, GrantsAccessByThePrivilegeOfTheFtpAccount) {
    EXPECT_TRUE(isAccessible());
    EXPECT_EQ(platform.journal, (Lines{getShare, getPrivilege, freeShare}));
}

TEST_F(ShareAccessTest, RefusesThePrivilegesNoneAndDenied) {
    for (const int privilege : {0, 4}) {
        startAfresh();
        platform.shares["media"].privilege = privilege;
        EXPECT_FALSE(isAccessible()) << privilege;
        EXPECT_EQ(platform.journal, (Lines{getShare, getPrivilege, freeShare}));
    }
}

TEST_F(ShareAccessTest, GrantsEveryOtherPrivilege) {
    for (const int privilege :
         {1, 2, 3, 5, 8, 36, -1, std::numeric_limits<int>::max(), std::numeric_limits<int>::min()}) {
        platform.shares["media"].privilege = privilege;
        EXPECT_TRUE(isAccessible()) << privilege;
    }
}

TEST_F(ShareAccessTest, RefusesAShareThatDoesNotExist) {
    platform.shares.clear();
    EXPECT_FALSE(isAccessible());
    EXPECT_EQ(platform.journal, (Lines{getShare, failureOf("VELTShareGet")}));
    const std::string& text = platform.logLines.front().rendered;
    EXPECT_EQ(text.substr(text.find(' ')), " Fail to VELTShareGet().[0x002A share.c:7]");
}

TEST_F(ShareAccessTest, FreesAShareThatAFailedLookUpLeftBehind) {
    platform.failedShareGetLeavesShare = true;
    platform.fail("VELTShareGet");
    EXPECT_FALSE(isAccessible());
    EXPECT_EQ(platform.journal, (Lines{getShare, failureOf("VELTShareGet"), freeShare}));
}

TEST_F(ShareAccessTest, RefusesAndFreesTheShareWhenThePrivilegeCannotBeAskedFor) {
    platform.fail("VELTShareUGPrivGetLocal");
    EXPECT_FALSE(isAccessible());
    EXPECT_EQ(platform.journal,
              (Lines{getShare, getPrivilege, failureOf("VELTShareUGPrivGetLocal"), freeShare}));
}

TEST_F(ShareAccessTest, StartsFromNoPrivilege) {
    platform.fail("VELTShareUGPrivGetLocal", 1, 0); // it succeeds and fills nothing in
    EXPECT_FALSE(isAccessible());
    EXPECT_EQ(platform.journal, (Lines{getShare, getPrivilege, freeShare}));
}
