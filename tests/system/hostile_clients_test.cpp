// What one client may not do to the others.
#include "tests/system/support/ftp_service.h"

#include "standalone/contract/last_error.h"
#include "tests/support/files.h"
#include "tests/support/text.h"
#include "tests/support/waiting.h"

#include <sys/stat.h>

#include <algorithm>
#include <filesystem>
#include <vector>

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

TEST_F(FtpService, strangersWriteNoControlCharactersToTheLog) {
    offerTls(true);
    start();
    FtpSession session(port);
    for (int i = 0; i < 2; i++) { // else it may wait for seconds, since it has not seen how long a name takes
        EXPECT_EQ(session.command("USER alice").code, 331);
    }
    for (const std::string& command :
         {std::string("USER a\x1b[31mb"), "USER " + std::string(300, '\x1b'), std::string("USER \x01"),
          std::string("USER a\xc2\x9b") + "31m", std::string("USER a\x7f"), std::string("HOST \x1b"),
          std::string("AUTH \x1b"), std::string("CLNT \x1b"), std::string("LANG \x1b"),
          std::string("OPTS \x1b"), std::string("PBSZ \x1b"), std::string("PROT \x1b"),
          std::string("CSID \x1b"), std::string("CWD \x1b"), std::string("RETR \x1b"),
          std::string("\x1b command")}) {
        EXPECT_EQ(session.command(command).code, 501) << command;
    }
    ASSERT_EQ(session.command("USER alice").code, 331);
    EXPECT_EQ(session.command("PASS \x1b").code, 530);
    ASSERT_EQ(session.logIn("alice"), 230);
    EXPECT_EQ(session.send("STOR odd\x1bname", "x"), 226) << "a file may have such a name";
    EXPECT_EQ(FtpSession(port).logIn("mall\xc3\xb6ry"), 530);
    const std::string log = DaemonProcess::output();
    EXPECT_TRUE(contains(log, "mall")) << log;
    for (const char* raw : {"\x1b", "\x01", "\x7f", "\xc2\x9b"}) {
        EXPECT_FALSE(contains(log, raw)) << log;
    }
}

TEST_F(FtpService, whoIsLoggedInIsNobodyElsesBusiness) {
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    const auto run = worldRoot / "run/velt/ftp";
    std::vector<std::string> found;
    for (const auto& entry : std::filesystem::recursive_directory_iterator(run)) {
        if (entry.path().extension() != ".conf") {
            found.push_back(entry.path());
        }
    }
    const auto board = std::ranges::find_if(
        found, [](const std::string& path) { return path.ends_with("proftpd.scoreboard"); });
    ASSERT_NE(board, found.end());
    const std::vector<std::string> list = {"ftpwho", "-f", *board};
    EXPECT_TRUE(contains(runProcess(list).output, "alice")) << "root sees it";
    const auto canRead = [](std::vector<std::string> rights, const std::string& path) {
        rights.insert(rights.end(), {"cat", path});
        return runProcess(rights).exitCode == 0;
    };
    const std::vector<std::string> others{"setpriv", "--reuid=1002", "--regid=1002", "--clear-groups"};
    EXPECT_TRUE(canRead(others, "/etc/passwd")) << "they can read what is for all";
    for (const std::string& path : found) {
        if (std::filesystem::is_regular_file(path)) {
            EXPECT_TRUE(canRead({"env"}, path)) << path;
            EXPECT_FALSE(canRead(others, path)) << path;
        }
    }
}

TEST_F(FtpService, nobodyGetsSetUserIdFiles) {
    const auto share = addShare("drop", "drop", Access::write);
    storeRules({"u:1002:/drop"});
    start();
    const std::vector<std::pair<std::string, std::filesystem::path>> users{{"alice", "/mnt/home/alice/tool"},
                                                                           {"bob", share / "tool"}};
    for (const auto& [user, file] : users) {
        FtpSession session(port);
        ASSERT_EQ(session.logIn(user), 230);
        ASSERT_EQ(session.send("STOR tool", "x"), 226);
        EXPECT_EQ(session.command("SITE CHMOD 755 tool").code, 200);
        for (const std::string mode : {"4755", "2755", "6711", "u+s", "g+s", "ug+srx"}) {
            EXPECT_EQ(session.command("SITE CHMOD " + mode + " tool").code, 550) << mode;
        }
        for (const std::string mode : {"4755", "2755"}) {
            EXPECT_EQ(session.command("MFF UNIX.mode=" + mode + "; tool").code, 501) << mode;
        }
        struct stat status {};
        ASSERT_EQ(stat(file.c_str(), &status), 0) << file;
        EXPECT_EQ(status.st_mode & 07777U, 0755U) << file;
    }
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
