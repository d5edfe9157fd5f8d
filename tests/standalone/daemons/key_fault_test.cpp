// Keys while one system call after another fails: keys that are there stay, new ones are
// whole or not there, and nothing else is left behind.
#include "base/file.h"
#include "standalone/core/paths.h"
#include "standalone/core/scratch_folder.h"
#include "standalone/core/state_root.h"
#include "standalone/daemons/sshd/host_keys.h"
#include "standalone/daemons/tls/certificate.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/fault_sweep.h"
#include "tests/support/text.h"

#include <gtest/gtest.h>

#include <sched.h>
#include <sys/mount.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <map>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

/// The files below the state root with what they hold, but for locks.
using Files = std::map<std::string, std::string>;

template<class Value> std::string told(const Result<Value>& result) {
    return result ? "done" : "failed: " + result.error().message;
}

struct Making {
    const char* name;
    std::string (*make)();
    const char* folder; ///< of what is made
};

void PrintTo(const Making& making, std::ostream* out) {
    *out << making.name;
}

const Making makings[] = {
    {"HostKeys", [] { return told(hostKeys()); }, "/var/lib/velt/ssh"},
    {"ACertificate", [] { return told(serverCertificate()); }, "/var/lib/velt/tls"},
};

class KeyFaults : public testing::TestWithParam<Making> {
protected:
    /// In the place of ssh-keygen, which takes its time for a key.
    void SetUp() override {
        if (::geteuid() != 0 || ::unshare(CLONE_NEWNS) != 0 ||
            ::mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) != 0) {
            GTEST_SKIP() << "no mount namespace: " << std::strerror(errno);
        }
        const auto maker = root_.write("maker", "#!/bin/sh\n"
                                                "while [ \"$1\" != -f ]; do shift; done\n"
                                                "echo key > \"$2\"; echo public > \"$2.pub\"\n");
        fs::permissions(maker, fs::perms::owner_all);
        ASSERT_EQ(::mount(maker.c_str(), keyMaker, nullptr, MS_BIND, nullptr), 0) << std::strerror(errno);
    }
    void TearDown() override { ::umount2(keyMaker, MNT_DETACH); }

    static constexpr const char* keyMaker = "/usr/bin/ssh-keygen";

    Files filesIn(const std::string& folder) const {
        Files files;
        std::error_code none;
        for (const auto& entry : fs::recursive_directory_iterator(statePath(folder), none)) {
            if (entry.is_regular_file() && entry.path().filename() != "lock") {
                files[entry.path().lexically_relative(root_.path())] = readFile(entry.path()).valueOr("");
            }
        }
        return files;
    }

    /// What could not be removed is removed by the next start.
    void expectNoScratch(const SweptRun& run) const {
        if (contains(run.call.subject, "/test.")) {
            sweepScratchFolders();
        }
        std::error_code none;
        for (const auto& entry : fs::directory_iterator(statePath(paths::run), none)) {
            EXPECT_FALSE(entry.path().filename().string().starts_with("test.")) << entry.path();
        }
    }

    static void expectToldWhy(const SweptRun& run) {
        const bool failed = run.end.told.starts_with("failed: ") && run.end.told.ends_with(".");
        EXPECT_TRUE(run.end.told == "done" || failed) << run.end.told;
    }

    StateFolder root_;
};

TEST_P(KeyFaults, ChangeNoKeyThatIsThere) {
    ASSERT_EQ(GetParam().make(), "done");
    const Files before = filesIn(GetParam().folder);
    FaultSweep sweep;
    sweep.prepare = [] {};
    sweep.act = GetParam().make;
    sweep.check = [&](const SweptRun& run) {
        expectToldWhy(run);
        EXPECT_TRUE(filesIn(GetParam().folder) == before) << "clients know the server by it";
        expectNoScratch(run);
    };
    EXPECT_GE(sweepFaults(sweep), 4);
}

TEST_P(KeyFaults, MakeWholeKeysOrNone) {
    FaultSweep sweep;
    sweep.prepare = [] { fs::remove_all(statePath(GetParam().folder)); };
    sweep.act = GetParam().make;
    sweep.counts = [](const SeenCall& call) { return call.ofChild && !isLoading(call); };
    sweep.check = [&](const SweptRun& run) {
        expectToldWhy(run);
        for (const auto& [file, text] : filesIn(GetParam().folder)) {
            EXPECT_TRUE(run.call.name == "flock" || !fs::path(file).filename().string().starts_with("."))
                << file;
            EXPECT_TRUE(text.ends_with("\n") || text.empty()) << file;
        }
        expectNoScratch(run);
        EXPECT_EQ(GetParam().make(), "done");
    };
    EXPECT_GE(sweepFaults(sweep), 20);
}

INSTANTIATE_TEST_SUITE_P(All, KeyFaults, testing::ValuesIn(makings),
                         [](const auto& making) { return making.param.name; });

} // namespace
} // namespace velt::test
