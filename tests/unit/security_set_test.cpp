#include "module/entry_functions.h"
#include "security/security.h"
#include "tests/support/handler_test.h"

#include <cstring>

namespace {

using std::to_string;

constexpr char readUmask[] = "VELTFTPUmaskEnabledGet()";

Lines begun() {
    return {getParams(), "VELTFTPConfGet()"};
}

/// The share access test of a share that the account "ftp" can reach.
Lines testedShare(const std::string& name) {
    return {"VELTShareGet(\"" + name + "\", null)", R"(VELTShareUGPrivGetLocal("ftp", share1))",
            "VELTShareFree(share1)"};
}

std::string stored(const std::string& differences) {
    return "VELTFTPConfSet({" + differences + "})";
}

/// The restart of the daemons, by the record's service flags.
Lines restarted(int serviceFlags) {
    Lines calls = {R"(VLIBServiceStop("ftpd", 0))", R"(VLIBServiceStop("ftpd-ssl", 0))"};
    if ((serviceFlags & 1) != 0) {
        calls.emplace_back(R"(VLIBServiceStart("ftpd", 0))");
    }
    if ((serviceFlags & 2) != 0) {
        calls.emplace_back(R"(VLIBServiceStart("ftpd-ssl", 0))");
    }
    return calls;
}

std::string entry(const std::string& event, const std::string& arg1) {
    return "VELTLogSet1(2, 1, " + event + ", \"" + arg1 + R"(", "", "", ""))";
}

class SecuritySetTest : public HandlerTest {
protected:
    void SetUp() override {
        HandlerTest::SetUp();
        platform.shares["public"] = {"", "/volume1/public", 2};
        platform.shares["Public"] = {"", "/volume1/Public", 2};
    }

    void storeShare(const std::string& name) {
        std::strcpy(platform.conf.anonymous_chroot_share, name.c_str());
    }

    Lines loggedBy(_tag_VELT_FTP_CONF_ oldConf, _tag_VELT_FTP_CONF_ newConf) {
        FTPSecurityServiceHandler handler(nullptr, nullptr);
        platform.journal.clear();
        handler.LogChanges(&oldConf, &newConf);
        return platform.journal;
    }
};

} // namespace

TEST_F(SecuritySetTest, DoesNothingForAnEmptyRequest) {
    EXPECT_EQ(run(FTPSecuritySet), begun() + Lines{succeeded()});
}

TEST_F(SecuritySetTest, TestsTheStoredShareForAnEmptyRequestToo) {
    platform.conf.anonymous_chroot = 1;
    storeShare("public");
    EXPECT_EQ(run(FTPSecuritySet), begun() + testedShare("public") + Lines{succeeded()});
}

TEST_F(SecuritySetTest, DoesNothingWhenEveryKeyHasTheStoredValue) {
    platform.conf.user_chroot = 5;
    platform.conf.anonymous = -1;
    platform.conf.anonymous_chroot = 2;
    platform.umask = 8;
    storeShare("public");
    EXPECT_EQ(run(FTPSecuritySet, R"({"user_chroot":true,"anonymous":true,"anonymous_chroot":true,)"
                                  R"("anonymous_chroot_share":"public","enable_umask":true})"),
              (begun() + testedShare("public") + Lines{readUmask, succeeded()}));
}

TEST_F(SecuritySetTest, StoresAndRestartsWhenTheUserChrootIsSwitched) {
    EXPECT_EQ(run(FTPSecuritySet, R"({"user_chroot":true})"),
              (begun() + Lines{stored("user_chroot: 1")} + restarted(0) +
               Lines{entry("0x11B00027", "enable"), succeeded()}));
    EXPECT_EQ(run(FTPSecuritySet, R"({"user_chroot":false})"),
              (begun() + Lines{stored("user_chroot: 0")} + restarted(0) +
               Lines{entry("0x11B00027", "disable"), succeeded()}));
}

