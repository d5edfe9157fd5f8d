// veltd while it starts, serves and stops, and one system call after another fails: it says why it does not
// start, or serves, and lets nobody in whom it would not let in otherwise. The next start works.
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/core/unfinished_change.h"
#include "tests/support/files.h"
#include "tests/support/run_program.h"
#include "tests/support/text.h"
#include "tests/system/support/watched_veltd.h"

#include <grp.h>
#include <sys/stat.h>
#include <sys/wait.h>

#include <algorithm>
#include <map>

namespace velt::test {
namespace fs = std::filesystem;

namespace {

const fs::path kept = "/mnt/kept";
const fs::path certificate = "/mnt/tls/server.crt";
const fs::path key = "/mnt/tls/server.key";

/// What was seen of a veltd that served.
struct Seen {
    bool served = false;
    int stranger = 0; ///< the status over TCP without a token, and without TLS
    int holder = 0;   ///< and with a token
    std::string socket;
    std::string settings;
};

class VeltdStartFaults : public WatchedVeltd {
protected:
    void SetUp() override {
        WatchedVeltd::SetUp();
        if (IsSkipped() || HasFatalFailure()) {
            return;
        }
        setStateRoot(worldRoot);
        fs::create_directory(worldRoot / "run/velt/test.abandoned");
        fs::copy(worldRoot, kept, fs::copy_options::recursive);
        bringBack();
        startHost();
        expected_ = ask("GET", "/api/settings").body;
        EXPECT_EQ(ask("GET", "/api/settings").status, 200);
        ASSERT_EQ(stopHost(), 0);
        known_ = files();
        known_.merge(std::set<std::string>{"var/lib/velt/unfinished-change"});
    }

    void TearDown() override {
        fs::remove_all(kept);
        fs::remove_all(certificate.parent_path());
        setStateRoot("/");
        WatchedVeltd::TearDown();
    }

    /// As after a crash in the middle of a change.
    static void bringBack() {
        clearFolders();
        fs::copy(kept, worldRoot, fs::copy_options::recursive);
        const fs::path settings = statePath(paths::ftpSettings);
        const std::string former = contentsOf(settings);
        ASSERT_TRUE(noteChange({{std::string(paths::ftpSettings), former, "", 0644}}));
        writeFile(settings, former.substr(0, former.size() / 2));
    }

    static int statusOverTcp(const std::string& headers) {
        Client client = Client::tcp(veltdPort);
        return client.connected() ? client.ask(requestText("GET", "/api/tokens", headers)).status : 0;
    }

    /// "660 velt-admin"
    static std::string socketsRights() {
        struct stat facts {};
        const std::string path = worldRoot / "run/velt/veltd.sock";
        const group* const owner = ::stat(path.c_str(), &facts) == 0 ? ::getgrgid(facts.st_gid) : nullptr;
        return owner == nullptr ? "none"
                                : std::to_string((facts.st_mode & 0700U) / 64) +
                                      std::to_string((facts.st_mode & 070U) / 8) +
                                      std::to_string(facts.st_mode & 07U) + " " + owner->gr_name;
    }

    void lookAt(pid_t veltd) {
        seen_ = {};
        seen_.served = answers(veltd);
        if (seen_.served) {
            seen_.stranger = statusOverTcp("");
            seen_.holder = statusOverTcp("Authorization: Bearer " + adminToken + "\r\n");
            seen_.socket = socketsRights();
            for (int i = 0; i < 2 && seen_.settings != expected_; ++i) {
                seen_.settings = ask("GET", "/api/settings").body;
            }
        }
        kill(veltd, SIGTERM);
    }

    void expectTruth(const SweptRun& run) const {
        EXPECT_TRUE(WIFEXITED(run.end.status)) << "it crashed: " << words();
        if (!seen_.served) {
            EXPECT_NE(WEXITSTATUS(run.end.status), 0) << words();
        }
        if (WEXITSTATUS(run.end.status) != 0) { // it may have answered before it noticed
            EXPECT_TRUE(isSentence(lastLine(words())) || contains(words(), "error while loading shared"))
                << words();
            EXPECT_FALSE(contains(words(), "Bad file descriptor")) << "which is not the reason";
            return;
        }
        EXPECT_TRUE(seen_.socket == "660 velt-admin" || seen_.socket == "660 root") << seen_.socket;
        EXPECT_TRUE(seen_.settings == expected_ || contains(words(), "cannot be undone: ")) << words();
    }

    static std::string lastLine(std::string text) {
        text.erase(text.find_last_not_of('\n') + 1);
        return text.substr(text.rfind('\n') + 1);
    }

