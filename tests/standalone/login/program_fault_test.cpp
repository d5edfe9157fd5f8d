// The programs of a login while one system call after another fails: whoever they let in sees what he should
// or less, and gets in with his own keys alone.
#include "base/ask_child.h"
#include "standalone/core/state_root.h"
#include "standalone/keys/key_store.h"
#include "standalone/rules/rule_store.h"
#include "tests/standalone/support/example_keys.h"
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
#include <sys/statvfs.h>
#include <unistd.h>

#include <algorithm>
#include <fstream>
#include <set>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

class ProgramFaults : public testing::Test {
protected:
    void SetUp() override {
        if (geteuid() != 0) {
            GTEST_SKIP() << "only root can make mounts";
        }
        chmod(root_.path().c_str(), 0755);
        setStateRoot(root_.path());
    }
    void TearDown() override { setStateRoot("/"); }

    /// In a child, which may change its mounts then.
    static bool hasOwnMounts() {
        return unshare(CLONE_NEWNS) == 0 && mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0;
    }

    /// The calls of the program with this name, of which the system keeps fifteen letters.
    static std::function<bool(const SeenCall&)> callsOf(const std::string& program) {
        return [name = program.substr(0, 15)](const SeenCall& call) {
            return call.program == name && !isLoading(call);
        };
    }

    TemporaryFolder root_;
};

class ViewProgramFaults : public ProgramFaults {
protected:
    void SetUp() override {
        ProgramFaults::SetUp();
        if (IsSkipped()) {
            return;
        }
        for (const char* file : {"home/letter", "team/plan", "team/drafts/draft", "team/secret/file"}) {
            root_.write(file, "x");
        }
        fs::create_directory(root_.path() / "view");
        for (const auto& entry : fs::recursive_directory_iterator(root_.path())) {
            chmod(entry.path().c_str(), entry.is_directory() ? 0777 : 0666);
        }
        ASSERT_EQ(messageOf(makeRulesFile()), "");
        const auto share = [this](const char* name, const char* folder, Access access) {
            return ShareEntry{name, "", root_.path() / folder, true, {{"ann", access}}, {}};
        };
        ASSERT_EQ(messageOf(storeShares({share("team", "team", Access::write),
                                         share("drafts", "team/drafts", Access::read),
                                         share("secret", "team/secret", Access::none)})),
                  "");
    }

    /// What a session sees and may write to once the program has made its view; or why it is refused. Runs in
    /// a child.
    std::string logIn() const {
        if (!hasOwnMounts()) {
            return "no mounts of its own";
        }
        const fs::path view = root_.path() / "view";
        const auto ended = runProcess(
            {VELT_LOGIN_VIEW, root_.path(), "shares", view, "ann", "54321", "54322", root_.path() / "home"});
        endFaults();
        if (ended.exitCode != 0) {
            return "refused: " + ended.errors;
        }
        std::string rights = ended.errors.empty() ? "" : "remark\n";
        for (const auto& entry : fs::recursive_directory_iterator(view)) {
            const std::string name = entry.path().lexically_relative(view);
            struct statvfs mounted {};
            const bool writable =
                statvfs(entry.path().c_str(), &mounted) == 0 && (mounted.f_flag & ST_RDONLY) == 0;
            rights += "see " + name + "\n" + (writable ? "write " + name + "\n" : "");
        }
        return rights;
    }
};

