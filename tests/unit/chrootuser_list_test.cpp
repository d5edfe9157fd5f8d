#include "module/entry_functions.h"
#include "tests/support/handler_test.h"

#include <ctime>
#include <limits>

namespace {

using std::to_string;

constexpr char alloc[] = "VLIBCSzListAlloc(1024)";
constexpr char freeList[] = "VLIBCSzListFree(list1)";
constexpr int intMax = std::numeric_limits<int>::max();
constexpr int intMin = std::numeric_limits<int>::min();

std::string enumerated(bool chroot, const std::string& arguments = "1, null, null") {
    return (chroot ? "VELTFTPChrootUserEnum(list1, " : "VELTFTPNonChrootUserEnum(list1, ") + arguments + ")";
}

/// The look-up of a known user's description; `nth` user that the request loads.
Lines described(const std::string& name, int nth) {
    const std::string user = "sdkuser" + to_string(nth);
    return {"SDK::User::LoadUser(\"" + name + "\")", "SDK::User::GetDesc(" + user + ")",
            "SDK::User::Release(" + user + ")"};
}

Lines rejected(const std::string& message, const std::string& params) {
    return Lines{getParams(), logLine("chrootuser", message)} + failed("chrootuser", 1901, params);
}

class ChrootUserListTest : public HandlerTest {
protected:
    /// Five chroot users that are known to no user library, so that their descriptions are empty.
    void listFive() { platform.chrootUsers = {"u0", "u1", "u2", "u3", "u4"}; }

    /// The digits of the users on the page that `params` asks for; `total` must be the full count.
    std::string page(const std::string& params) {
        run(FTPChrootUserList, params);
        EXPECT_EQ(answer().data["total"], Json::Value(5)) << params;
        EXPECT_TRUE(answer().data["user"].isArray()) << params;
        std::string digits;
        for (const Json::Value& user : answer().data["user"]) {
            digits += user["id"].asString().substr(1);
        }
        return digits;
    }

    static std::string at(int offset) { return R"({"chroot":true,"offset":)" + to_string(offset) + "}"; }

    static std::string at(int offset, int limit) {
        return R"({"chroot":true,"offset":)" + to_string(offset) + R"(,"limit":)" + to_string(limit) + "}";
    }

    /// The processor time, in seconds, of a request that lists `count` users.
    double secondsToList(int count) {
        startAfresh();
        for (int i = 0; i < count; ++i) {
            platform.chrootUsers.push_back("user" + to_string(i));
        }
        const std::clock_t begin = std::clock();
        run(FTPChrootUserList, R"({"chroot":true})");
        EXPECT_EQ(answer().data["user"].size(), static_cast<unsigned>(count));
        return static_cast<double>(std::clock() - begin) / CLOCKS_PER_SEC;
    }
};

} // namespace

TEST_F(ChrootUserListTest, ListsTheChrootUsersWithTheirDescriptions) {
    platform.chrootUsers = {"bob", "alice"};
    platform.users = {{"alice", {"Alice A.", 1001}}, {"bob", {"", 1002}}};
    EXPECT_EQ(run(FTPChrootUserList, R"({"chroot":true})"),
              (Lines{getParams(), alloc, enumerated(true)} + described("bob", 1) + described("alice", 2) +
               Lines{freeList, succeeded(R"({"total":2,"user":[{"descr":"","id":"bob","name":"bob"},)"
                                         R"({"descr":"Alice A.","id":"alice","name":"alice"}]})")}));
}

TEST_F(ChrootUserListTest, ListsTheOtherUsers) {
    platform.chrootUsers = {"alice"};
    platform.nonChrootUsers = {"carol"};
    platform.users = {{"carol", {"C.", 1003}}};
    EXPECT_EQ(
        run(FTPChrootUserList, R"({"chroot":false})"),
        (Lines{getParams(), alloc, enumerated(false)} + described("carol", 1) +
         Lines{freeList, succeeded(R"({"total":1,"user":[{"descr":"C.","id":"carol","name":"carol"}]})")}));
}