TEST_F(SecuritySetTest, StoresAndRestartsWhenAnonymousLoginIsSwitched) {
    EXPECT_EQ(run(FTPSecuritySet, R"({"anonymous":true})"),
              (begun() + Lines{stored("anonymous: 1")} + restarted(0) +
               Lines{entry("0x11B00010", ""), succeeded()}));
    EXPECT_EQ(run(FTPSecuritySet, R"({"anonymous":false})"),
              (begun() + Lines{stored("anonymous: 0")} + restarted(0) +
               Lines{entry("0x11B00011", ""), succeeded()}));
}

TEST_F(SecuritySetTest, StoresAndRestartsWhenTheAnonymousChrootIsSwitched) {
    storeShare("public");
    EXPECT_EQ(run(FTPSecuritySet, R"({"anonymous_chroot":true})"),
              (begun() + testedShare("public") + Lines{stored("anonymous_chroot: 1")} + restarted(0) +
               Lines{entry("0x11B00026", "started"), succeeded()}));
    EXPECT_EQ(run(FTPSecuritySet, R"({"anonymous_chroot":false})"),
              (begun() + Lines{stored("anonymous_chroot: 0")} + restarted(0) +
               Lines{entry("0x11B00026", "stopped"), succeeded()}));
}

TEST_F(SecuritySetTest, StoresAnyShareUntestedWhileTheAnonymousChrootIsOff) {
    EXPECT_EQ(run(FTPSecuritySet, R"({"anonymous_chroot_share":"no such share"})"),
              (begun() + Lines{stored(R"(anonymous_chroot_share: "no such share")")} + restarted(0) +
               Lines{entry("0x11B00028", "no such share"), succeeded()}));
}

TEST_F(SecuritySetTest, StoresAnEmptyShareWhileTheAnonymousChrootIsOff) {
    storeShare("public");
    EXPECT_EQ(run(FTPSecuritySet, R"({"anonymous_chroot_share":""})"),
              (begun() + Lines{stored(R"(anonymous_chroot_share: "")")} + restarted(0) +
               Lines{entry("0x11B00028", ""), succeeded()}));
}

TEST_F(SecuritySetTest, TurnsTheAnonymousChrootOffAndEmptiesTheShareInOneRequest) {
    platform.conf.anonymous_chroot = 3;
    storeShare("gone");
    EXPECT_EQ(run(FTPSecuritySet, R"({"anonymous_chroot":false,"anonymous_chroot_share":""})"),
              (begun() + Lines{stored(R"(anonymous_chroot_share: "", anonymous_chroot: 0)")} + restarted(0) +
               Lines{entry("0x11B00026", "stopped"), entry("0x11B00028", ""), succeeded()}));
}

TEST_F(SecuritySetTest, ExchangesAShareThatIsGoneForOneThatCanBeReached) {
    platform.conf.anonymous_chroot = 1;
    storeShare("gone");
    EXPECT_EQ(run(FTPSecuritySet, R"({"anonymous_chroot_share":"public"})"),
              (begun() + testedShare("public") + Lines{stored(R"(anonymous_chroot_share: "public")")} +
               restarted(0) + Lines{entry("0x11B00028", "public"), succeeded()}));
}

TEST_F(SecuritySetTest, ConfinesAnonymousUsersToAShareOfOneLetter) {
    platform.shares["p"] = {"", "/volume1/p", 2};
    EXPECT_EQ(run(FTPSecuritySet, R"({"anonymous_chroot":true,"anonymous_chroot_share":"p"})"),
              (begun() + testedShare("p") +
               Lines{stored(R"(anonymous_chroot_share: "p", anonymous_chroot: 1)")} + restarted(0) +
               Lines{entry("0x11B00026", "started"), entry("0x11B00028", "p"), succeeded()}));
}

