#include "module/entry_functions.h"
#include "tests/support/handler_test.h"

#include <cstring>

namespace {

constexpr char readConf[] = "VELTFTPConfGet()";
constexpr char readUmask[] = "VELTFTPUmaskEnabledGet()";

class SecurityGetTest : public HandlerTest {};
class SecurityCheckTest : public HandlerTest {};

} // namespace

TEST_F(SecurityGetTest, AnswersWithTheFiveSettings) {
    EXPECT_EQ(run(FTPSecurityGet),
              (Lines{readConf, readUmask,
                     succeeded(R"({"anonymous":false,"anonymous_chroot":false,"anonymous_chroot_share":"",)"
                               R"("enable_umask":false,"user_chroot":false})")}));
}

TEST_F(SecurityGetTest, TakesEachSettingFromItsOwnField) {
    const std::string off = R"({"anonymous":false,"anonymous_chroot":false,"anonymous_chroot_share":"",)"
                            R"("enable_umask":false,"user_chroot":false})";
    const auto answerWith = [&off](const std::string& key, const std::string& value) {
        Json::Value answer = json(off);
        answer[key] = json(value);
        return answer;
    };
    platform.conf.user_chroot = 1;
    run(FTPSecurityGet);
    EXPECT_EQ(answer().data, answerWith("user_chroot", "true"));

    startAfresh();
    platform.conf.anonymous = 1;
    run(FTPSecurityGet);
    EXPECT_EQ(answer().data, answerWith("anonymous", "true"));

    startAfresh();
    platform.conf.anonymous_chroot = 1;
    run(FTPSecurityGet);
    EXPECT_EQ(answer().data, answerWith("anonymous_chroot", "true"));

    startAfresh();
    std::strcpy(platform.conf.anonymous_chroot_share, "Public \"1\"");
    run(FTPSecurityGet);
    EXPECT_EQ(answer().data, answerWith("anonymous_chroot_share", R"("Public \"1\"")"));

    startAfresh();
    platform.umask = 1;
    run(FTPSecurityGet);
    EXPECT_EQ(answer().data, answerWith("enable_umask", "true"));
}

TEST_F(SecurityGetTest, TakesAnyNumberButZeroForTrue) {
    platform.conf.user_chroot = 5;
    platform.conf.anonymous = -1;
    platform.conf.anonymous_chroot = 256;
    platform.umask = 2;
    EXPECT_EQ(run(FTPSecurityGet),
              (Lines{readConf, readUmask,
                     succeeded(R"({"anonymous":true,"anonymous_chroot":true,"anonymous_chroot_share":"",)"
                               R"("enable_umask":true,"user_chroot":true})")}));
}

TEST_F(SecurityGetTest, AnswersThatTheUmaskIsOnWhenItCannotBeAskedFor) {
    platform.fail("VELTFTPUmaskEnabledGet");
    EXPECT_EQ(run(FTPSecurityGet),
              (Lines{readConf, readUmask,
                     succeeded(R"({"anonymous":false,"anonymous_chroot":false,"anonymous_chroot_share":"",)"
                               R"("enable_umask":true,"user_chroot":false})")}));
}

TEST_F(SecurityGetTest, AnswersWithALongestNameInFull) {
    const std::string longest(491, 'n');
    std::strcpy(platform.conf.anonymous_chroot_share, longest.c_str());
    run(FTPSecurityGet);
    EXPECT_EQ(answer().data["anonymous_chroot_share"], Json::Value(longest));
}

TEST_F(SecurityGetTest, FailsWhenTheRecordCannotBeRead) {
    platform.fail("VELTFTPConfGet");
    EXPECT_EQ(run(FTPSecurityGet, R"({"unread":[1]})"),
              (Lines{readConf, logLine("security", "Failed to get FTP config.")} +
               failed("security", 1902, R"({"unread":[1]})")));
}

TEST_F(SecurityCheckTest, RefusesAnythingButABoolForASwitch) {
    for (const char* const key : {"user_chroot", "anonymous", "anonymous_chroot", "enable_umask"}) {
        for (const char* const value : {"1", "0", "1.0", R"("true")", R"("")", "[]", "[true]", "{}"}) {
            const std::string params = std::string("{\"") + key + "\":" + value + "}";
            EXPECT_EQ(run(FTPSecuritySet, params),
                      (Lines{getParams(), logLine("security", "Invalid type of input.")} +
                       failed("security", 1901, params)));
        }
    }
}

TEST_F(SecurityCheckTest, RefusesAnythingButATextForTheShare) {
    for (const char* const value : {"true", "false", "1", "2.5", "[]", R"(["public"])", "{}"}) {
        const std::string params = std::string(R"({"anonymous_chroot_share":)") + value + "}";
        EXPECT_EQ(run(FTPSecuritySet, params),
                  (Lines{getParams(), logLine("security", "Invalid type of input.")} +
                   failed("security", 1901, params)));
    }
}

TEST_F(SecurityCheckTest, ReportsSeveralMistakesOnce) {
    const std::string params = R"({"anonymous":1,"anonymous_chroot_share":2,"enable_umask":3})";
    EXPECT_EQ(run(FTPSecuritySet, params),
              (Lines{getParams(), logLine("security", "Invalid type of input.")} +
               failed("security", 1901, params)));
}

TEST_F(SecurityCheckTest, AppliesNothingOfARequestWithAMistakeInItsLastKey) {
    const std::string params = R"({"user_chroot":true,"enable_umask":"yes"})";
    EXPECT_EQ(run(FTPSecuritySet, params),
              (Lines{getParams(), logLine("security", "Invalid type of input.")} +
               failed("security", 1901, params)));
}

TEST_F(SecurityCheckTest, TakesNullForAnAbsentKey) {
    const std::string nothing = R"({"user_chroot":null,"anonymous":null,"anonymous_chroot":null,)"
                                R"("anonymous_chroot_share":null,"enable_umask":null})";
    EXPECT_EQ(run(FTPSecuritySet, nothing), (Lines{getParams(), readConf, succeeded()}));
    EXPECT_EQ(run(FTPSecuritySet, "null"), (Lines{getParams(), readConf, succeeded()}));
}

TEST_F(SecurityCheckTest, IgnoresUnknownKeys) {
    EXPECT_EQ(run(FTPSecuritySet, R"({"User_chroot":7,"share":[]})"),
              (Lines{getParams(), readConf, succeeded()}));
}

TEST_F(SecurityCheckTest, LetsTheJsonLibrarysErrorPassWhenTheParametersAreNoObject) {
    for (const char* const params : {"[]", "[true]", "7", "false", R"("anonymous")"}) {
        EXPECT_EQ(runThrowing<Json::LogicError>(FTPSecuritySet, params), Lines{getParams()}) << params;
    }
}
