// Logins over SFTP, and what sessions try there, while one system call after another fails: a login sees what
// it should or less, or is refused, and nothing changes what it may not.
#include "standalone/core/state_root.h"
#include "standalone/rules/rule_store.h"
#include "tests/standalone/support/store_shares.h"
#include "tests/support/fault_sweep.h"
#include "tests/support/result.h"
#include "tests/support/run_program.h"
#include "tests/support/temporary_folder.h"
#include "tests/support/text.h"

#include <gtest/gtest.h>

#include <sched.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <set>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

constexpr uid_t ann = 54321;

/// A home whose kept files lie behind links, and a share with one for reading and one that is closed in it.
class SftpFaults : public testing::Test {
protected:
    void SetUp() override {
        if (geteuid() != 0) {
            GTEST_SKIP() << "only root can make mounts";
        }
        chmod(root_.path().c_str(), 0755);
        setStateRoot(root_.path());
        bringBack();
        fs::create_directory(root_.path() / "view");
        root_.write("accounts/passwd",
                    "root:x:0:0::/root:/bin/sh\nann:x:54321:54321::" + home_.string() + ":/bin/sh\n");
        root_.write("accounts/group", "root:x:0:\nann:x:54321:\nteam:x:54322:ann\n");
        root_.write("accounts/nsswitch.conf", "passwd: files\ngroup: files\ninitgroups: files\n");
        ASSERT_EQ(messageOf(makeRulesFile()), "");
        const auto share = [this](const char* name, const char* folder, Access access) {
            return ShareEntry{name, "", root_.path() / folder, true, {{"ann", access}}, {}};
        };
        ASSERT_EQ(messageOf(storeShares({share("team", "team", Access::write),
                                         share("drafts", "team/drafts", Access::read),
                                         share("secret", "team/secret", Access::none)})),
                  "");
    }
    void TearDown() override { setStateRoot("/"); }

    static void confineTo(const std::string& folder) {
        ASSERT_EQ(messageOf(storeRules({{true, ann, folder}})), "");
    }

    void bringBack() const {
        for (const char* folder : {"home", "team"}) {
            fs::remove_all(root_.path() / folder);
        }
        for (const char* file :
             {"home/dots/keys/authorized_keys", "home/dots/rc", "home/.profile", "home/letter", "team/letter",
              "team/plan", "team/drafts/draft", "team/secret/file"}) {
            root_.write(file, "old");
        }
        fs::create_directory_symlink("dots/keys", home_ / ".ssh");
        fs::create_symlink("dots/rc", home_ / ".bashrc");
        fs::create_hard_link(home_ / "dots/rc", home_ / "twin");
        own(home_);
        own(root_.path() / "team");
    }
    static void own(const fs::path& folder) {
        EXPECT_EQ(chown(folder.c_str(), ann, ann), 0);
        for (const auto& entry : fs::recursive_directory_iterator(folder)) {
            EXPECT_EQ(lchown(entry.path().c_str(), ann, ann), 0);
        }
    }

    /// What the stand-in for the daemon tells, or "refused"; with "remark" where its library says something.
    /// Runs in a child.
    std::string serve(const std::string& how, const std::vector<std::string>& paths) const {
        bool ready =
            unshare(CLONE_NEWNS) == 0 && mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0;
        for (const char* file : {"passwd", "group", "nsswitch.conf"}) {
            const std::string own = root_.path() / "accounts" / file;
            ready = ready &&
                    mount(own.c_str(), (std::string("/etc/") + file).c_str(), nullptr, MS_BIND, nullptr) == 0;
        }
        if (!ready) {
            return "no mounts of its own";
        }
        const std::string view = root_.path() / "view";
        std::vector<std::string> words{"/usr/bin/env",
                                       std::string("LD_PRELOAD=") + VELT_SFTP_SESSION,
                                       std::string("VELT_SESSION_PROGRAM=") + VELT_LOGIN_VIEW,
                                       "VELT_SESSION_STATE=" + root_.path().string(),
                                       "VELT_SESSION_ROOT=" + view,
                                       VELT_STAND_IN_SFTP,
                                       how,
                                       view};
        words.insert(words.end(), paths.begin(), paths.end());
        const auto ended = runProcess(words);
        return ended.output + (ended.exitCode == 0 ? "" : "refused\n") +
               (ended.errors.empty() ? "" : "remark\n");
    }

    /// Where no session may change anything.
    std::string keptFiles() const {
        std::string all;
        for (const char* file :
             {"home/.profile", "home/.bashrc", "home/.ssh/authorized_keys", "home/dots/rc",
              "home/dots/keys/authorized_keys", "home/twin", "team/drafts/draft", "team/secret/file"}) {
            struct stat status {};
            const std::string path = root_.path() / file;
            const bool there = stat(path.c_str(), &status) == 0;
            all += std::string(file) + " " + (there ? root_.read(file) : "gone") + " " +
                   std::to_string(status.st_mode & 0777) + (status.st_mtime < 1000 ? " old" : "") + "\n";
        }
        return all;
    }

