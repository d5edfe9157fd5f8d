// Whether a chroot rule's directory exists, over real folders.

#include "module/entry_functions.h"
#include "tests/support/handler_test.h"
#include "tests/support/temporary_folder.h"

#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>

namespace {

namespace fs = std::filesystem;

/// The share "media" has a real folder below a temporary one:
///   media/a/b    a folder in a folder
///   media/file   a regular file
///   media/pipe   a named pipe
///   media/socket a local socket
class ChrootPathTest : public HandlerTest {
protected:
    void SetUp() override {
        HandlerTest::SetUp();
        fs::create_directories(folder() / "a" / "b");
        std::ofstream(folder() / "file") << "text";
        ASSERT_EQ(mkfifo((folder() / "pipe").c_str(), 0600), 0);
        ASSERT_EQ(mknod((folder() / "socket").c_str(), S_IFSOCK | 0600, 0), 0);
        platform.shares["media"].path = folder().string();
        platform.users = {{"alice", {"", 1001}}};
    }

    fs::path folder() const { return root_.path() / "media"; }

    /// Loads one rule with `path` and returns its "path_exist". Exactly the share `share` must have been
    /// looked up.
    bool exists(const std::string& path, const std::string& share) {
        const int sharesBefore = sharesFound_;
        sharesFound_ += platform.shares.contains(share) ? 1 : 0;
        const std::string list = "list" + std::to_string(++loads_);
        platform.rules = {"user:1001:" + path};
        Lines expected = {"VLIBCSzListAlloc(1024)", "VELTFTPChrootRuleEnum(" + list + ")",
                          "VELTFTPChrootRuleParseToName(\"user:1001:" + path + "\", 492, 4096)",
                          "VELTShareGet(\"" + share + "\", null)"};
        if (sharesFound_ > sharesBefore) {
            expected.push_back("VELTShareFree(share" + std::to_string(sharesFound_) + ")");
        }
        expected.push_back("VLIBCSzListFree(" + list + ")");
        Lines journal = run(FTPChrootUserLoad);
        journal.pop_back();
        EXPECT_EQ(journal, expected);
        const Json::Value& rule = answer().data["rules"][0];
        EXPECT_EQ(rule["path"], Json::Value(path));
        EXPECT_TRUE(rule["path_exist"].isBool());
        return rule["path_exist"].asBool();
    }

    const velt::test::TemporaryFolder root_;

private:
    int loads_ = 0;
    int sharesFound_ = 0;
};

} // namespace

TEST_F(ChrootPathTest, ExistsAsHomeWithoutALookAtTheDisk) {
    platform.shares["home"].path = (root_.path() / "missing").string();
    platform.rules = {"user:1001:/home"};
    EXPECT_EQ(
        run(FTPChrootUserLoad),
        (Lines{"VLIBCSzListAlloc(1024)", "VELTFTPChrootRuleEnum(list1)",
               R"(VELTFTPChrootRuleParseToName("user:1001:/home", 492, 4096))", "VLIBCSzListFree(list1)",
               succeeded(R"({"rules":[{"name":"alice","path":"/home","path_exist":true,)"
                         R"("type":"user"}],"total":1})")}));
}

TEST_F(ChrootPathTest, TakesOnlyTheExactWordForHome) {
    EXPECT_FALSE(exists("/home/", "home"));
    EXPECT_FALSE(exists("/Home", "Home"));
    EXPECT_FALSE(exists("/homes", "homes"));
    EXPECT_FALSE(exists("/home/alice", "home"));
    platform.shares["home"].path = folder().string();
    EXPECT_TRUE(exists("/home/", "home"));
}

TEST_F(ChrootPathTest, ExistsAsTheSharesOwnFolder) {
    EXPECT_TRUE(exists("/media", "media"));
    EXPECT_TRUE(exists("/media/", "media"));
}

TEST_F(ChrootPathTest, ExistsAsAFolderBelowTheShare) {
    EXPECT_TRUE(exists("/media/a", "media"));
    EXPECT_TRUE(exists("/media/a/b", "media"));
    EXPECT_TRUE(exists("/media/a/b/", "media"));
    EXPECT_TRUE(exists("/media//a", "media"));
    EXPECT_TRUE(exists("/media/a/../a", "media"));
}

