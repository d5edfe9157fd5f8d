// What a login sees, in a mount namespace of the test's own.
#include "standalone/login/login_view.h"

#include "standalone/core/state_root.h"
#include "standalone/rules/rule_store.h"
#include "tests/standalone/support/store_shares.h"
#include "tests/support/result.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <sched.h>
#include <sys/mount.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstring>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

class LoginView : public testing::Test {
protected:
    void SetUp() override {
        if (unshare(CLONE_NEWNS) != 0) {
            GTEST_SKIP() << "no mount namespace: " << std::strerror(errno);
        }
        chmod(root_.path().c_str(), 0755);
        setStateRoot(root_.path());
        for (const char* folder : {"view", "home", "share/below"}) {
            fs::create_directories(root_.path() / folder);
        }
        root_.write("home/letter", "x");
        root_.write("share/below/song", "x");
        ASSERT_EQ(messageOf(makeRulesFile()), "");
        const ShareEntry music{"music", "", root_.path() / "share", true, {{"ann", Access::read}}, {}};
        const ShareEntry gone{"gone", "", root_.path() / "absent", true, {{"ann", Access::read}}, {}};
        ASSERT_EQ(messageOf(storeShares({music, gone})), "");
    }
    void TearDown() override {
        umount2(view_.c_str(), MNT_DETACH);
        setStateRoot("/");
    }

    TemporaryFolder root_;
    const fs::path view_ = root_.path() / "view";
    Login login_{DefaultView::home, {"ann", 54321, {54322}}, root_.path() / "home", ""};
};

TEST_F(LoginView, isTheHome) {
    EXPECT_EQ(messageOf(makeLoginView(login_, view_)), "");
    EXPECT_TRUE(fs::exists(view_ / "letter"));
}

TEST_F(LoginView, isNotTheServersRoot) {
    login_.home = "/";
    EXPECT_FALSE(makeLoginView(login_, view_));
    EXPECT_TRUE(fs::is_empty(view_));
}

TEST_F(LoginView, followsARule) {
    ASSERT_EQ(messageOf(storeRules({{false, 54322, "/music/below"}})), "");
    EXPECT_EQ(messageOf(makeLoginView(login_, view_)), "");
    EXPECT_TRUE(fs::exists(view_ / "song"));
    login_.view = DefaultView::server;
    EXPECT_FALSE(makeLoginView(login_, view_)) << "without root's rights nobody can be confined";
}

TEST_F(LoginView, hasTheSharesThatTheUserMayRead) {
    login_.view = DefaultView::shares;
    EXPECT_EQ(messageOf(makeLoginView(login_, view_)), "");
    EXPECT_TRUE(fs::exists(view_ / "music/below/song"));
    EXPECT_FALSE(fs::exists(view_ / "gone"));
}

TEST_F(LoginView, givesNoMoreThanReadingWhereTheDaemonNeverWrites) {
    std::vector<ShareEntry> shares;
    for (const char* name : {"etc", "Lib", "lib64"}) {
        const fs::path folder = root_.path() / name;
        fs::create_directory(folder);
        fs::permissions(folder, fs::perms(0777));
        shares.push_back({name, "", folder, true, {{"ann", Access::write}}, {}});
    }
    ASSERT_EQ(messageOf(storeShares(shares)), "");
    login_.view = DefaultView::shares;
    const auto remarks = makeLoginView(login_, view_);
    ASSERT_TRUE(remarks) << messageOf(remarks);
    EXPECT_EQ(*remarks, (std::vector<std::string>{
                            "The share etc is read-only in sessions, since system folders have this name.",
                            "The share Lib is read-only in sessions, since system folders have this name."}));
    const auto isReadOnly = [&](const char* share) {
        return mkdir((view_ / share / "made").c_str(), 0755) < 0 && errno == EROFS;
    };
    EXPECT_TRUE(isReadOnly("etc"));
    EXPECT_TRUE(isReadOnly("Lib"));
    EXPECT_FALSE(isReadOnly("lib64"));
}

TEST_F(LoginView, leavesOutAShareThatCannotBeShown) {
    const fs::path stubborn = root_.path() / "share";
    ASSERT_EQ(mount("disk", stubborn.c_str(), "tmpfs", 0, "mode=0755"), 0);
    ASSERT_EQ(mount(nullptr, stubborn.c_str(), nullptr, MS_UNBINDABLE, nullptr), 0);
    login_.view = DefaultView::shares;
    const auto remarks = makeLoginView(login_, view_);
    ASSERT_TRUE(remarks) << messageOf(remarks);
    ASSERT_EQ(remarks->size(), 1U);
    EXPECT_EQ(remarks->front().find("The share music is left out: "), 0U) << remarks->front();
    EXPECT_TRUE(fs::is_empty(view_));
    umount2(stubborn.c_str(), MNT_DETACH);
}

} // namespace
} // namespace velt::test
