#include "module/entry_functions.h"
#include "tests/support/handler_test.h"

#include <cstring>

namespace {

constexpr char stopPlain[] = R"(VLIBServiceStop("ftpd", 0))";
constexpr char stopTls[] = R"(VLIBServiceStop("ftpd-ssl", 0))";
constexpr char startPlain[] = R"(VLIBServiceStart("ftpd", 0))";
constexpr char startTls[] = R"(VLIBServiceStart("ftpd-ssl", 0))";
constexpr char storeUserChroot[] = "VELTFTPConfSet({user_chroot: 1})";
constexpr char userChrootOn[] = R"({"user_chroot":true})";
constexpr char emptyShare[] =
    "Anonymous chroot share setting cannot be empty when anonymous chroot is enabled.";
constexpr char unreachableShare[] = "This anonymous chroot share is not accessible by ftp.";

Lines begun() {
    return {getParams(), "VELTFTPConfGet()"};
}

class SecuritySetFailureTest : public HandlerTest {
protected:
    void SetUp() override {
        HandlerTest::SetUp();
        platform.conf.service_flags = 3;
        platform.lastError = {0x2A, "share.c", 7};
    }

    void chrootAnonymous(const std::string& share) {
        platform.conf.anonymous_chroot = 1;
        std::strcpy(platform.conf.anonymous_chroot_share, share.c_str());
    }

    static Lines failedWith(const std::string& message, int code, const std::string& params) {
        return Lines{logLine("security", message)} + failed("security", code, params);
    }
};

} // namespace

TEST_F(SecuritySetFailureTest, FailsWhenTheRecordCannotBeRead) {
    platform.fail("VELTFTPConfGet");
    EXPECT_EQ(run(FTPSecuritySet, userChrootOn),
              begun() + failedWith("Failed to get FTP config.", 1902, userChrootOn));
}

TEST_F(SecuritySetFailureTest, RefusesEveryRequestWhileTheStoredChrootHasNoShare) {
    chrootAnonymous("");
    for (const char* const params :
         {"{}", userChrootOn, R"({"enable_umask":true})", R"({"anonymous_chroot":true})",
          R"({"anonymous_chroot_share":""})", R"({"anonymous":true})"}) {
        EXPECT_EQ(run(FTPSecuritySet, params), begun() + failedWith(emptyShare, 1902, params));
    }
    platform.conf.anonymous_chroot = -5;
    EXPECT_EQ(run(FTPSecuritySet), begun() + failedWith(emptyShare, 1902, "{}"));
}

TEST_F(SecuritySetFailureTest, RefusesTheChrootWithoutAShare) {
    const std::string params = R"({"anonymous_chroot":true})";
    EXPECT_EQ(run(FTPSecuritySet, params), begun() + failedWith(emptyShare, 1902, params));
}

TEST_F(SecuritySetFailureTest, RefusesEveryRequestWhileTheStoredShareCannotBeReached) {
    chrootAnonymous("gone");
    for (const char* const params : {"{}", userChrootOn, R"({"enable_umask":true})",
                                     R"({"anonymous_chroot":true,"anonymous_chroot_share":"gone"})"}) {
        EXPECT_EQ(
            run(FTPSecuritySet, params),
            (begun() +
             Lines{R"(VELTShareGet("gone", null))",
                   logLine("security", "Fail to VELTShareGet().[0x%04X %s:%d]", R"(0x2A, "share.c", 7)")} +
             failedWith(unreachableShare, 1905, params)));
    }
}

TEST_F(SecuritySetFailureTest, AcceptsTheRequestThatTurnsTheChrootToAGoneShareOff) {
    chrootAnonymous("gone");
    EXPECT_EQ(
        run(FTPSecuritySet, R"({"anonymous_chroot":false})"),
        (begun() + Lines{"VELTFTPConfSet({anonymous_chroot: 0})", stopPlain, stopTls, startPlain, startTls,
                         R"(VELTLogSet1(2, 1, 0x11B00026, "stopped", "", "", ""))", succeeded()}));
}

TEST_F(SecuritySetFailureTest, RefusesAShareThatTheAccountHasNoPrivilegeOn) {
    platform.shares["secret"] = {"", "/volume1/secret", 0};
    chrootAnonymous("secret");
    EXPECT_EQ(run(FTPSecuritySet, userChrootOn),
              (begun() +
               Lines{R"(VELTShareGet("secret", null))", R"(VELTShareUGPrivGetLocal("ftp", share1))",
                     "VELTShareFree(share1)"} +
               failedWith(unreachableShare, 1905, userChrootOn)));
}

TEST_F(SecuritySetFailureTest, LooksACutNameUp) {
    const std::string params = R"({"anonymous_chroot_share":")" + std::string(600, 's') + "\"}";
    platform.shares[std::string(600, 's')] = {"", "/volume1/s", 2};
    platform.conf.anonymous_chroot = 1;
    EXPECT_EQ(run(FTPSecuritySet, params),
              (begun() +
               Lines{"VELTShareGet(\"" + std::string(491, 's') + "\", null)",
                     logLine("security", "Fail to VELTShareGet().[0x%04X %s:%d]", R"(0x2A, "share.c", 7)")} +
               failedWith(unreachableShare, 1905, params)));
}