    void expectNothingLeft(const SweptRun& run) const {
        const std::set<std::string> left = files();
        const bool mayTemporariesStay = run.call.name == "unlink";
        for (const std::string& file : left) {
            // A database's side files are removed by whoever closes it last; the next one can use them, too.
            const bool isTemporary =
                file.ends_with(".sock") || file.ends_with(".db-shm") || file.ends_with(".db-wal");
            EXPECT_TRUE(known_.contains(file) || run.call.name == "flock" ||
                        (mayTemporariesStay && isTemporary))
                << file;
        }
    }

    /// What the next start finds.
    static std::map<std::string, std::string> stored() {
        std::map<std::string, std::string> all;
        for (const std::string& file : files()) {
            const bool isState = file.starts_with("etc/") || file.starts_with("var/lib/");
            if (isState && fs::is_regular_file(worldRoot / file) && !file.ends_with("log.db")) {
                all[file] = contentsOf(worldRoot / file);
            }
        }
        return all;
    }

    void expectNextStart() {
        startHost();
        EXPECT_EQ(ask("GET", "/api/settings").body, expected_);
        EXPECT_EQ(stopHost(), 0) << hostLog();
        EXPECT_FALSE(fs::exists(worldRoot / "run/velt/test.abandoned"));
    }

    std::string expected_; ///< the settings
    std::set<std::string> known_;
    std::vector<std::map<std::string, std::string>> triedStates_;
    Seen seen_;
};

TEST_F(VeltdStartFaults, AreToldAndOpenNothing) {
    FaultSweep sweep;
    sweep.prepare = bringBack;
    sweep.act = [] { return becomeVeltd({}); };
    sweep.meanwhile = [this](pid_t veltd) { lookAt(veltd); };
    // No fault of a machine has this one fail.
    sweep.counts = [](const SeenCall& call) {
        return isVeltds(call) && !(call.name == "write" && contains(call.subject, "eventfd"));
    };
    sweep.share = Share::first;
    sweep.check = [this](const SweptRun& run) {
        expectTruth(run);
        EXPECT_TRUE(seen_.stranger == 401 || seen_.stranger == 0) << seen_.stranger;
        EXPECT_TRUE(seen_.holder == (seen_.served ? 200 : 0) || run.call.error != 0) << seen_.holder;
        expectNothingLeft(run);
        // One state is tried once.
        if (auto state = stored(); std::ranges::find(triedStates_, state) == triedStates_.end()) {
            expectNextStart();
            triedStates_.push_back(std::move(state));
        }
    };
    EXPECT_GE(sweepFaults(sweep), 50);
}

TEST_F(VeltdStartFaults, AreToldForEachThread) {
    FaultSweep sweep;
    sweep.prepare = bringBack;
    sweep.act = [] { return becomeVeltd({}); };
    sweep.meanwhile = [this](pid_t veltd) { lookAt(veltd); };
    sweep.counts = [](const SeenCall& call) { return isVeltds(call) && call.name == "clone3"; };
    sweep.share = Share::all;
    sweep.check = [this](const SweptRun& run) {
        expectTruth(run);
        expectNothingLeft(run);
    };
    EXPECT_GE(sweepFaults(sweep), 8);
}

TEST_F(VeltdStartFaults, NeverServeWithoutTlsWhatIsToHaveIt) {
    fs::create_directory(certificate.parent_path());
    ASSERT_EQ(runProcess({"openssl", "req", "-x509", "-newkey", "ec", "-pkeyopt", "ec_paramgen_curve:P-256",
                          "-nodes", "-days", "2", "-subj", "/CN=test", "-keyout", key, "-out", certificate})
                  .exitCode,
              0);
    FaultSweep sweep;
    sweep.prepare = bringBack;
    sweep.act = [] { return becomeVeltd({"--tls-certificate", certificate, "--tls-key", key}); };
    sweep.meanwhile = [this](pid_t veltd) { lookAt(veltd); };
    sweep.counts = [](const SeenCall& call) {
        return isVeltds(call) && (contains(call.subject, "/tls/") || contains(call.subject, "/ssl/") ||
                                  call.name.starts_with("accept") || call.name == "getsockopt");
    };
    sweep.check = [this](const SweptRun& run) {
        expectTruth(run);
        EXPECT_EQ(seen_.stranger, 0);
        EXPECT_EQ(seen_.holder, 0) << "a token went over the line in the clear";
    };
    EXPECT_GE(sweepFaults(sweep), 6);
}

} // namespace
} // namespace velt::test
