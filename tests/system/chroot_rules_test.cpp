// The chroot rules at logins, over each protocol.
#include "standalone/contract/last_error.h"
#include "tests/standalone/support/store_shares.h"
#include "tests/support/result.h"
#include "tests/system/support/each_protocol.h"

#include <sys/stat.h>

#include <filesystem>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

class ChrootRules : public EachProtocol {
protected:
    void SetUp() override {
        EachProtocol::SetUp();
        record.user_chroot = 1;
        if (IsSkipped() || HasFatalFailure()) {
            return;
        }
        const auto music = addShare("music", "music", Access::none);
        fs::create_directory(music / "below");
        fs::create_directory(music / "odd \"#\\ %{env:HOME} ~");
        fs::create_directory(music / "%u");
        writeFile(music / "song", "la");
        writeFile(music / "below" / "deep", "di");
        writeFile(music / "odd \"#\\ %{env:HOME} ~" / "odd", "o");
    }

    static constexpr const char* home = "home-of";
};

TEST_P(ChrootRules, confineAUserToAFolderOfAShare) {
    start();
    EXPECT_EQ(rootOf("alice"), home);
    storeRules({"u:1001:/music/below"});
    EXPECT_EQ(rootOf("alice"), "deep") << "without a restart";
    EXPECT_EQ(rootOf("bob"), home);
    storeRules({});
    EXPECT_EQ(rootOf("alice"), home);
}

TEST_P(ChrootRules, confineToAShareAsAWhole) {
    start();
    storeRules({"u:1003:/music"});
    EXPECT_NE(rootOf("carol").find("song"), std::string::npos);
}

TEST_P(ChrootRules, ofAGroupHoldForItsMembers) {
    start();
    storeRules({"g:2001:/music/below"});
    EXPECT_EQ(rootOf("alice"), "deep");
    EXPECT_EQ(rootOf("bob"), "deep");
    EXPECT_EQ(rootOf("carol"), home);
}

TEST_P(ChrootRules, ofAPrimaryGroupHoldToo) {
    start();
    storeRules({"g:1003:/music/below"});
    EXPECT_EQ(rootOf("carol"), "deep");
}

TEST_P(ChrootRules, ofAUserComeBeforeThoseOfAGroup) {
    start();
    storeRules({"g:2001:/music/below", "u:1001:/home"});
    EXPECT_EQ(rootOf("alice"), home);
    EXPECT_EQ(rootOf("bob"), "deep");
}

TEST_P(ChrootRules, holdInStoredOrder) {
    start();
    storeRules({"g:1001:/home", "g:2001:/music/below", "u:1002:/music/below", "u:1002:/home"});
    EXPECT_EQ(rootOf("alice"), home);
    EXPECT_EQ(rootOf("bob"), "deep");
}

TEST_P(ChrootRules, comeBeforeTheGeneralSetting) {
    record.user_chroot = 0;
    start();
    storeRules({"u:1001:/home", "u:1002:/music/below"});
    EXPECT_EQ(rootOf("alice"), home);
    EXPECT_EQ(rootOf("bob"), "deep");
    EXPECT_EQ(rootOf("carol"), "music");
}

TEST_P(ChrootRules, madeThroughTheUserListHoldToo) {
    record.user_chroot = 0;
    start();
    VLIBCSzList* list = VLIBCSzListAlloc(4);
    ASSERT_EQ(VLIBCSzListPush(&list, "alice"), 0);
    ASSERT_EQ(VELTFTPAddChrootUser(list), 0) << lastErrorSentence();
    EXPECT_EQ(rootOf("alice"), home);
    ASSERT_EQ(VELTFTPDeleteChrootUser(list), 0) << lastErrorSentence();
    VLIBCSzListFree(list);
    EXPECT_EQ(rootOf("alice"), "music");
}

TEST_P(ChrootRules, withSpecialCharactersNameThatFolderAndNoOther) {
    start();
    storeRules({"u:1001:/music/odd \"#\\ %{env:HOME} ~"});
    EXPECT_EQ(rootOf("alice"), "odd");
    fs::create_directory("/mnt/srv/music/alice");
    writeFile("/mnt/srv/music/alice/wrong", "");
    writeFile("/mnt/srv/music/%u/right", "");
    storeRules({"u:1001:/music/%u"});
    EXPECT_EQ(rootOf("alice"), "right") << "the daemon does not put the name in its place";
}

TEST_P(ChrootRules, refuseTheLoginWithoutTheirFolder) {
    start();
    storeRules({"u:1001:/music/absent", "u:1002:/absent", "u:1003:/music/song"});
    EXPECT_EQ(rootOf("alice"), "refused");
    EXPECT_EQ(rootOf("bob"), "refused");
    EXPECT_EQ(rootOf("carol"), "refused") << "a file is no folder";
}