TEST_F(SecuritySetFailureTest, StoresNothingWhenTheUmaskCannotBeSet) {
    platform.fail("VELTFTPUmaskEnabledSet");
    const std::string params = R"({"user_chroot":true,"enable_umask":true})";
    EXPECT_EQ(run(FTPSecuritySet, params),
              (begun() + Lines{"VELTFTPUmaskEnabledGet()", "VELTFTPUmaskEnabledSet(true)"} +
               failedWith("Failed to set FTP umask.", 1902, params)));
}

TEST_F(SecuritySetFailureTest, KeepsTheNewUmaskWhenTheStoreFails) {
    platform.fail("VELTFTPConfSet");
    const std::string params = R"({"enable_umask":true})";
    EXPECT_EQ(run(FTPSecuritySet, params),
              (begun() +
               Lines{"VELTFTPUmaskEnabledGet()", "VELTFTPUmaskEnabledSet(true)", "VELTFTPConfSet({})"} +
               failedWith("Failed to set FTP config.", 1902, params)));
    EXPECT_EQ(platform.umask, 1);
}

TEST_F(SecuritySetFailureTest, RestartsNothingWhenTheStoreFails) {
    platform.fail("VELTFTPConfSet");
    EXPECT_EQ(run(FTPSecuritySet, userChrootOn),
              begun() + Lines{storeUserChroot} + failedWith("Failed to set FTP config.", 1902, userChrootOn));
}

TEST_F(SecuritySetFailureTest, EndsWithThePlainDaemonThatCannotBeStopped) {
    platform.fail("VLIBServiceStop", 1);
    EXPECT_EQ(run(FTPSecuritySet, userChrootOn), (begun() + Lines{storeUserChroot, stopPlain} +
                                                  failedWith("Failed to disable FTP.", 1902, userChrootOn)));
    EXPECT_EQ(platform.conf.user_chroot, 1) << "what is stored stays";
}

TEST_F(SecuritySetFailureTest, EndsWithTheTlsDaemonThatCannotBeStopped) {
    platform.fail("VLIBServiceStop", 2);
    EXPECT_EQ(run(FTPSecuritySet, userChrootOn), (begun() + Lines{storeUserChroot, stopPlain, stopTls} +
                                                  failedWith("Failed to disable FTP.", 1902, userChrootOn)));
}

TEST_F(SecuritySetFailureTest, EndsWithThePlainDaemonThatCannotBeStarted) {
    platform.fail("VLIBServiceStart", 1);
    EXPECT_EQ(run(FTPSecuritySet, userChrootOn),
              (begun() + Lines{storeUserChroot, stopPlain, stopTls, startPlain} +
               failedWith("Failed to enable FTP.", 1902, userChrootOn)));
}

TEST_F(SecuritySetFailureTest, EndsWithTheTlsDaemonThatCannotBeStarted) {
    platform.fail("VLIBServiceStart", 2);
    EXPECT_EQ(run(FTPSecuritySet, userChrootOn),
              (begun() + Lines{storeUserChroot, stopPlain, stopTls, startPlain, startTls} +
               failedWith("Failed to enable FTPES.", 1902, userChrootOn)));
}

TEST_F(SecuritySetFailureTest, IgnoresTheFailureOfALogEntry) {
    platform.fail("VELTLogSet1");
    EXPECT_EQ(run(FTPSecuritySet, userChrootOn),
              (begun() + Lines{storeUserChroot, stopPlain, stopTls, startPlain, startTls,
                               R"(VELTLogSet1(2, 1, 0x11B00027, "enable", "", "", ""))", succeeded()}));
}

TEST_F(SecuritySetFailureTest, TakesAPositiveResultForNoFailure) {
    for (const char* const operation : {"VELTFTPConfGet", "VELTFTPUmaskEnabledSet", "VELTFTPConfSet",
                                        "VLIBServiceStop", "VLIBServiceStart"}) {
        SCOPED_TRACE(operation);
        startAfresh();
        platform.fail(operation, 1, 1);
        EXPECT_EQ(run(FTPSecuritySet, R"({"user_chroot":true,"enable_umask":true})").back(), succeeded());
        EXPECT_TRUE(platform.logLines.empty()) << operation;
    }
}

TEST_F(SecuritySetFailureTest, FreesTheShareWhenAnExceptionPasses) {
    platform.shares["public"] = {"", "/volume1/public", 2};
    chrootAnonymous("public");
    platform.throwFrom("VELTShareUGPrivGetLocal");
    EXPECT_EQ(runThrowing<fake::Thrown>(FTPSecuritySet),
              begun() + Lines({R"(VELTShareGet("public", null))", R"(VELTShareUGPrivGetLocal("ftp", share1))",
                               "VELTShareFree(share1)"}));
}