    /// Not those of the program, which program_fault_test.cpp fails.
    static bool isTheSessions(const SeenCall& call) {
        return call.program == "stand-in-sftp" && !isLoading(call);
    }
    static bool sees(const std::set<std::string>& lines) {
        return std::ranges::any_of(lines, [](const auto& line) { return line.starts_with("see "); });
    }

    TemporaryFolder root_;
    const fs::path home_ = root_.path() / "home";
};

struct LoginCase {
    const char* name;
    const char* rule;
    std::vector<std::string> seen;   ///< some of it
    std::vector<std::string> unseen; ///< in the words of the stand-in
    std::vector<std::string> tried;
};

void PrintTo(const LoginCase& login, std::ostream* out) {
    *out << login.name;
}

class SftpLoginFaults : public SftpFaults, public testing::WithParamInterface<LoginCase> {};

TEST_P(SftpLoginFaults, ShowAndOpenNoMoreThanTheLoginMaySee) {
    confineTo(GetParam().rule);
    const std::string kept = keptFiles();
    std::set<std::string> whole;
    FaultSweep sweep;
    sweep.prepare = [this] { bringBack(); };
    sweep.act = [this] { return serve("look", GetParam().tried); };
    sweep.counts = isTheSessions;
    sweep.check = [&](const SweptRun& run) {
        std::set<std::string> rights = linesOf(run.end.told);
        EXPECT_EQ(keptFiles(), kept);
        if (run.call.name.empty()) {
            whole = rights;
            for (const std::string& line : GetParam().seen) {
                EXPECT_TRUE(whole.contains(line)) << line << " in " << run.end.told;
            }
            for (const std::string& line : GetParam().unseen) {
                EXPECT_FALSE(whole.contains(line)) << line;
            }
        }
        if (rights.contains("refused")) {
            EXPECT_FALSE(sees(rights)) << run.end.told;
            return;
        }
        const bool remarked = rights.erase("remark") > 0;
        EXPECT_TRUE(std::ranges::includes(whole, rights)) << run.end.told;
        EXPECT_TRUE(remarked || rights == whole) << "less, and nothing is said: " << run.end.told;
    };
    EXPECT_GE(sweepFaults(sweep), 30);
}

const LoginCase logins[] = {
    {"AHome",
     "/home",
     {"see /letter", "write /letter", "see /.profile", "tried"},
     {"see /plan", "see /team", "see /home"},
     {"/.ssh/authorized_keys", "/dots/keys/authorized_keys", "/dots/rc", "/twin", "/.profile", "/.ssh"}},
    {"AShare",
     "/team",
     {"see /plan", "write /plan", "see /drafts/draft", "see /secret", "tried"},
     {"write /drafts/draft", "see /secret/file", "see /.profile"},
     {"/drafts/draft", "/secret/file", "/drafts", "/secret"}},
};

INSTANTIATE_TEST_SUITE_P(All, SftpLoginFaults, testing::ValuesIn(logins),
                         [](const auto& login) { return login.param.name; });

TEST_F(SftpFaults, LetNobodyInWhomTheProgramRefuses) {
    confineTo("/absent");
    FaultSweep sweep;
    sweep.prepare = [] {};
    sweep.act = [this] { return serve("look", {}); };
    sweep.counts = isTheSessions;
    sweep.check = [](const SweptRun& run) {
        const auto lines = linesOf(run.end.told);
        // Without the library the session is served, and sees the empty folder.
        EXPECT_TRUE(lines.contains("refused") || run.call.subject == VELT_SFTP_SESSION) << run.end.told;
        EXPECT_FALSE(sees(lines)) << run.end.told;
    };
    EXPECT_GE(sweepFaults(sweep), 25);
}

class SftpChangeFaults : public SftpFaults, public testing::WithParamInterface<const char*> {};

TEST_P(SftpChangeFaults, LeaveKeptFilesAsTheyAre) {
    confineTo("/home");
    const std::string kept = keptFiles();
    FaultSweep sweep;
    sweep.prepare = [this] { bringBack(); };
    sweep.act = [this] { return serve("change", {GetParam()}); };
    sweep.hasBegin = true;
    sweep.check = [&](const SweptRun& run) {
        // A session ends where it cannot know whether the rules have changed.
        const bool ended = run.end.told == "refused\nremark\n" && contains(run.call.subject, "/etc");
        EXPECT_TRUE(ended || run.end.told == "tried\n") << run.end.told;
        EXPECT_EQ(keptFiles(), kept);
    };
    EXPECT_GE(sweepFaults(sweep), 15);
}

INSTANTIATE_TEST_SUITE_P(All, SftpChangeFaults,
                         testing::Values("/.ssh/authorized_keys", "/.ssh", "/.bashrc",
                                         "/dots/keys/authorized_keys", "/dots/rc", "/twin", "/.profile",
                                         "/dots"));

} // namespace
} // namespace velt::test
