#include "standalone/login/grants.h"

#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

class GrantsTest : public testing::Test {
protected:
    void SetUp() override {
        if (geteuid() != 0) {
            GTEST_SKIP() << "only root can take another account's identity";
        }
        chmod(root_.path().c_str(), 0755);
        for (const char* folder : {"outer/inner", "outer/closed"}) {
            fs::create_directories(top_ / folder);
        }
        for (const char* folder : {"outer", "outer/inner", "outer/closed"}) {
            fs::permissions(top_ / folder, fs::perms::all);
        }
    }
    void share(const std::string& path, Access access) {
        shares_.push_back(
            {"s" + std::to_string(shares_.size()), "", top_ / path, true, {{"ann", access}}, {}});
    }
    /// "inner read, closed none": what restricts a login that may write in the folder.
    std::string restrictionsBelow(const std::string& path) {
        const Grants grants(user_, shares_);
        std::string text;
        for (const Restriction& one : grants.restrictionsBelow(top_ / path, Access::write)) {
            text += (text.empty() ? "" : ", ") + one.place.string();
            text += one.access == Access::none ? " none" : one.access == Access::read ? " read" : " write";
        }
        return text;
    }

    TemporaryFolder root_;
    const fs::path top_ = fs::canonical(root_.path());
    Identity user_{"ann", 54321, {54322}};
    std::vector<ShareEntry> shares_;
};

TEST_F(GrantsTest, ofAnInnerShareTakeFromThoseOfTheOuter) {
    share("outer/inner", Access::read);
    share("outer", Access::write);
    share("outer/closed", Access::none);
    EXPECT_EQ(restrictionsBelow("outer"), "closed none, inner read");
    EXPECT_EQ(restrictionsBelow("outer/inner"), "");
}

TEST_F(GrantsTest, ofAnInnerShareAddNothing) {
    share("outer", Access::read);
    share("outer/inner", Access::write);
    const Grants grants(user_, shares_);
    EXPECT_EQ(grants.on(shares_[1]), Access::read);
    EXPECT_EQ(grants.leastAt(top_ / "outer/inner", top_ / "outer", Access::read), Access::read);
    EXPECT_EQ(grants.leastAt(top_ / "outer/inner", top_ / "outer", Access::write), Access::write);
}

TEST_F(GrantsTest, ofAnOuterShareThatSaysNothingTakeNothing) {
    share("outer", Access::write);
    shares_[0].users.clear();
    share("outer/inner", Access::write);
    EXPECT_EQ(Grants(user_, shares_).on(shares_[1]), Access::write);
}

TEST_F(GrantsTest, pinTheFoldersOnTheWay) {
    fs::create_directories(top_ / "outer/a/b/deep");
    share("outer", Access::write);
    share("outer/a/b/deep", Access::write);
    share("outer/a/b", Access::read);
    EXPECT_EQ(restrictionsBelow("outer"), "a write, a/b read, a/b/deep read")
        << "the file system does not let her write to the last one";
}

TEST_F(GrantsTest, doNotMixFoldersWhoseNamesBeginAlike) {
    fs::create_directories(top_ / "outer-2/inner");
    share("outer", Access::read);
    share("outer-2/inner", Access::none);
    share("outer-2", Access::write);
    fs::permissions(top_ / "outer-2", fs::perms::all);
    const Grants grants(user_, shares_);
    EXPECT_EQ(restrictionsBelow("outer"), "");
    EXPECT_EQ(restrictionsBelow("outer-2"), "inner none");
    EXPECT_EQ(grants.on(shares_[2]), Access::write);
    EXPECT_EQ(grants.leastAt(top_ / "outer-2", top_, Access::write), Access::write);
}

// A login must not take the longer the more shares there are.
TEST_F(GrantsTest, areAskedWithoutAProcessForEach) {
    for (int i = 0; i < 20; i++) {
        share("outer", Access::write);
    }
    const auto usedByChildren = [] {
        rusage usage{};
        getrusage(RUSAGE_CHILDREN, &usage);
        return usage.ru_minflt;
    };
    const auto before = usedByChildren();
    EXPECT_EQ(Grants(user_, shares_).on(shares_.back()), Access::write);
    EXPECT_EQ(usedByChildren(), before);
}

TEST_F(GrantsTest, letNobodyWriteAroundAMissingFolder) {
    share("outer", Access::write);
    share("outer/absent", Access::none);
    share("outer/inner", Access::write);
    fs::create_directory_symlink("inner", top_ / "outer/link");
    share("outer/link/below", Access::write);
    const Grants grants(user_, shares_);
    EXPECT_EQ(grants.missing(), (std::vector<std::string>{"s1", "s3"})) << "anybody may have made the link";
    EXPECT_EQ(grants.on(shares_[0]), Access::read);
    EXPECT_EQ(grants.on(shares_[2]), Access::read) << "it lies in the one that misses them";
    fs::create_directory(top_ / "outer/absent");
    fs::remove(top_ / "outer/link");
    fs::create_directories(top_ / "outer/link/below");
    EXPECT_EQ(Grants(user_, shares_).missing(), std::vector<std::string>());
    EXPECT_EQ(Grants(user_, shares_).on(shares_[0]), Access::write);
}

TEST_F(GrantsTest, letNobodyWriteAtHomeToAShareThatMissesOne) {
    share("outer/inner", Access::write);
    share("outer/inner/absent", Access::write);
    EXPECT_EQ(restrictionsBelow("outer"), "inner read");
    const Grants grants(user_, shares_);
    EXPECT_EQ(grants.leastAt(top_ / "outer/inner", top_ / "outer", Access::write), Access::read);
}

TEST_F(GrantsTest, sayNothingOfAMissingFolderWhereTheUserOnlyReads) {
    share("outer", Access::read);
    share("outer/absent", Access::write);
    EXPECT_EQ(Grants(user_, shares_).missing(), std::vector<std::string>());
}

TEST_F(GrantsTest, holdWhereALinkLeadsToTheShare) {
    fs::create_directory_symlink("outer", top_ / "alias");
    share("alias/inner", Access::none);
    EXPECT_EQ(restrictionsBelow("outer"), "inner none");
    const Grants grants(user_, shares_);
    EXPECT_EQ(grants.leastAt(top_ / "outer/inner", top_ / "outer", Access::write), Access::none);
}

TEST_F(GrantsTest, areNoneWhereNothingIsToldOrCanBeAsked) {
    share("outer", Access::write);
    EXPECT_EQ(Grants(user_, shares_).on(shares_[0]), Access::write);
    const Identity withoutGroup{"ann", 54321, {}};
    EXPECT_EQ(Grants(withoutGroup, shares_).on(shares_[0]), Access::none);
    shares_[0].users.clear();
    EXPECT_EQ(Grants(user_, shares_).on(shares_[0]), Access::none);
    share("absent", Access::write);
    EXPECT_EQ(Grants(user_, shares_).on(shares_[1]), Access::none);
}

} // namespace
} // namespace velt::test
