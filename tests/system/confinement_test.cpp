// Where local users may go, over each protocol, and where guests may, who come over FTP alone.
#include "standalone/contract/last_error.h"
#include "tests/standalone/support/store_shares.h"
#include "tests/support/files.h"
#include "tests/support/result.h"
#include "tests/support/text.h"
#include "tests/system/support/each_protocol.h"
#include "tests/system/support/running_program.h"

#include <filesystem>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

constexpr auto none = Access::none;
constexpr auto read = Access::read;
constexpr auto write = Access::write;

std::string namesIn(FtpSession& session) {
    return session.receive("NLST").value_or("(refused)");
}

class Confinement : public EachProtocol {
protected:
    void confineToHomes() {
        record.user_chroot = 1;
        start();
    }
};

TEST_P(Confinement, showsAUserTheHomeAsRoot) {
    confineToHomes();
    const auto session = logIn();
    EXPECT_EQ(session->read("/home-of"), "alice");
    EXPECT_EQ(rootOf("alice"), "home-of");
    for (const char* path : {"/etc/passwd", "/mnt/home/bob/home-of", "/../etc/passwd", "/../bob/home-of",
                             "/proc/self/environ"}) {
        EXPECT_FALSE(session->read(path)) << path;
    }
    EXPECT_TRUE(session->write("/sent", "x"));
    EXPECT_EQ(contentsOf("/mnt/home/alice/sent"), "x");
    EXPECT_FALSE(contains(contentsOf("/proc/self/mounts"), "/run/sshd")) << "the server's own mounts stay";
}

TEST_P(Confinement, refusesAUserWithoutAHome) {
    confineToHomes();
    fs::rename("/mnt/home/carol", "/mnt/home/gone");
    EXPECT_TRUE(isRefused("carol"));
    fs::rename("/mnt/home/gone", "/mnt/home/carol");
    EXPECT_FALSE(isRefused("carol"));
}

TEST_P(Confinement, refusesAWrongPassword) {
    confineToHomes();
    EXPECT_FALSE(tryToLogIn("alice", "bob-secret")->isLoggedIn());
    EXPECT_FALSE(tryToLogIn("alice", "")->isLoggedIn());
    EXPECT_FALSE(tryToLogIn("root", "x")->isLoggedIn());
    EXPECT_FALSE(tryToLogIn("nobody-like-this", "x")->isLoggedIn());
}

TEST_P(Confinement, showsTheOfferedSharesSideBySide) {
    writeFile(addShare("music", "a/music", none) / "song", "la");
    writeFile(addShare("odd \"name\" #%{env:HOME} ä", "b", none) / "file", "odd");
    addShare("secret", "c", none, false);
    start();
    const auto session = logIn();
    EXPECT_EQ(rootOf("alice"), "music odd \"name\" #%{env:HOME} ä");
    EXPECT_EQ(session->read("/music/song"), "la");
    EXPECT_EQ(session->read("/odd \"name\" #%{env:HOME} ä/file"), "odd");
    EXPECT_TRUE(session->write("/music/new", "x"));
    EXPECT_FALSE(session->makeFolder("/made")) << "nobody writes beside the shares";
    EXPECT_FALSE(contains(contentsOf("/proc/self/mounts"), "velt-shares")) << "the server's own mounts stay";
}

TEST_P(Confinement, showsAShareThatStartsWithDots) {
    writeFile(addShare("..data", "dots", none) / "file", "dotted");
    start();
    EXPECT_EQ(logIn()->read("/..data/file"), "dotted");
}