TEST_F(ViewProgramFaults, ShowNoMoreThanTheLoginMaySee) {
    std::set<std::string> whole;
    FaultSweep sweep;
    sweep.prepare = [] {};
    sweep.act = [this] { return logIn(); };
    sweep.counts = callsOf("velt-login-view");
    sweep.check = [&](const SweptRun& run) {
        std::set<std::string> rights = linesOf(run.end.told);
        if (run.call.name.empty()) {
            whole = rights;
            EXPECT_TRUE(whole.contains("write team/plan") && whole.contains("see team/drafts/draft"));
            EXPECT_FALSE(whole.contains("see team/secret/file"));
            EXPECT_FALSE(whole.contains("write team/drafts/draft"));
        }
        if (run.end.told.starts_with("refused: ")) {
            EXPECT_GT(run.end.told.size(), 20U) << run.end.told;
            return;
        }
        const bool remarked = rights.erase("remark") > 0;
        EXPECT_TRUE(std::ranges::includes(whole, rights)) << run.end.told;
        EXPECT_TRUE(remarked || rights == whole) << "less, and nothing is said: " << run.end.told;
    };
    EXPECT_GE(sweepFaults(sweep), 30);
}

class KeyProgramFaults : public ProgramFaults {
protected:
    static constexpr uid_t ann = 54321;

    void SetUp() override {
        ProgramFaults::SetUp();
        if (IsSkipped()) {
            return;
        }
        const std::string home = root_.path() / "home";
        writeOwned("home/.ssh/authorized_keys", "ssh-rsa A\ncommand=\"x\" ssh-rsa B\n", ann);
        for (const std::string& folder : {home, home + "/.ssh"}) {
            ASSERT_EQ(chown(folder.c_str(), ann, ann), 0);
        }
        root_.write("accounts/passwd",
                    "root:x:0:0::/root:/bin/sh\nann:x:54321:54321::" + home + ":/bin/sh\n");
        root_.write("accounts/group", "root:x:0:\nann:x:54321:\nteam:x:54322:ann\n");
        root_.write("accounts/nsswitch.conf", "passwd: files\ngroup: files\ninitgroups: files\n");
    }

    void writeOwned(const char* file, const char* text, uid_t owner) const {
        const fs::path path = root_.write(file, text);
        ASSERT_EQ(chmod(path.c_str(), 0600), 0);
        ASSERT_EQ(chown(path.c_str(), owner, owner), 0);
    }

    /// The keys that the SFTP daemon is told, or "refused: " and what it may have been told before. Runs in a
    /// child.
    std::string tellKeys(const std::vector<std::string>& further = {}) const {
        bool ready = hasOwnMounts();
        for (const char* file : {"passwd", "group", "nsswitch.conf"}) {
            const std::string own = root_.path() / "accounts" / file;
            ready = ready &&
                    mount(own.c_str(), (std::string("/etc/") + file).c_str(), nullptr, MS_BIND, nullptr) == 0;
        }
        if (!ready) {
            return "no mounts of its own";
        }
        std::vector<std::string> words{VELT_AUTHORIZED_KEYS, "ann"};
        words.insert(words.end(), further.begin(), further.end());
        const auto ended = runProcess(words);
        return (ended.exitCode == 0 ? "" : "refused: ") + ended.output +
               (further.empty() || ended.errors.empty() ? "" : "log: " + ended.errors);
    }

    void storeKey(const std::string& line, uid_t uid) const {
        ASSERT_EQ(messageOf(storeKeyFile({"ann", uid, {{keyOf(line), "then", "root"}}})), "");
    }
    std::string tellAllKeys() const {
        const auto asked = askChild([this] {
            std::ofstream(root_.path() / "told") << tellKeys({root_.path()});
            return 0;
        });
        return asked ? root_.read("told") : asked.error().message;
    }
    const std::string stored_ = "restrict " + aKey + "\n";
    const std::string own_ = "ssh-rsa A\n";
};

TEST_F(KeyProgramFaults, TellTheKeysOfTheUserOrRefuse) {
    FaultSweep sweep;
    sweep.prepare = [] {};
    sweep.act = [this] { return tellKeys(); };
    sweep.counts = callsOf("velt-authorized-keys");
    sweep.check = [](const SweptRun& run) {
        const bool refused = run.end.told.starts_with("refused: ");
        EXPECT_TRUE(run.end.told == "ssh-rsa A\n" || (refused && !run.call.name.empty())) << run.end.told;
        EXPECT_FALSE(contains(run.end.told, "ssh-rsa B")) << run.end.told;
    };
    EXPECT_GE(sweepFaults(sweep), 15);
}

