// Where local and anonymous users may go.
#include "tests/system/support/ftp_service.h"

#include "standalone/contract/last_error.h"
#include "tests/standalone/support/store_shares.h"
#include "tests/support/files.h"
#include "tests/support/result.h"
#include "tests/support/text.h"
#include "tests/system/support/running_program.h"

#include <filesystem>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

std::string namesIn(FtpSession& session) {
    return session.receive("NLST").value_or("(refused)");
}

TEST_F(FtpService, confinedUsersSeeTheirHomesAsRoot) {
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    EXPECT_TRUE(contains(session.command("PWD").text, "\"/\""));
    EXPECT_EQ(session.receive("RETR /home-of"), "alice");
    session.command("CDUP");
    EXPECT_EQ(namesIn(session), "home-of\r\n");
}

TEST_F(FtpService, confinedUserWithoutAHomeIsRefused) {
    start();
    fs::rename("/mnt/home/carol", "/mnt/home/gone");
    EXPECT_EQ(FtpSession(port).logIn("carol"), 530);
    fs::rename("/mnt/home/gone", "/mnt/home/carol");
    EXPECT_EQ(FtpSession(port).logIn("carol"), 230);
}

TEST_F(FtpService, wrongPasswordIsRefused) {
    start();
    EXPECT_EQ(FtpSession(port).logIn("alice", "bob-secret"), 530);
    EXPECT_EQ(FtpSession(port).logIn("alice", ""), 530);
    EXPECT_EQ(FtpSession(port).logIn("root", "x"), 530);
    EXPECT_EQ(FtpSession(port).logIn("nobody-like-this", "x"), 530);
}

TEST_F(FtpService, unconfinedUsersSeeTheOfferedSharesSideBySide) {
    writeFile(addShare("music", "a/music", Access::none) / "song", "la");
    writeFile(addShare("odd \"name\" #%{env:HOME} ä", "b", Access::none) / "file", "odd");
    addShare("secret", "c", Access::none, false);
    record.user_chroot = 0;
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    EXPECT_TRUE(contains(session.command("PWD").text, "\"/\""));
    const std::string names = namesIn(session);
    EXPECT_TRUE(contains(names, "music")) << names;
    EXPECT_FALSE(contains(names, "secret")) << names;
    EXPECT_EQ(session.receive("RETR /music/song"), "la");
    EXPECT_EQ(session.receive("RETR /odd \"name\" #%{env:HOME} ä/file"), "odd");
    EXPECT_EQ(session.send("STOR /music/new", "x"), 226);
    EXPECT_EQ(session.command("MKD /made").code, 550) << "nobody writes beside the shares";
    EXPECT_FALSE(contains(contentsOf("/proc/self/mounts"), "velt-shares")) << "the server's own mounts stay";
}

TEST_F(FtpService, aShareThatStartsWithDotsIsShown) {
    writeFile(addShare("..data", "dots", Access::none) / "file", "dotted");
    record.user_chroot = 0;
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    EXPECT_EQ(session.receive("RETR /..data/file"), "dotted");
}

TEST_F(FtpService, aShareThatCannotBeMountedIsLeftOut) {
    writeFile(addShare("music", "music", Access::none) / "song", "la");
    // A folder of another mount namespace can be opened there, and not be mounted.
    const std::vector<std::string> asAlice = {"/usr/bin/setpriv", "--reuid=1001", "--regid=1001",
                                              "--clear-groups"};
    std::vector<std::string> sleeper = {"/usr/bin/unshare", "--mount"};
    sleeper.insert(sleeper.end(), asAlice.begin(), asAlice.end());
    sleeper.insert(sleeper.end(), {"/bin/sh", "-c", "echo ready; exec /bin/sleep 60"});
    auto elsewhere = RunningProgram::start(sleeper, {}, "/dev/null");
    ASSERT_EQ(elsewhere.readUntil("ready\n"), "ready\n");
    const std::string folder = "/proc/" + std::to_string(elsewhere.pid()) + "/root/usr";
    std::vector<std::string> look = asAlice;
    look.insert(look.end(), {"/usr/bin/test", "-r", folder});
    ASSERT_EQ(runProcess(look).exitCode, 0) << "alice can open it";
    auto shares = loadShares();
    ASSERT_TRUE(shares);
    shares->push_back({"stubborn", "", folder, true, {{"alice", Access::read}}, {}});
    ASSERT_EQ(messageOf(storeShares(*shares)), "");
    record.user_chroot = 0;
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    EXPECT_EQ(namesIn(session), "music\r\n");
    EXPECT_EQ(session.receive("RETR /music/song"), "la");
}

TEST_F(FtpService, anonymousUsersAreRefusedByDefault) {
    start();
    EXPECT_EQ(FtpSession(port).logIn("anonymous", "a@b"), 530);
    EXPECT_EQ(FtpSession(port).logIn("ftp", ""), 530);
}

TEST_F(FtpService, anonymousUsersAreConfinedToTheirShare) {
    writeFile(addShare("public", "pub \"x\" %{env:HOME}", Access::read) / "notice", "hello");
    addShare("music", "music", Access::write);
    letAnonymousIn("public");
    start();
    for (const char* user : {"anonymous", "ftp"}) {
        FtpSession session(port);
        ASSERT_EQ(session.logIn(user, ""), 230);
        EXPECT_EQ(namesIn(session), "notice\r\n");
        EXPECT_EQ(session.receive("RETR /notice"), "hello");
        EXPECT_EQ(session.send("STOR new", "x"), 550);
        EXPECT_EQ(session.command("DELE notice").code, 550);
        EXPECT_EQ(session.command("MKD new").code, 550);
    }
    EXPECT_EQ(FtpSession(port).logIn("alice"), 230) << "others are served as before";
}

TEST_F(FtpService, anonymousUsersWriteWhereThatIsGranted) {
    const auto folder = addShare("public", "public", Access::write);
    letAnonymousIn("public");
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("anonymous", "a@b"), 230);
    EXPECT_EQ(session.send("STOR new", "x"), 226);
    EXPECT_EQ(contentsOf(folder / "new"), "x");
}

TEST_F(FtpService, anonymousUsersAreRefusedWithoutTheirShare) {
    addShare("closed", "closed", Access::none);
    for (const char* share : {"closed", "absent"}) {
        letAnonymousIn(share);
        start();
        EXPECT_EQ(FtpSession(port).logIn("anonymous", "a@b"), 530) << share;
        EXPECT_EQ(FtpSession(port).logIn("alice"), 230) << share;
    }
}

TEST_F(FtpService, unconfinedAnonymousUsersSeeTheSharesTheyMayReach) {
    writeFile(addShare("readable", "r", Access::read) / "file", "r");
    addShare("writable", "w", Access::write);
    addShare("closed", "c", Access::none);
    letAnonymousIn();
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("anonymous", "a@b"), 230);
    const std::string names = namesIn(session);
    EXPECT_TRUE(contains(names, "readable")) << names;
    EXPECT_TRUE(contains(names, "writable")) << names;
    EXPECT_FALSE(contains(names, "closed")) << names;
    EXPECT_EQ(session.receive("RETR readable/file"), "r");
    EXPECT_EQ(session.send("STOR readable/new", "x"), 550);
    EXPECT_EQ(session.send("STOR writable/new", "x"), 226);
}

TEST_F(FtpService, confinedUsersDoNotSeeTheSharesOfAnonymousOnes) {
    addShare("readable", "r", Access::read);
    letAnonymousIn();
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("bob"), 230);
    EXPECT_EQ(namesIn(session), "home-of\r\n");
}

} // namespace
} // namespace velt::test
