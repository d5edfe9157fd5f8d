// What is reported of a login is what its view is made of.
#include "standalone/login/view_report.h"

#include "standalone/core/state_root.h"
#include "standalone/rules/rule_store.h"
#include "tests/standalone/support/store_shares.h"
#include "tests/support/result.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <sys/stat.h>
#include <unistd.h>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

class ViewReports : public testing::Test {
protected:
    void SetUp() override {
        if (geteuid() != 0) {
            GTEST_SKIP() << "only root looks at files as another user";
        }
        chmod(root_.path().c_str(), 0755);
        setStateRoot(root_.path());
        for (const char* folder : {"home", "docs/inner/deep", "docs/private", "music"}) {
            fs::create_directories(root_.path() / folder);
        }
        chmod(place("docs").c_str(), 0777);
        chmod(place("docs/private").c_str(), 0700);
        root_.write("docs/letter", "x");
        root_.write("docs/private/diary", "x");
        ASSERT_EQ(messageOf(makeRulesFile()), "");
        login_.user = {"ann", 4711, {4711}};
        login_.home = place("home");
        login_.view = DefaultView::shares;
    }
    void TearDown() override { setStateRoot("/"); }

    fs::path place(const std::string& below) const { return root_.path() / below; }

    ShareEntry share(const std::string& name, const std::string& below,
                     std::map<std::string, Access> users) const {
        return {name, "", place(below), true, std::move(users), {}};
    }

    SeenPath seen(const std::string& below) const {
        const auto rights = rightsOn(login_.user, place(below));
        EXPECT_EQ(messageOf(rights), "");
        return rights ? findInView(reportView(login_), *rights) : SeenPath{};
    }

    TemporaryFolder root_;
    Login login_;
};

TEST_F(ViewReports, TellWhatIsKeptInAHome) {
    login_.view = DefaultView::home;
    ASSERT_EQ(chown(place("home").c_str(), 4711, 4711), 0);
    root_.write("home/.ssh/authorized_keys", "x");
    root_.write("home/letter", "x");
    for (const char* own : {"home/.ssh", "home/.ssh/authorized_keys", "home/letter"}) {
        ASSERT_EQ(chown(place(own).c_str(), 4711, 4711), 0);
    }
    EXPECT_EQ(seen("home/letter").access, Access::write);
    EXPECT_EQ(seen("home").access, Access::write);
    for (const char* kept : {"home/.ssh", "home/.ssh/authorized_keys"}) {
        EXPECT_EQ(seen(kept).access, Access::read) << kept;
        EXPECT_EQ(seen(kept).reason,
                  "Sessions may not change it: programs obey what begins with a dot in a home.");
    }
}

TEST_F(ViewReports, TellWhichGrantOpensAShareAndWhichClosesIt) {
    ShareEntry hidden = share("hidden", "music", {{"ann", Access::write}});
    hidden.offeredToFtp = false;
    ShareEntry strange = share("strange", "music", {});
    strange.groups = {{"no such group", Access::none}};
    ASSERT_EQ(messageOf(storeShares({share("docs", "docs", {{"ann", Access::write}}),
                                     share("closed", "music", {{"ann", Access::none}}),
                                     share("others", "music", {{"bob", Access::write}}), hidden, strange})),
              "");
    const ViewReport report = reportView(login_);
    EXPECT_EQ(report.refused, "");
    EXPECT_EQ(report.reasons,
              (std::vector<std::string>{
                  "No chroot rule applies, and users are not confined: they see the shares."}));
    ASSERT_EQ(report.folders.size(), 1U);
    EXPECT_EQ(report.folders[0].path, "/docs");
    EXPECT_EQ(report.folders[0].folder, place("docs"));
    EXPECT_EQ(report.folders[0].access, Access::write);
    EXPECT_EQ(report.folders[0].reasons,
              (std::vector<std::string>{"The share docs grants ann reading and writing."}));
    std::map<std::string, std::string> unseen;
    for (const UnseenShare& one : report.unseen) {
        unseen[one.share] = one.reasons.at(0);
    }
    EXPECT_EQ(unseen,
              (std::map<std::string, std::string>{
                  {"closed", "The share closed refuses ann."},
                  {"hidden", "The share hidden is not offered."},
                  {"others", "The share others has no entry for ann or for a group of this user."},
                  {"strange", "The share strange refuses the group no such group, which cannot be looked "
                              "up: so it refuses everybody."}}));
}