TEST_F(SecuritySetTest, WritesTheEntriesOfAllChangesInTheirOrder) {
    EXPECT_EQ(run(FTPSecuritySet, R"({"user_chroot":true,"anonymous":true,"anonymous_chroot":true,)"
                                  R"("anonymous_chroot_share":"public"})"),
              (begun() + testedShare("public") +
               Lines{stored(R"(anonymous_chroot_share: "public", anonymous: 1, anonymous_chroot: 1, )"
                            R"(user_chroot: 1)")} +
               restarted(0) +
               Lines{entry("0x11B00010", ""), entry("0x11B00026", "started"), entry("0x11B00028", "public"),
                     entry("0x11B00027", "enable"), succeeded()}));
}

TEST_F(SecuritySetTest, StoresAChangeOfLetterCaseButLogsNone) {
    platform.conf.anonymous_chroot = 1;
    storeShare("public");
    EXPECT_EQ(run(FTPSecuritySet, R"({"anonymous_chroot_share":"Public"})"),
              begun() + testedShare("Public") + Lines{stored(R"(anonymous_chroot_share: "Public")")} +
                  restarted(0) + Lines{succeeded()});
}

TEST_F(SecuritySetTest, LeavesAFieldThatCountsAsTheWantedValueAsItIs) {
    platform.conf.user_chroot = 5;
    EXPECT_EQ(run(FTPSecuritySet, R"({"user_chroot":true})"), begun() + Lines{succeeded()});
    EXPECT_EQ(run(FTPSecuritySet, R"({"user_chroot":true,"anonymous":true})"),
              (begun() + Lines{stored("anonymous: 1")} + restarted(0) +
               Lines{entry("0x11B00010", ""), succeeded()}));
    EXPECT_EQ(platform.conf.user_chroot, 5);
}

TEST_F(SecuritySetTest, StartsTheDaemonsWhoseServiceBitIsSet) {
    for (const int flags : {0, 1, 2, 3, 4, 5, 0x7FFFFFFE, -1}) {
        platform.conf.service_flags = flags;
        platform.conf.anonymous = 0;
        EXPECT_EQ(run(FTPSecuritySet, R"({"anonymous":true})"),
                  (begun() + Lines{stored("anonymous: 1")} + restarted(flags) +
                   Lines{entry("0x11B00010", ""), succeeded()}))
            << flags;
    }
}

TEST_F(SecuritySetTest, StoresTheUnchangedRecordAndRestartsWhenOnlyTheUmaskChanges) {
    platform.conf.service_flags = 3;
    EXPECT_EQ(run(FTPSecuritySet, R"({"enable_umask":true})"),
              (begun() + Lines{readUmask, "VELTFTPUmaskEnabledSet(true)", stored("")} + restarted(3) +
               Lines{succeeded()}));
    EXPECT_EQ(run(FTPSecuritySet, R"({"enable_umask":false})"),
              (begun() + Lines{readUmask, "VELTFTPUmaskEnabledSet(false)", stored("")} + restarted(3) +
               Lines{succeeded()}));
}

TEST_F(SecuritySetTest, TakesAUmaskThatCannotBeAskedForAsOn) {
    platform.fail("VELTFTPUmaskEnabledGet", 1);
    EXPECT_EQ(run(FTPSecuritySet, R"({"enable_umask":true})"), (begun() + Lines{readUmask, succeeded()}));
    platform.fail("VELTFTPUmaskEnabledGet", 2);
    EXPECT_EQ(run(FTPSecuritySet, R"({"enable_umask":false})"),
              (begun() + Lines{readUmask, "VELTFTPUmaskEnabledSet(false)", stored("")} + restarted(0) +
               Lines{succeeded()}));
}

TEST_F(SecuritySetTest, SetsTheUmaskAfterTheShareTestAndBeforeTheStore) {
    EXPECT_EQ(run(FTPSecuritySet, R"({"anonymous_chroot":true,"anonymous_chroot_share":"public",)"
                                  R"("enable_umask":true})"),
              (begun() + testedShare("public") +
               Lines{readUmask, "VELTFTPUmaskEnabledSet(true)",
                     stored(R"(anonymous_chroot_share: "public", anonymous_chroot: 1)")} +
               restarted(0) +
               Lines{entry("0x11B00026", "started"), entry("0x11B00028", "public"), succeeded()}));
}