// Each way out that a user might try, with what it leads to.
TEST_P(Confinement, hasNoWayOut) {
    share("rw", {{"alice", write}});
    share("ro", {{"alice", read}});
    share("no", {{"alice", none}});
    share("outer", {{"alice", write}});
    share("inner", {{"alice", none}}, {}, "/mnt/srv/outer/a/inner");
    for (const char* target : {"/etc/passwd", "/mnt/srv/no/file", "../no/file", "/no/file"}) {
        fs::create_symlink(target, "/mnt/srv/rw/to" + std::to_string(std::hash<std::string>()(target)));
    }
    start();
    const auto session = logIn();
    EXPECT_EQ(rootOf("alice"), "outer ro rw");
    for (const std::string path :
         {"/etc/passwd", "/../etc/passwd", "/mnt/home/bob/home-of", "/no/file", "/mnt/srv/no/file",
          "/rw/../no/file", "/outer/a/inner/file", "/inner/file"}) {
        EXPECT_FALSE(session->read(path)) << path;
        EXPECT_FALSE(session->write(path, "x")) << path;
    }
    for (const auto& entry : fs::directory_iterator("/mnt/srv/rw")) {
        if (entry.is_symlink()) {
            EXPECT_FALSE(session->read("/rw/" + entry.path().filename().string())) << entry.path();
            EXPECT_FALSE(session->write("/rw/" + entry.path().filename().string(), "x")) << entry.path();
        }
    }
    EXPECT_FALSE(session->enter("/outer/a/inner"));
    EXPECT_EQ(session->read("/ro/file"), "ro");
    EXPECT_FALSE(session->write("/ro/file", "x"));
    EXPECT_EQ(contentsOf("/mnt/srv/no/file") + contentsOf("/mnt/srv/ro/file"), "noro");
    EXPECT_EQ(contentsOf("/mnt/srv/outer/a/inner/file"), "inner");
}

TEST_P(Confinement, leavesAShareOutThatCannotBeMounted) {
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
    const auto session = logIn();
    EXPECT_EQ(namesIn(*session), "music");
    EXPECT_EQ(session->read("/music/song"), "la");
}

TEST_P(Confinement, followsASettingThatChangedSinceTheStart) {
    share("rw", {{"alice", write}});
    start();
    EXPECT_EQ(rootOf("alice"), "rw");
    record.user_chroot = 1;
    if (overFtp()) {
        start(); // FTP has it from its own configuration, and is started with each change of its settings
    } else {
        ASSERT_EQ(VELTFTPConfSet(record), 0);
    }
    EXPECT_EQ(rootOf("alice"), "home-of");
}

// Guests are the account "ftp", which has no password.
TEST_P(Confinement, letsGuestsInOverFtpAlone) {
    addShare("public", "public", read);
    letAnonymousIn();
    start();
    EXPECT_EQ(tryToLogIn("anonymous", "a@b")->isLoggedIn(), overFtp());
    EXPECT_EQ(tryToLogIn("ftp", "")->isLoggedIn(), overFtp());
}

VELT_OVER_EACH_PROTOCOL(Confinement);

TEST_F(FtpService, anonymousUsersAreRefusedByDefault) {
    start();
    EXPECT_EQ(FtpSession(port).logIn("anonymous", "a@b"), 530);
    EXPECT_EQ(FtpSession(port).logIn("ftp", ""), 530);
}

TEST_F(FtpService, anonymousUsersAreConfinedToTheirShare) {
    writeFile(addShare("public", "pub \"x\" %{env:HOME}", read) / "notice", "hello");
    addShare("music", "music", write);
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
    const auto folder = addShare("public", "public", write);
    letAnonymousIn("public");
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("anonymous", "a@b"), 230);
    EXPECT_EQ(session.send("STOR new", "x"), 226);
    EXPECT_EQ(contentsOf(folder / "new"), "x");
}

TEST_F(FtpService, anonymousUsersAreRefusedWithoutTheirShare) {
    addShare("closed", "closed", none);
    for (const char* share : {"closed", "absent"}) {
        letAnonymousIn(share);
        start();
        EXPECT_EQ(FtpSession(port).logIn("anonymous", "a@b"), 530) << share;
        EXPECT_EQ(FtpSession(port).logIn("alice"), 230) << share;
    }
}

TEST_F(FtpService, unconfinedAnonymousUsersSeeTheSharesTheyMayReach) {
    writeFile(addShare("readable", "r", read) / "file", "r");
    addShare("writable", "w", write);
    addShare("closed", "c", none);
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
    addShare("readable", "r", read);
    letAnonymousIn();
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("bob"), 230);
    EXPECT_EQ(namesIn(session), "home-of\r\n");
}

} // namespace
} // namespace velt::test
