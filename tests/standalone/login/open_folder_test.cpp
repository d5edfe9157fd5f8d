#include "standalone/login/open_folder.h"

#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

class OpenFolder : public testing::Test {
protected:
    void SetUp() override {
        if (geteuid() != 0) {
            GTEST_SKIP() << "only root can take another account's identity";
        }
        chmod(root_.path().c_str(), 0755);
        fs::create_directories(share_ / "below/deep");
        fs::create_directories(root_.path() / "outside");
    }
    std::string below(const fs::path& path) {
        const auto share = openFolder(share_);
        const auto folder = openFolderBelow(user_, *share, path);
        return folder ? folder->place.lexically_relative(share_) : fs::path("(refused)");
    }

    TemporaryFolder root_;
    const fs::path share_ = fs::canonical(root_.path()) / "share";
    Identity user_{"", 54321, {54322, 54323}};
};

TEST_F(OpenFolder, belowLeadsToFoldersInIt) {
    EXPECT_EQ(below("below/deep"), "below/deep");
    fs::create_directory_symlink("below", share_ / "alias");
    EXPECT_EQ(below("alias/deep"), "below/deep");
    EXPECT_EQ(below("absent"), "(refused)");
    root_.write("share/file", "");
    EXPECT_EQ(below("file"), "(refused)");
}

TEST_F(OpenFolder, belowNeverLeadsOut) {
    fs::create_directory_symlink("../outside", share_ / "up");
    fs::create_directory_symlink(root_.path() / "outside", share_ / "away");
    fs::create_directory_symlink(share_ / "below", share_ / "absolute");
    for (const char* path : {"up", "away", "absolute", "..", "below/../../outside", "/", "/etc"}) {
        EXPECT_EQ(below(path), "(refused)") << path;
    }
}

TEST_F(OpenFolder, belowHasTheRightsOfTheLogin) {
    fs::permissions(share_ / "below", fs::perms(0700));
    EXPECT_EQ(below("below/deep"), "(refused)");
    ASSERT_EQ(chown((share_ / "below").c_str(), 0, 54323), 0);
    fs::permissions(share_ / "below", fs::perms(0710));
    EXPECT_EQ(below("below/deep"), "below/deep");
    ASSERT_EQ(chown((share_ / "below").c_str(), 54321, 0), 0);
    fs::permissions(share_ / "below", fs::perms(0700));
    EXPECT_EQ(below("below/deep"), "below/deep");
    EXPECT_TRUE(openFolderAs(user_, share_ / "below/deep"));
    user_.uid = 54324;
    EXPECT_FALSE(openFolderAs(user_, share_ / "below/deep"));
    EXPECT_TRUE(openFolder(share_ / "below/deep")) << "root's rights are back";
    EXPECT_EQ(getgroups(0, nullptr), 0);
}

TEST_F(OpenFolder, followsOnlyLinksThatRootMade) {
    const auto leadsTo = [&](const fs::path& path) {
        const auto folder = openFolderAs(user_, path);
        return folder ? folder->place : fs::path("(refused)");
    };
    fs::create_directory_symlink("below/deep", share_ / "relative");
    fs::create_directory_symlink(share_ / "below", share_ / "absolute");
    fs::create_directory_symlink("../share/absolute/deep/.", share_ / "chain");
    fs::create_directory_symlink("round", share_ / "round");
    for (const char* link : {"relative", "absolute/deep", "chain", "below/deep/", "below//deep"}) {
        EXPECT_EQ(leadsTo(share_ / link), share_ / "below/deep") << link;
    }
    EXPECT_EQ(leadsTo(share_ / "round"), "(refused)");
    EXPECT_EQ(leadsTo(share_ / "absent"), "(refused)");
    EXPECT_EQ(leadsTo("/"), "(refused)");
    fs::create_directory_symlink("/", share_ / "server");
    EXPECT_EQ(leadsTo(share_ / "server"), "(refused)");
    for (const fs::perms others : {fs::perms(0775), fs::perms(0757)}) {
        fs::permissions(share_, others);
        EXPECT_EQ(leadsTo(share_ / "relative"), "(refused)");
        EXPECT_EQ(leadsTo(share_ / "below/deep"), share_ / "below/deep");
    }
    fs::permissions(share_, fs::perms(0755));
    ASSERT_EQ(chown(share_.c_str(), 54321, 0), 0);
    EXPECT_EQ(leadsTo(share_ / "relative"), "(refused)");
}

TEST_F(OpenFolder, exactlyFollowsNoLinks) {
    fs::create_directory_symlink("below", share_ / "alias");
    const auto share = openFolder(share_);
    EXPECT_TRUE(openFolderExactly(*share, "below/deep"));
    EXPECT_FALSE(openFolderExactly(*share, "alias/deep"));
    EXPECT_FALSE(openFolderExactly(*share, ".."));
}

TEST_F(OpenFolder, theRemovedHasNoPlace) {
    const auto folder = openFolder(share_ / "below/deep");
    EXPECT_EQ(placeOf(*folder), share_ / "below/deep");
    fs::remove(share_ / "below/deep");
    EXPECT_FALSE(placeOf(*folder));
    fs::create_directory(share_ / "below/deep (deleted)");
    EXPECT_FALSE(placeOf(*folder)) << "another folder of that name";
}

} // namespace
} // namespace velt::test