TEST_F(KeyProgramFaults, TellTheStoredKeysOfTheAccountAndTheOwn) {
    storeKey(aKey, ann);
    FaultSweep sweep;
    sweep.prepare = [] {};
    sweep.act = [this] { return tellKeys({root_.path()}); };
    sweep.counts = callsOf("velt-authorized-keys");
    sweep.check = [this](const SweptRun& run) {
        const std::string& told = run.end.told;
        const std::string keys = told.substr(0, told.find("log: "));
        const bool isPart = keys == stored_ || keys == own_ || keys.starts_with("refused: ");
        EXPECT_TRUE(told == stored_ + own_ || (isPart && !run.call.name.empty())) << told;
    };
    EXPECT_GE(sweepFaults(sweep), 20);
}

TEST_F(KeyProgramFaults, TellNoKeyOfAFormerAccount) {
    storeKey(aKey, ann + 1);
    FaultSweep sweep;
    sweep.prepare = [] {};
    sweep.act = [this] { return tellKeys({root_.path()}); };
    sweep.counts = callsOf("velt-authorized-keys");
    sweep.check = [](const SweptRun& run) { EXPECT_FALSE(contains(run.end.told, aKey)) << run.end.told; };
    EXPECT_GE(sweepFaults(sweep), 20);
    EXPECT_EQ(tellAllKeys(), own_);
}

using KeyProgram = KeyProgramFaults;

TEST_F(KeyProgram, TellsTheOwnKeysAndWhyThereAreNoOthers) {
    root_.write("etc/velt/keys/ann", "{");
    const std::string damaged = tellAllKeys();
    EXPECT_TRUE(damaged.starts_with(own_ + "log: ")) << damaged;
    EXPECT_TRUE(contains(damaged, "keys of ann: The file of the keys of ann, ")) << damaged;
    storeKey(aKey, ann);
    chmod((root_.path() / "etc/velt/keys/ann").c_str(), 0622);
    const std::string untrusted = tellAllKeys();
    EXPECT_TRUE(untrusted.starts_with(own_ + "log: ")) << untrusted;
    EXPECT_TRUE(contains(untrusted, "other accounts may write to it")) << untrusted;
}

TEST_F(KeyProgram, TellsTheStoredKeysAndWhyThereAreNoOthers) {
    storeKey(aKey, ann);
    chmod((root_.path() / "home/.ssh").c_str(), 0777);
    const std::string told = tellAllKeys();
    EXPECT_TRUE(told.starts_with(stored_ + "log: ")) << told;
    EXPECT_TRUE(contains(told, "can be written by other users")) << told;
    fs::remove_all(root_.path() / "home/.ssh");
    EXPECT_EQ(tellAllKeys(), stored_);
    fs::remove(root_.path() / "etc/velt/keys/ann");
    EXPECT_EQ(tellAllKeys(), "");
}

TEST_F(KeyProgram, ReadsTheStoredKeysAsRootAlone) {
    storeKey(aKey, ann);
    ASSERT_EQ(chown((root_.path() / "etc/velt/keys/ann").c_str(), ann, ann), 0);
    const std::string told = tellAllKeys();
    EXPECT_TRUE(told.starts_with(own_ + "log: ")) << "the user could have written it: " << told;
}

TEST_F(KeyProgramFaults, ReadNothingThatTheUserMayNotRead) {
    writeOwned("home/.ssh/authorized_keys2", "ssh-rsa OF-ROOT\n", 0);
    FaultSweep sweep;
    sweep.prepare = [] {};
    sweep.act = [this] { return tellKeys(); };
    sweep.counts = callsOf("velt-authorized-keys");
    sweep.check = [](const SweptRun& run) { EXPECT_EQ(run.end.told, "refused: "); };
    EXPECT_GE(sweepFaults(sweep), 15);
}

} // namespace
} // namespace velt::test