TEST_F(ChrootUserListTest, DescribesAUserThatCannotBeLoadedWithAnEmptyText) {
    platform.chrootUsers = {"ghost", "alice"};
    platform.users = {{"alice", {"Alice", 1001}}};
    EXPECT_EQ(run(FTPChrootUserList, R"({"chroot":true})"),
              (Lines{getParams(), alloc, enumerated(true), R"(SDK::User::LoadUser("ghost"))"} +
               described("alice", 1) +
               Lines{freeList, succeeded(R"({"total":2,"user":[{"descr":"","id":"ghost","name":"ghost"},)"
                                         R"({"descr":"Alice","id":"alice","name":"alice"}]})")}));
}

TEST_F(ChrootUserListTest, AnswersWithAnEmptyArrayWhenThereIsNoUser) {
    for (const bool chroot : {true, false}) {
        startAfresh();
        EXPECT_EQ(
            run(FTPChrootUserList, chroot ? R"({"chroot":true})" : R"({"chroot":false})"),
            (Lines{getParams(), alloc, enumerated(chroot), freeList, succeeded(R"({"total":0,"user":[]})")}));
    }
}

TEST_F(ChrootUserListTest, WantsChrootToBeABool) {
    for (const char* const params :
         {"{}", "null", R"({"chroot":null})", R"({"chroot":"true"})", R"({"chroot":1})", R"({"chroot":[]})",
          R"({"chroot":{}})", R"({"chroot":"x","offset":"y"})"}) {
        EXPECT_EQ(run(FTPChrootUserList, params), rejected("bool variable 'chroot' is missing.", params));
    }
}

TEST_F(ChrootUserListTest, WantsTheNumbersToBeIntegers) {
    for (const char* const key : {"offset", "limit"}) {
        for (const char* const value :
             {R"("1")", "1.5", "true", "[]", "{}", "2147483648", "-2147483649", "1e300"}) {
            const std::string params = std::string(R"({"chroot":true,")") + key + "\":" + value + "}";
            EXPECT_EQ(run(FTPChrootUserList, params), rejected("Invalid type of input.", params));
        }
    }
}

TEST_F(ChrootUserListTest, WantsTheTextsToBeTexts) {
    for (const char* const key : {"type", "domain_name", "substr"}) {
        for (const char* const value : {"1", "1.5", "false", "[]", R"(["local"])", "{}"}) {
            const std::string params = std::string(R"({"chroot":false,")") + key + "\":" + value + "}";
            EXPECT_EQ(run(FTPChrootUserList, params), rejected("Invalid type of input.", params));
        }
    }
}

TEST_F(ChrootUserListTest, TakesNullForAnAbsentKey) {
    EXPECT_EQ(run(FTPChrootUserList, R"({"chroot":true,"offset":null,"limit":null,"type":null,)"
                                     R"("domain_name":null,"substr":null})"),
              (Lines{getParams(), alloc, enumerated(true), freeList, succeeded(R"({"total":0,"user":[]})")}));
}

TEST_F(ChrootUserListTest, TakesARealWithoutFractionForAnInteger) {
    listFive();
    EXPECT_EQ(page(R"({"chroot":true,"offset":1.0,"limit":2.0})"), "12");
}

TEST_F(ChrootUserListTest, LetsTheJsonLibrarysErrorPassWhenTheParametersAreNoObject) {
    for (const char* const params : {"[]", "[true]", "7", "true", R"("chroot")"}) {
        EXPECT_EQ(runThrowing<Json::LogicError>(FTPChrootUserList, params), Lines{getParams()}) << params;
    }
}

TEST_F(ChrootUserListTest, ChoosesTheSourceByTypeWithoutRegardToCase) {
    const std::pair<const char*, int> sources[] = {
        {"local", 1}, {"domain", 2}, {"ldap", 8},  {"all", 11},    {"LOCAL", 1}, {"Domain", 2}, {"LDAP", 8},
        {"aLL", 11},  {"", 1},       {"ldaps", 1}, {" domain", 1}, {"al", 1},    {"11", 1},     {"nis", 1},
    };
    for (const auto& [type, code] : sources) {
        for (const bool chroot : {true, false}) {
            startAfresh();
            const std::string flag = chroot ? "true" : "false";
            EXPECT_EQ(run(FTPChrootUserList, R"({"chroot":)" + flag + R"(,"type":")" + type + "\"}"),
                      (Lines{getParams(), alloc, enumerated(chroot, to_string(code) + ", null, null"),
                             freeList, succeeded(R"({"total":0,"user":[]})")}))
                << type;
        }
    }
}

