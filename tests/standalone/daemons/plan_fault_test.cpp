// The plan of each daemon, as a start and a change make it, while one system call after another fails: it is
// what it is without a fault or it is not made, and what the running daemon was started with stays.
#include "base/file.h"
#include "standalone/accounts/account_sources.h"
#include "standalone/core/paths.h"
#include "standalone/core/scratch_folder.h"
#include "standalone/daemons/daemon.h"
#include "standalone/rules/rule_store.h"
#include "standalone/settings/settings_store.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/standalone/support/store_shares.h"
#include "tests/support/fault_sweep.h"
#include "tests/support/result.h"
#include "tests/support/text.h"

#include <gtest/gtest.h>

#include <unistd.h>

#include <cstdlib>
#include <map>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

/// Files with their modes and what they hold.
using Files = std::map<std::string, std::string>;

Result<> storeFtp(int timeout) {
    FtpSettings settings = defaultFtpSettings();
    settings.record.service_flags = VELT_FTP_SERVICE_PLAIN | VELT_FTP_SERVICE_TLS;
    settings.record.anonymous = 1;
    settings.record.anonymous_chroot = 1;
    std::snprintf(settings.record.anonymous_chroot_share, sizeof settings.record.anonymous_chroot_share, "%s",
                  "guests");
    settings.timeout = timeout;
    return storeFtpSettings(settings);
}

Result<> storeSftp(int port) {
    return storeSftpSettings({true, port});
}

struct Case {
    const char* name;
    const Daemon* daemon;
    Result<> (*store)(int);
    int former; ///< what is stored in the settings that vary
    int next;
};

void PrintTo(const Case& one, std::ostream* out) {
    *out << one.name;
}

class PlanFaults : public testing::TestWithParam<Case> {
protected:
    void SetUp() override {
        if (::geteuid() != 0 || !fs::exists("/usr/sbin/proftpd") || !fs::exists("/usr/sbin/sshd")) {
            GTEST_SKIP() << "the daemons test what root gives them";
        }
        setenv("VELT_LIBEXEC_DIR", VELT_BUILT_FOLDER, 1);
        sources_.passwd = root_.write("passwd", "root:x:0:0::/root:/bin/sh\nftp:x:1001:1001::/:/bin/sh\n");
        ASSERT_EQ(messageOf(storeShares({{"guests", "", "/srv", true, {{"ftp", Access::read}}, {}}})), "");
        ASSERT_EQ(messageOf(storeRules({{true, 1001, "/home"}})), "");
        ASSERT_EQ(messageOf(GetParam().store(GetParam().former)), "");
        ASSERT_EQ(plan().substr(0, 5), "made ");
        ASSERT_EQ(messageOf(GetParam().store(GetParam().next)), "");
        settled_ = files();
    }

    void TearDown() override { setAccountSources({}); }

    /// In a process that has not planned these settings, whose test it would remember.
    std::string plan() const {
        setAccountSources(sources_); // and knows no account
        const auto made = GetParam().daemon->plan();
        if (!made) {
            return "failed: " + made.error().message;
        }
        return *made ? "made " + (*made)->folder.filename().string() : "nothing to serve";
    }

    /// With their modes.
    Files files() const {
        Files found;
        for (const auto& entry : fs::recursive_directory_iterator(root_.path())) {
            if (entry.is_regular_file() && entry.path().filename() != "lock") {
                const auto mode = static_cast<unsigned>(entry.status().permissions());
                found[entry.path().lexically_relative(root_.path())] =
                    std::to_string(mode) + " " + readFile(entry.path()).valueOr("");
            }
        }
        return found;
    }

    static std::string replaced(std::string text, const std::string& what, const std::string& with) {
        for (auto at = text.find(what); at != std::string::npos; at = text.find(what, at)) {
            text.replace(at, what.size(), with);
        }
        return text;
    }

    /// What came beside the files that were there, by its name in its folder; with "PLAN" for the plan's own
    /// name.
    Files added(const std::string& name) const {
        Files found;
        for (const auto& [file, text] : files()) {
            if (!settled_.contains(file)) {
                found[replaced(file, name, "PLAN")] = replaced(text, name, "PLAN");
            }
        }
        return found;
    }

    void bringBack() const {
        for (const auto& [file, text] : files()) {
            if (!settled_.contains(file)) {
                fs::remove(root_.path() / file);
            }
        }
    }

    /// What a plan that was not made has left of it is whole. One that cannot be locked may be another's.
    void expectWholeFiles(const SweptRun& run) const {
        for (const auto& [file, text] : added(name_)) {
            const auto found = whole_.find(file);
            EXPECT_TRUE(run.call.name == "flock" || (found != whole_.end() && found->second == text)) << file;
        }
    }

    void expectFormerStays() const {
        const Files now = files();
        for (const auto& [file, text] : settled_) {
            EXPECT_TRUE(now.contains(file) && now.at(file) == text) << file;
        }
    }

    /// What could not be removed is removed by the next start.
    void expectNoScratch(const SweptRun& run) const {
        if (contains(run.call.subject, "/test.")) {
            sweepScratchFolders();
        }
        for (const auto& entry : fs::directory_iterator(statePath(paths::run))) {
            EXPECT_FALSE(entry.path().filename().string().starts_with("test.")) << entry.path();
        }
    }

    StateFolder root_;
    AccountSources sources_;
    Files settled_;    ///< with the new settings, before they are planned
    std::string name_; ///< of the plan of these
    Files whole_;      ///< what it adds
};

TEST_P(PlanFaults, MakeItWholeOrNotAndLeaveTheFormer) {
    FaultSweep sweep;
    sweep.prepare = [this] { bringBack(); };
    sweep.act = [this] { return plan(); };
    sweep.share = Share::first;
    sweep.counts = [](const SeenCall& call) { return call.ofChild && !isLoading(call); };
    sweep.check = [this, &sweep](const SweptRun& run) {
        const std::string& told = run.end.told;
        const bool made = told.starts_with("made ");
        EXPECT_TRUE(made || (told.starts_with("failed: ") && told.ends_with("."))) << told;
        EXPECT_FALSE(contains(told, "Success") || contains(told, "not exist")) << told;
        expectNoScratch(run);
        expectFormerStays();
        if (run.call.name.empty()) {
            ASSERT_TRUE(made) << told;
            name_ = told.substr(5);
            whole_ = added(name_);
            EXPECT_GE(whole_.size(), 1U);
        } else if (made) {
            EXPECT_EQ(added(told.substr(5)), whole_);
        } else {
            expectWholeFiles(run);
        }
        CallWatch next([this] { return plan(); }, {});
        EXPECT_TRUE(next.finish(sweep.limit).told.starts_with("made ")) << "the next";
    };
    EXPECT_GE(sweepFaults(sweep), 20);
}

const Case cases[] = {
    {"Ftp", &ftpDaemon, storeFtp, 60, 77},
    {"Sftp", &sftpDaemon, storeSftp, 2222, 2223},
};

INSTANTIATE_TEST_SUITE_P(All, PlanFaults, testing::ValuesIn(cases),
                         [](const auto& one) { return one.param.name; });

} // namespace
} // namespace velt::test
