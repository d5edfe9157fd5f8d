// What nobody moves over FTP: the folders that chroot rules of others lead to.
#include "tests/support/files.h"
#include "tests/system/support/shared_folders.h"

namespace velt::test {
namespace {
namespace fs = std::filesystem;

constexpr Access write = Access::write;

class RuleFolders : public SharedFolders {
protected:
    void SetUp() override {
        SharedFolders::SetUp();
        pub_ = share("pub", {{"alice", write}, {"bob", write}, {"ftp", write}});
        makeFolder("a/x", 0777);
        makeFolder("a", 0777);
        makeFolder("dept", 0700);
        writeFile(pub_ / "dept/secret", "secret", bobId);
        letAnonymousIn();
        storeRules({"u:1002:/pub/a/x"});
        start();
    }

    void makeFolder(const std::string& name, mode_t mode) const {
        fs::create_directories(pub_ / name);
        EXPECT_EQ(chown((pub_ / name).c_str(), bobId, bobId), 0);
        EXPECT_EQ(chmod((pub_ / name).c_str(), mode), 0);
    }
    static int move(FtpSession& session, const std::string& from, const std::string& to) {
        const int known = session.command("RNFR " + from).code;
        return known == 350 ? session.command("RNTO " + to).code : known;
    }

    fs::path pub_;
};

TEST_F(RuleFolders, stayWhereTheyAre) {
    FtpSession alice(port);
    ASSERT_EQ(alice.logIn("alice"), 230);
    FtpSession guest(port);
    ASSERT_EQ(guest.logIn("anonymous", "x@"), 230);
    for (FtpSession* const session : {&alice, &guest}) {
        for (const char* const folder : {"/pub/a/x", "/pub/a"}) {
            EXPECT_EQ(move(*session, folder, "/pub/away"), 550) << folder;
            EXPECT_EQ(session->command(std::string("RMD ") + folder).code, 550) << folder;
        }
        EXPECT_EQ(session->send("STOR /pub/a/x/new", "x"), 226) << "what is in it is free";
        EXPECT_EQ(move(*session, "/pub/a/x/new", "/pub/a/new"), 250);
        ASSERT_EQ(session->command("MKD /pub/free").code, 257);
        EXPECT_EQ(move(*session, "/pub/free", "/pub/freed"), 250);
        EXPECT_EQ(session->command("RMD /pub/freed").code, 250);
    }
}

TEST_F(RuleFolders, areNotPutInPlaceWhileTheyAreMissing) {
    fs::remove(pub_ / "a/x");
    FtpSession alice(port);
    ASSERT_EQ(alice.logIn("alice"), 230);
    EXPECT_EQ(move(alice, "/pub/dept", "/pub/a/x"), 550);
    EXPECT_EQ(move(alice, "/pub/dept", "/pub/a/X"), 550) << "some file systems know no difference";
    EXPECT_EQ(alice.command("MKD /pub/a/x").code, 550);
    EXPECT_EQ(alice.send("STOR /pub/a/x", "x"), 550);
    EXPECT_EQ(alice.command("MKD /pub/a/y").code, 257);
    EXPECT_EQ(FtpSession(port).logIn("bob"), 530);
}

TEST_F(RuleFolders, areReachedByLinksThatStay) {
    fs::rename(pub_ / "a/x", pub_ / "real");
    fs::create_directory_symlink("real", pub_ / "x");
    storeRules({"u:1002:/pub/x"});
    FtpSession alice(port);
    ASSERT_EQ(alice.logIn("alice"), 230);
    EXPECT_EQ(alice.command("DELE /pub/x").code, 550);
    EXPECT_EQ(move(alice, "/pub/x", "/pub/y"), 550);
    EXPECT_EQ(move(alice, "/pub/real", "/pub/y"), 550);
    EXPECT_EQ(FtpSession(port).logIn("bob"), 230);
}

} // namespace
} // namespace velt::test