TEST_F(ChrootPathTest, TakesTheShareByNameAndNotByItsFolder) {
    platform.shares["video"].path = folder().string();
    EXPECT_TRUE(exists("/video/a/b", "video"));
    fs::create_directories(root_.path() / "books");
    EXPECT_FALSE(exists("/books", "books"));
}

TEST_F(ChrootPathTest, DropsTheFirstCharacterWhateverItIs) {
    EXPECT_TRUE(exists("xmedia", "media"));
    EXPECT_TRUE(exists("xmedia/a", "media"));
    EXPECT_FALSE(exists("media", "edia"));
    EXPECT_FALSE(exists("x", ""));
}

TEST_F(ChrootPathTest, IsMissingWithoutAShare) {
    EXPECT_FALSE(exists("/gone", "gone"));
    EXPECT_FALSE(exists("/gone/a", "gone"));
    EXPECT_FALSE(exists("/Media", "Media"));
    EXPECT_FALSE(exists("/", ""));
    EXPECT_FALSE(exists("//", ""));
    EXPECT_FALSE(exists("//media", ""));
}

TEST_F(ChrootPathTest, IsMissingWithoutTheFolder) {
    EXPECT_FALSE(exists("/media/gone", "media"));
    EXPECT_FALSE(exists("/media/a/gone", "media"));
    EXPECT_FALSE(exists("/media/A", "media"));
    platform.shares["old"].path = (root_.path() / "gone").string();
    EXPECT_FALSE(exists("/old", "old"));
    EXPECT_FALSE(exists("/old/a", "old"));
}

TEST_F(ChrootPathTest, IsMissingWhereSomethingOtherThanAFolderStands) {
    EXPECT_FALSE(exists("/media/file", "media"));
    EXPECT_FALSE(exists("/media/file/", "media"));
    EXPECT_FALSE(exists("/media/file/a", "media"));
    EXPECT_FALSE(exists("/media/pipe", "media"));
    EXPECT_FALSE(exists("/media/socket", "media")) << "its type has the bit of a folder's, and one more";
    platform.shares["text"].path = (folder() / "file").string();
    EXPECT_FALSE(exists("/text", "text"));
    platform.shares["null"].path = "/dev/null";
    EXPECT_FALSE(exists("/null", "null"));
}

TEST_F(ChrootPathTest, FollowsSymbolicLinks) {
    fs::create_directory_symlink(folder() / "a", folder() / "toFolder");
    fs::create_symlink(folder() / "file", folder() / "toFile");
    fs::create_symlink(folder() / "gone", folder() / "toNothing");
    fs::create_symlink("loop", folder() / "loop");
    EXPECT_TRUE(exists("/media/toFolder", "media"));
    EXPECT_TRUE(exists("/media/toFolder/b", "media"));
    EXPECT_FALSE(exists("/media/toFile", "media"));
    EXPECT_FALSE(exists("/media/toNothing", "media"));
    EXPECT_FALSE(exists("/media/loop", "media"));
    platform.shares["linked"].path = (folder() / "toFolder").string();
    EXPECT_TRUE(exists("/linked", "linked"));
}

TEST_F(ChrootPathTest, SeesAFolderComeAndGo) {
    EXPECT_FALSE(exists("/media/late", "media"));
    fs::create_directory(folder() / "late");
    EXPECT_TRUE(exists("/media/late", "media"));
    fs::remove(folder() / "late");
    EXPECT_FALSE(exists("/media/late", "media"));
}

TEST_F(ChrootPathTest, IsMissingWhenThePathIsTooLongForTheSystem) {
    EXPECT_FALSE(exists("/media/" + std::string(300, 'n'), "media"));
    EXPECT_FALSE(exists("/media/" + std::string(4080, '/') + "a", "media")) << "beyond 4095 in all";
}

TEST_F(ChrootPathTest, FreesAShareThatAFailedLookUpLeftBehind) {
    platform.failedShareGetLeavesShare = true;
    platform.rules = {"user:1001:/gone"};
    EXPECT_EQ(run(FTPChrootUserLoad),
              (Lines{"VLIBCSzListAlloc(1024)", "VELTFTPChrootRuleEnum(list1)",
                     R"(VELTFTPChrootRuleParseToName("user:1001:/gone", 492, 4096))",
                     R"(VELTShareGet("gone", null))", "VELTShareFree(share1)", "VLIBCSzListFree(list1)",
                     succeeded(R"({"rules":[{"name":"alice","path":"/gone","path_exist":false,)"
                               R"("type":"user"}],"total":1})")}));
}