TEST_F(ChrootUserListTest, HandsTheSubstringAndTheDomainOn) {
    for (const bool chroot : {true, false}) {
        startAfresh();
        const std::string flag = chroot ? "true" : "false";
        EXPECT_EQ(run(FTPChrootUserList,
                      R"({"chroot":)" + flag + R"(,"type":"domain","substr":"al","domain_name":"CORP"})"),
                  (Lines{getParams(), alloc, enumerated(chroot, R"(2, "al", "CORP")"), freeList,
                         succeeded(R"({"total":0,"user":[]})")}));
    }
}

TEST_F(ChrootUserListTest, TakesAnEmptySubstringForNoneButHandsAnEmptyDomainOn) {
    EXPECT_EQ(run(FTPChrootUserList, R"({"chroot":true,"substr":"","domain_name":""})"),
              (Lines{getParams(), alloc, enumerated(true, R"(1, null, "")"), freeList,
                     succeeded(R"({"total":0,"user":[]})")}));
}

TEST_F(ChrootUserListTest, HandsASubstringThatBeginsWithNulOnAsAnEmptyTextAndNotAsNone) {
    EXPECT_EQ(run(FTPChrootUserList, R"({"chroot":true,"substr":"\u0000al"})"),
              (Lines{getParams(), alloc, enumerated(true, R"(1, "", null)"), freeList,
                     succeeded(R"({"total":0,"user":[]})")}));
}

TEST_F(ChrootUserListTest, ListsEverythingWithoutOffsetAndLimit) {
    listFive();
    EXPECT_EQ(page(R"({"chroot":true})"), "01234");
    EXPECT_EQ(page(R"({"chroot":true,"limit":-1})"), "01234");
}

TEST_F(ChrootUserListTest, BeginsAtTheOffset) {
    listFive();
    EXPECT_EQ(page(at(0)), "01234");
    EXPECT_EQ(page(at(1)), "1234");
    EXPECT_EQ(page(at(4)), "4");
    EXPECT_EQ(page(at(2, -1)), "234");
}

TEST_F(ChrootUserListTest, YieldsTheFirstPageForAnOffsetOutsideTheList) {
    listFive();
    for (const int offset : {5, 6, intMax, -1, -5, intMin}) {
        EXPECT_EQ(page(at(offset)), "01234") << offset;
        EXPECT_EQ(page(at(offset, 2)), "01") << offset;
    }
}

TEST_F(ChrootUserListTest, EndsAtTheLimitOrTheEndOfTheList) {
    listFive();
    EXPECT_EQ(page(at(0, 1)), "0");
    EXPECT_EQ(page(at(1, 3)), "123");
    EXPECT_EQ(page(at(1, 4)), "1234");
    EXPECT_EQ(page(at(1, 5)), "1234");
    EXPECT_EQ(page(R"({"chroot":true,"limit":2})"), "01");
}

TEST_F(ChrootUserListTest, EndsAtTheEndOfTheListWhenOffsetAndLimitExceedTheLargestInteger) {
    listFive();
    for (const int limit : {intMax, intMax - 1, intMax - 3}) {
        EXPECT_EQ(page(at(4, limit)), "4") << limit;
        EXPECT_EQ(page(at(intMax, limit)), "01234") << limit;
    }
}

TEST_F(ChrootUserListTest, YieldsAnEmptyPageForALimitOfZeroOrBelowMinusOne) {
    listFive();
    for (const int limit : {0, -2, -5, intMin + 1, intMin}) {
        EXPECT_EQ(page(at(0, limit)), "") << limit;
        EXPECT_EQ(page(at(3, limit)), "") << limit;
        EXPECT_EQ(page(at(-1, limit)), "") << limit;
    }
}

TEST_F(ChrootUserListTest, LoadsOnlyTheUsersOfThePage) {
    listFive();
    EXPECT_EQ(run(FTPChrootUserList, at(3, 1)),
              (Lines{getParams(), alloc, enumerated(true), R"(SDK::User::LoadUser("u3"))", freeList,
                     succeeded(R"({"total":5,"user":[{"descr":"","id":"u3","name":"u3"}]})")}));
}