TEST_F(SecuritySetTest, StoresAChangeThatComesWithTheUmaskAsItStands) {
    EXPECT_EQ(run(FTPSecuritySet, R"({"user_chroot":true,"enable_umask":false})"),
              (begun() + Lines{readUmask, stored("user_chroot: 1")} + restarted(0) +
               Lines{entry("0x11B00027", "enable"), succeeded()}));
}

TEST_F(SecuritySetTest, CutsAShareNameToWhatTheRecordHolds) {
    const std::string cut(491, 's');
    platform.shares[cut] = {"", "/volume1/s", 2};
    platform.conf.anonymous_chroot = 1;
    storeShare("public");
    for (const std::size_t size : {std::size_t{600}, std::size_t{492}}) {
        platform.conf = fake::State::defaultConf();
        platform.conf.anonymous_chroot = 1;
        storeShare("public");
        const Lines journal =
            run(FTPSecuritySet, R"({"anonymous_chroot_share":")" + std::string(size, 's') + "\"}");
        const std::string share = "share" + to_string(size == 600 ? 1 : 2);
        EXPECT_EQ(
            journal,
            (begun() +
             Lines{"VELTShareGet(\"" + cut + "\", null)", "VELTShareUGPrivGetLocal(\"ftp\", " + share + ")",
                   "VELTShareFree(" + share + ")", stored("anonymous_chroot_share: \"" + cut + "\"")} +
             restarted(0) + Lines{entry("0x11B00028", cut), succeeded()}));
        EXPECT_EQ(platform.conf.anonymous_chroot_share, cut);
    }
}

TEST_F(SecuritySetTest, FindsNoChangeInANameThatIsCutToTheStoredOne) {
    storeShare(std::string(491, 's'));
    EXPECT_EQ(run(FTPSecuritySet, R"({"anonymous_chroot_share":")" + std::string(600, 's') + "\"}"),
              begun() + Lines{succeeded()});
}

TEST_F(SecuritySetTest, FindsTheChangeOfALastByte) {
    const std::string head(490, 's');
    storeShare(head + "a");
    EXPECT_EQ(run(FTPSecuritySet, R"({"anonymous_chroot_share":")" + head + "b\"}"),
              (begun() + Lines{stored("anonymous_chroot_share: \"" + head + "b\"")} + restarted(0) +
               Lines{entry("0x11B00028", head + "b"), succeeded()}));
}

TEST_F(SecuritySetTest, TakesAShareNameForNoFormat) {
    EXPECT_EQ(run(FTPSecuritySet, R"({"anonymous_chroot_share":"%s%n"})"),
              (begun() + Lines{stored(R"(anonymous_chroot_share: "%s%n")")} + restarted(0) +
               Lines{entry("0x11B00028", "%s%n"), succeeded()}));
}

TEST_F(SecuritySetTest, LogsFieldsThatDifferThoughBothCountAsOn) {
    _tag_VELT_FTP_CONF_ oldConf{};
    oldConf.anonymous = 5;
    oldConf.anonymous_chroot = -1;
    oldConf.user_chroot = 2;
    _tag_VELT_FTP_CONF_ newConf{};
    newConf.anonymous = 1;
    newConf.anonymous_chroot = 1;
    newConf.user_chroot = 1;
    EXPECT_EQ(loggedBy(oldConf, newConf), (Lines{entry("0x11B00010", ""), entry("0x11B00026", "started"),
                                                 entry("0x11B00027", "enable")}));
}

TEST_F(SecuritySetTest, LogsNothingOfTheOtherFields) {
    _tag_VELT_FTP_CONF_ newConf{};
    newConf.service_flags = 3;
    newConf.enable_fxp = 1;
    std::strcpy(newConf.portnum, "2121");
    EXPECT_EQ(loggedBy({}, newConf), Lines{});
}
