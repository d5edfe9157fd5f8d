// Where local and anonymous users may go.
#include "tests/system/support/ftp_service.h"

#include "standalone/core/last_error.h"

#include <filesystem>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

bool contains(const std::string& text, const std::string& part) {
    return text.find(part) != std::string::npos;
}

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
    writeFile(addShare("music", "a/music", ShareGrant::none) / "song", "la");
    writeFile(addShare("odd \"name\" #%{env:HOME} ä", "b", ShareGrant::none) / "file", "odd");
    addShare("secret", "c", ShareGrant::none, false);
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
    EXPECT_FALSE(contains(readFileText("/proc/self/mounts"), "velt-shares"))
        << "the server's own mounts stay";
}

TEST_F(FtpService, aShareThatStartsWithDotsIsShown) {
    writeFile(addShare("..data", "dots", ShareGrant::none) / "file", "dotted");
    record.user_chroot = 0;
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    EXPECT_EQ(session.receive("RETR /..data/file"), "dotted");
}

TEST_F(FtpService, aShareThatCannotBeMountedIsLeftOut) {
    writeFile(addShare("music", "music", ShareGrant::none) / "song", "la");
    // A folder of another mount name space can be seen there, and not be mounted.
    auto shares = allShares();
    ASSERT_TRUE(shares);
    shares->push_back({"stubborn", "", "/proc/1/root/usr", true, {}, {}});
    ASSERT_TRUE(fs::is_directory(shares->back().path));
    ASSERT_EQ(saveShares(*shares), 0) << lastErrorSentence();
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
    writeFile(addShare("public", "pub \"x\" %{env:HOME}", ShareGrant::read) / "notice", "hello");
    addShare("music", "music", ShareGrant::write);
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
    const auto folder = addShare("public", "public", ShareGrant::write);
    letAnonymousIn("public");
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("anonymous", "a@b"), 230);
    EXPECT_EQ(session.send("STOR new", "x"), 226);
    EXPECT_EQ(readFileText(folder / "new"), "x");
}

TEST_F(FtpService, anonymousUsersAreRefusedWithoutTheirShare) {
    addShare("closed", "closed", ShareGrant::none);
    for (const char* share : {"closed", "absent"}) {
        letAnonymousIn(share);
        start();
        EXPECT_EQ(FtpSession(port).logIn("anonymous", "a@b"), 530) << share;
        EXPECT_EQ(FtpSession(port).logIn("alice"), 230) << share;
    }
}

TEST_F(FtpService, unconfinedAnonymousUsersSeeTheSharesTheyMayReach) {
    writeFile(addShare("readable", "r", ShareGrant::read) / "file", "r");
    addShare("writable", "w", ShareGrant::write);
    addShare("closed", "c", ShareGrant::none);
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
    addShare("readable", "r", ShareGrant::read);
    letAnonymousIn();
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("bob"), 230);
    EXPECT_EQ(namesIn(session), "home-of\r\n");
}

} // namespace
} // namespace velt::test