TEST_P(ChrootRules, refuseAFolderThatLeadsOutOfItsShare) {
    start();
    fs::create_directory_symlink("/etc", "/mnt/srv/music/trap");
    fs::create_directory_symlink("below", "/mnt/srv/music/alias");
    fs::create_directory_symlink("../../home", "/mnt/srv/music/upwards");
    storeRules({"u:1001:/music/trap", "u:1002:/music/alias", "u:1003:/music/upwards/carol"});
    EXPECT_EQ(rootOf("alice"), "refused");
    EXPECT_EQ(rootOf("bob"), "deep");
    EXPECT_EQ(rootOf("carol"), "refused");
}

TEST_P(ChrootRules, refuseAllLoginsWithoutTheirFile) {
    start();
    const fs::path file = worldRoot / "etc/velt/chroot_rules";
    fs::rename(file, file.string() + ".away");
    EXPECT_EQ(rootOf("alice"), "refused");
    fs::rename(file.string() + ".away", file);
    EXPECT_EQ(rootOf("alice"), home);
}

TEST_P(ChrootRules, refuseAllLoginsWithADamagedFile) {
    start();
    const fs::path file = worldRoot / "etc/velt/chroot_rules";
    const std::string header = "velt-chroot-rules 1\n";
    for (const std::string& text :
         {std::string(), std::string("other 1\n"), header + "u:1002:/home", header + "x:1002:/home\n",
          header + "u:1002:/music/../below\n", header + "u::/home\n", header + "u:1002:relative\n",
          header + "u:1002:/" + std::string(10000, 'a') + "\n"}) {
        writeFile(file, text);
        EXPECT_EQ(rootOf("alice"), "refused") << text.substr(0, 60);
    }
    writeFile(file, header);
    EXPECT_EQ(rootOf("alice"), home);
    ASSERT_EQ(chmod(file.c_str(), 0666), 0);
    EXPECT_EQ(rootOf("alice"), "refused") << "anybody could have written it";
}

// Over SFTP a connection has one user.
TEST_P(ChrootRules, ofAFailedLoginDoNotReachTheNextOne) {
    start();
    storeRules({"u:1001:/music/below"});
    EXPECT_FALSE(tryToLogIn("alice", "wrong")->isLoggedIn());
    EXPECT_EQ(rootOf("bob"), home);
    if (!overFtp()) {
        return;
    }
    FtpSession session(port);
    EXPECT_EQ(session.logIn("alice", "wrong"), 530);
    ASSERT_EQ(session.logIn("bob"), 230);
    session.command("CDUP");
    EXPECT_EQ(session.receive("NLST"), "home-of\r\n");
    FtpSession other(port);
    EXPECT_EQ(other.logIn("bob", "wrong"), 530);
    ASSERT_EQ(other.logIn("alice"), 230);
    EXPECT_EQ(other.receive("NLST"), "deep\r\n");
}

TEST_P(ChrootRules, findAShareThatIsMadeLater) {
    start();
    storeRules({"u:1001:/later"});
    EXPECT_EQ(rootOf("alice"), "refused");
    writeFile(addShare("later", "later", Access::none) / "file", "x");
    EXPECT_EQ(rootOf("alice"), "file");
}

TEST_P(ChrootRules, followAShareThatIsMovedOrRemoved) {
    writeFile(addShare("moving", "before", Access::none) / "old", "x");
    start();
    storeRules({"u:1001:/moving"});
    EXPECT_EQ(rootOf("alice"), "old");
    auto shares = loadShares();
    ASSERT_TRUE(shares);
    shares->back().path = "/mnt/srv/after";
    fs::create_directories("/mnt/srv/after");
    writeFile("/mnt/srv/after/new", "x");
    ASSERT_EQ(messageOf(storeShares(*shares)), "");
    EXPECT_EQ(rootOf("alice"), "new");
    shares->pop_back();
    ASSERT_EQ(messageOf(storeShares(*shares)), "");
    EXPECT_EQ(rootOf("alice"), "refused");
}

VELT_OVER_EACH_PROTOCOL(ChrootRules);

// Over SFTP a connection ends after its password was accepted, which tells whoever has the password alone.
class ChrootRulesOverFtp : public FtpService {};

TEST_F(ChrootRulesOverFtp, doNotTellAStrangerWhoHasOne) {
    start();
    storeRules({"u:1001:/music/absent"});
    FtpSession session(port);
    session.command("USER alice");
    const Reply ruled = session.command("PASS wrong");
    session.command("USER bob");
    const Reply unruled = session.command("PASS wrong");
    EXPECT_EQ(ruled.code, 530);
    EXPECT_EQ(ruled.text, unruled.text);
}

TEST_F(ChrootRulesOverFtp, doNotConcernAnonymousUsers) {
    addShare("public", "public", Access::read);
    letAnonymousIn("public");
    start();
    storeRules({"u:104:/music/absent"});
    FtpSession session(port);
    EXPECT_EQ(session.logIn("anonymous", ""), 230);
}

} // namespace
} // namespace velt::test
