// What one client may not do to the others.
#include "tests/system/support/ftp_service.h"

#include "standalone/contract/last_error.h"
#include "tests/support/files.h"
#include "tests/support/text.h"
#include "tests/support/waiting.h"

#include <sys/stat.h>

#include <filesystem>

namespace velt::test {
namespace {

TEST_F(FtpService, whatIsUploadedIsNoRuleForAnybody) {
    const auto share = addShare("drop", "drop", Access::write);
    letAnonymousIn("drop");
    record.user_chroot = 0;
    start();
    FtpSession guest(port);
    ASSERT_EQ(guest.logIn("anonymous", "x@"), 230);
    ASSERT_EQ(guest.send("STOR .ftpaccess", "<Limit ALL>\nDenyAll\n</Limit>\nUmask 000\n"), 226);
    ASSERT_TRUE(std::filesystem::exists(share / ".ftpaccess"));
    FtpSession another(port);
    ASSERT_EQ(another.logIn("anonymous", "x@"), 230);
    EXPECT_EQ(another.send("STOR guest", "x"), 226) << "the guest's file forbids it";
    FtpSession alice(port);
    ASSERT_EQ(alice.logIn("alice"), 230);
    ASSERT_EQ(alice.command("CWD /drop").code, 250);
    EXPECT_EQ(alice.send("STOR mine", "x"), 226) << "the guest's file forbids it";
    struct stat status {};
    ASSERT_EQ(stat((share / "mine").c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 0777U, 0644U);
}

TEST_F(FtpService, whoDoesNotLogInIsSentAway) {
    start();
    FtpSession silent(port);
    ASSERT_EQ(silent.greeting().code, 220);
    const auto begin = Clock::now();
    int code = 0;
    while (code == 0 && secondsSince(begin) < 45) {
        code = silent.read().code; // which waits for 20 seconds
    }
    EXPECT_EQ(code, 421);
    EXPECT_GT(secondsSince(begin), 25);
}

TEST_F(FtpService, nobodyGetsSetUserIdFiles) {
    addShare("drop", "drop", Access::write);
    letAnonymousIn("drop");
    start();
    FtpSession alice(port);
    ASSERT_EQ(alice.logIn("alice"), 230);
    ASSERT_EQ(alice.send("STOR tool", "x"), 226);
    EXPECT_EQ(alice.command("SITE CHMOD 755 tool").code, 200);
    for (const std::string mode : {"4755", "2755", "6711", "u+s", "g+s", "ug+srx"}) {
        EXPECT_EQ(alice.command("SITE CHMOD " + mode + " tool").code, 550) << mode;
    }
    for (const std::string mode : {"4755", "2755"}) {
        EXPECT_EQ(alice.command("MFF UNIX.mode=" + mode + "; tool").code, 501) << mode;
    }
    struct stat status {};
    ASSERT_EQ(stat("/mnt/home/alice/tool", &status), 0);
    EXPECT_EQ(status.st_mode & 07777U, 0755U);
}

TEST_F(FtpService, guestsChangeNoModes) {
    const auto share = addShare("drop", "drop", Access::write);
    letAnonymousIn("drop");
    start();
    FtpSession guest(port);
    ASSERT_EQ(guest.logIn("anonymous", "x@"), 230);
    ASSERT_EQ(guest.send("STOR left", "x"), 226);
    EXPECT_EQ(guest.command("SITE CHMOD 600 left").code, 550);
    EXPECT_EQ(guest.command("MFF UNIX.mode=600; left").code, 550);
    struct stat status {};
    ASSERT_EQ(stat((share / "left").c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777U, 0644U);
}

} // namespace
} // namespace velt::test