TEST_F(ViewReports, TellWhatTakesFromAGrant) {
    ASSERT_EQ(messageOf(storeShares({share("docs", "docs", {{"ann", Access::read}}),
                                     share("inner", "docs/inner", {{"ann", Access::write}}),
                                     share("deep", "docs/inner/deep", {{"ann", Access::none}}),
                                     share("music", "music", {{"ann", Access::write}})})),
              "");
    const ViewReport report = reportView(login_);
    ASSERT_EQ(report.folders.size(), 3U);
    EXPECT_EQ(report.folders[1].path, "/inner");
    EXPECT_EQ(report.folders[1].access, Access::read);
    EXPECT_EQ(report.folders[2].reasons,
              (std::vector<std::string>{"The share music grants ann reading and writing.",
                                        "The file system lets ann read " + place("music").string() +
                                            ", but not write to it."}));
    ASSERT_EQ(report.folders[0].within.size(), 1U) << "those that keep their place are none";
    EXPECT_EQ(report.folders[0].within[0].place, "inner/deep");
}

TEST_F(ViewReports, TellTheRuleThatConfines) {
    ASSERT_EQ(messageOf(storeShares({share("docs", "docs", {{"ann", Access::write}})})), "");
    ASSERT_EQ(messageOf(storeRules({{true, 4711, "/docs/inner"}})), "");
    ViewReport report = reportView(login_);
    EXPECT_EQ(report.reasons, (std::vector<std::string>{
                                  "The chroot rule of the user 4711 confines the login to /docs/inner."}));
    ASSERT_EQ(report.folders.size(), 1U);
    EXPECT_EQ(report.folders[0].path, "/");
    EXPECT_EQ(report.folders[0].folder, place("docs/inner"));

    ASSERT_EQ(messageOf(storeRules({{true, 4711, "/gone"}})), "");
    report = reportView(login_);
    EXPECT_EQ(report.refused, "There is no share for the path /gone.");
    EXPECT_TRUE(report.folders.empty());

    root_.write("etc/velt/chroot_rules", "damaged");
    EXPECT_NE(reportView(login_).refused, "");
}

TEST_F(ViewReports, FindAFileInTheView) {
    ASSERT_EQ(messageOf(storeShares({share("docs", "docs", {{"ann", Access::read}}),
                                     share("inner", "docs/inner", {{"ann", Access::none}})})),
              "");
    const SeenPath folder = seen("docs");
    EXPECT_EQ(folder.path, "/docs");
    EXPECT_EQ(folder.access, Access::read);
    EXPECT_EQ(folder.reason, "It is shown for reading only.");
    EXPECT_EQ(seen("docs/inner/deep").path, "");
    EXPECT_EQ(seen("docs/inner/deep").reason, "A share in it is closed to the user.");
    EXPECT_EQ(seen("music").reason, "It is in no folder that the login sees.");
    const SeenPath diary = seen("docs/private/diary");
    EXPECT_EQ(diary.access, Access::none);
    EXPECT_EQ(diary.reason, "ann may not enter " + place("docs/private").string() +
                                ", which belongs to root:root, mode 0700.");
}

TEST_F(ViewReports, FollowLinksToWhatTheyName) {
    ASSERT_EQ(messageOf(storeShares({share("docs", "docs", {{"ann", Access::write}})})), "");
    fs::create_symlink(place("docs/letter"), place("music/link"));
    EXPECT_EQ(seen("music/link").path, "/docs/letter");
    EXPECT_EQ(messageOf(rightsOn(login_.user, place("docs/none"))),
              "Cannot open " + place("docs/none").string() + ": No such file or directory.");
}

} // namespace
} // namespace velt::test
