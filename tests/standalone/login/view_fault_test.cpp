// Logins while one system call after another fails: they see what they should or less, or are refused.
#include "standalone/core/state_root.h"
#include "standalone/login/authorized_keys.h"
#include "standalone/login/login_view.h"
#include "standalone/rules/rule_store.h"
#include "tests/standalone/support/store_shares.h"
#include "tests/support/fault_sweep.h"
#include "tests/support/result.h"
#include "tests/support/temporary_folder.h"
#include "tests/support/text.h"

#include <gtest/gtest.h>

#include <sched.h>
#include <sys/fsuid.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include <algorithm>
#include <set>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

using Lines = std::set<std::string>;

struct ViewCase {
    const char* name;
    DefaultView view;
    const char* rule; ///< the folder of the user's rule; "" for none
};

void PrintTo(const ViewCase& view, std::ostream* out) {
    *out << view.name;
}

/// A share with others in it, of which the user may write to one, read one and not see one.
class ViewFaults : public testing::TestWithParam<ViewCase> {
protected:
    void SetUp() override {
        if (geteuid() != 0) {
            GTEST_SKIP() << "only root can make mounts";
        }
        chmod(root_.path().c_str(), 0755);
        setStateRoot(root_.path());
        fs::create_directory(root_.path() / "view");
        fs::create_directory_symlink("team", root_.path() / "link");
        for (const char* file : {"home/letter", "home/private/diary", "team/plan", "team/drafts/draft",
                                 "team/secret/file", "team/secret/deep/file", "music/song"}) {
            root_.write(file, "x");
        }
        for (const auto& entry : fs::recursive_directory_iterator(root_.path())) {
            chmod(entry.path().c_str(), entry.is_directory() ? 0777 : 0666);
        }
        root_.write("guests", "music");
        chmod((root_.path() / "guests").c_str(), 0600);
        ASSERT_EQ(messageOf(makeRulesFile()), "");
        const std::string rule = GetParam().rule;
        if (!rule.empty()) {
            ASSERT_EQ(messageOf(storeRules({{false, 54322, rule}})), "");
        }
        const auto share = [this](const char* name, const char* folder, Access access) {
            return ShareEntry{name, "", root_.path() / folder, true, {{"ann", access}}, {}};
        };
        ASSERT_EQ(
            messageOf(storeShares(
                {share("team", "team", Access::write), share("drafts", "team/drafts", Access::read),
                 share("secret", "link/secret", Access::none), share("private", "home/private", Access::none),
                 share("music", "music", Access::read)})),
            "");
    }
    void TearDown() override { setStateRoot("/"); }

    /// What the login can do in the view, a line for each: "see team/plan", "write team".
    std::string rightsIn(const fs::path& view) const {
        std::string rights;
        for (const auto& entry : fs::recursive_directory_iterator(view)) {
            rights += "see " + entry.path().lexically_relative(view).string() + "\n";
            struct statvfs mounted {};
            if (statvfs(entry.path().c_str(), &mounted) == 0 && (mounted.f_flag & ST_RDONLY) == 0) {
                rights += "write " + entry.path().lexically_relative(view).string() + "\n";
            }
        }
        return rights;
    }

    /// Runs in a child.
    std::string logIn() const {
        const fs::path view = root_.path() / "view";
        if (unshare(CLONE_NEWNS) != 0) {
            return "refused: no mount namespace";
        }
        const Login login{
            GetParam().view, {"ann", 54321, {54322}}, root_.path() / "home", root_.path() / "guests"};
        Result<std::vector<std::string>> remarks = std::vector<std::string>();
        try {
            remarks = makeLoginView(login, view);
        } catch (const std::exception& exception) {
            return std::string("refused: ") + exception.what(); // as the program does
        }
        endFaults();
        (void)setfsuid(geteuid()); // it may not have come back from the user's rights
        if (!remarks) {
            return "refused: " + remarks.error().message;
        }
        std::string told = rightsIn(view);
        for (const std::string& remark : *remarks) {
            told += "remark " + remark + "\n";
        }
        return told;
    }

    TemporaryFolder root_;
};

TEST_P(ViewFaults, ShowNoMoreThanTheLoginMaySee) {
    std::optional<Lines> whole;
    FaultSweep sweep;
    sweep.prepare = [] {};
    sweep.act = [this] { return logIn(); };
    sweep.check = [&](const SweptRun& run) {
        if (run.end.told.starts_with("refused: ")) {
            EXPECT_TRUE(whole) << "without a fault";
            EXPECT_GT(run.end.told.size(), 20U);
            return;
        }
        Lines rights = linesOf(run.end.told);
        const bool remarked = std::erase_if(rights, [](const auto& line) { return line[0] == 'r'; }) > 0;
        if (!whole) {
            whole = rights;
            EXPECT_GE(whole->size(), 1U);
            EXPECT_FALSE(whole->contains("see team/secret/file"));
        }
        EXPECT_TRUE(std::ranges::includes(*whole, rights)) << run.end.told;
        EXPECT_TRUE(remarked || rights == *whole) << "less, and nothing is said: " << run.end.told;
    };
    EXPECT_GE(sweepFaults(sweep), 30);
}

constexpr ViewCase views[] = {
    {"AHome", DefaultView::home, ""},
    {"TheShares", DefaultView::shares, ""},
    {"AShareOfARule", DefaultView::home, "/team"},
    {"AFolderOfARule", DefaultView::shares, "/team/drafts"},
    {"AGuest", DefaultView::anonymous, ""},
};

INSTANTIATE_TEST_SUITE_P(All, ViewFaults, testing::ValuesIn(views),
                         [](const auto& view) { return view.param.name; });

TEST(KeysWhileCallsFail, AreThoseOfTheUserOrNone) {
    TemporaryFolder root;
    const fs::path keys = root.write("home/.ssh/authorized_keys", "ssh-rsa A\ncommand=\"x\" ssh-rsa B\n");
    const fs::path further = root.write("home/.ssh/authorized_keys2", "ssh-rsa C\n");
    fs::permissions(keys, fs::perms(0600));
    fs::permissions(further, fs::perms(0620));
    FaultSweep sweep;
    sweep.prepare = [] {};
    sweep.act = [&] {
        const auto read = readKeysForTransfer(root.path() / "home", geteuid());
        return read ? "keys " + *read : "refused: " + read.error().message;
    };
    sweep.check = [](const SweptRun& run) {
        EXPECT_TRUE(run.end.told.starts_with("refused: ")) << run.end.told;
    };
    EXPECT_GE(sweepFaults(sweep), 8) << "others may write to the second file";
    fs::permissions(further, fs::perms(0600));
    sweep.check = [](const SweptRun& run) {
        EXPECT_TRUE(run.end.told == "keys ssh-rsa A\nssh-rsa C\n" || run.end.told.starts_with("refused: "))
            << run.end.told;
    };
    EXPECT_GE(sweepFaults(sweep), 12);
}

} // namespace
} // namespace velt::test