TEST_F(ChrootUserListTest, UsesAndFreesTheListThatTheEnumeratorPutInPlace) {
    platform.enumeratorsReplaceList = true;
    listFive();
    EXPECT_EQ(page(at(1, 2)), "12");
    platform.nonChrootUsers = {"u9"};
    run(FTPChrootUserList, R"({"chroot":false})");
    EXPECT_EQ(answer().data, json(R"({"total":1,"user":[{"id":"u9","name":"u9","descr":""}]})"));
}

TEST_F(ChrootUserListTest, FailsWithoutAList) {
    platform.fail("VLIBCSzListAlloc");
    const std::string params = R"({"chroot":true})";
    EXPECT_EQ(run(FTPChrootUserList, params),
              (Lines{getParams(), alloc, logLine("chrootuser", "Failed to malloc for list.")} +
               failed("chrootuser", 1902, params)));
}

TEST_F(ChrootUserListTest, FreesTheListWhenTheChrootUsersCannotBeListed) {
    for (const bool replaced : {false, true}) {
        startAfresh();
        platform.failedEnumeratorsReplaceList = replaced;
        platform.fail("VELTFTPChrootUserEnum");
        const std::string params = R"({"chroot":true})";
        EXPECT_EQ(run(FTPChrootUserList, params),
                  (Lines{getParams(), alloc, enumerated(true),
                         logLine("chrootuser", "Failed to get chroot user list."), freeList} +
                   failed("chrootuser", 1902, params)));
    }
}

TEST_F(ChrootUserListTest, FreesTheListWhenTheOtherUsersCannotBeListed) {
    for (const bool replaced : {false, true}) {
        startAfresh();
        platform.failedEnumeratorsReplaceList = replaced;
        platform.fail("VELTFTPNonChrootUserEnum");
        const std::string params = R"({"chroot":false})";
        EXPECT_EQ(run(FTPChrootUserList, params),
                  (Lines{getParams(), alloc, enumerated(false),
                         logLine("chrootuser", "Failed to get non chroot user list."), freeList} +
                   failed("chrootuser", 1902, params)));
    }
}

TEST_F(ChrootUserListTest, TakesAPositiveResultForNoFailure) {
    platform.fail("VELTFTPChrootUserEnum", 1, 4);
    platform.fail("VELTFTPNonChrootUserEnum", 1, 4);
    for (const char* const params : {R"({"chroot":true})", R"({"chroot":false})"}) {
        EXPECT_EQ(run(FTPChrootUserList, params).back(), succeeded(R"({"total":0,"user":[]})"));
    }
}

TEST_F(ChrootUserListTest, FreesWhatItHoldsWhenAnExceptionPasses) {
    platform.chrootUsers = {"alice"};
    platform.users = {{"alice", {"Alice", 1001}}};
    platform.throwFrom("SDK::User::GetDesc");
    EXPECT_EQ(runThrowing<fake::Thrown>(FTPChrootUserList, R"({"chroot":true})"),
              (Lines{getParams(), alloc, enumerated(true)} + described("alice", 1) + Lines{freeList}));
    platform.throwFrom("SDK::User::LoadUser", 2);
    runThrowing<fake::Thrown>(FTPChrootUserList, R"({"chroot":true})");
    EXPECT_EQ(platform.journal.back(), "VLIBCSzListFree(list2)");
}

TEST_F(ChrootUserListTest, TouchesOnlyThePageOfALongList) {
    for (int i = 0; i < 100000; ++i) {
        platform.chrootUsers.push_back("user" + to_string(i));
    }
    run(FTPChrootUserList, at(50000, 10));
    EXPECT_EQ(answer().data["total"], Json::Value(100000));
    EXPECT_EQ(answer().data["user"][9]["name"], Json::Value("user50009"));
    EXPECT_EQ(platform.count("SDK::User::LoadUser"), 10);
    EXPECT_LE(platform.count("VLIBCSzListGet"), 20);
}

TEST_F(ChrootUserListTest, TakesTimeInProportionToTheList) {
    const double small = secondsToList(10000);
    EXPECT_LT(secondsToList(100000), 40 * small + 0.5); // a quadratic one takes a hundred times as long
}
