// veltd while it changes the settings of an FTP service that runs, and one system call after another fails:
// it says what is so, settings and daemon are old or new together, and one daemon serves.
#include "tests/support/waiting.h"
#include "tests/system/support/watched_veltd.h"

#include <arpa/inet.h>
#include <sys/socket.h>

#include <algorithm>
#include <csignal>
#include <filesystem>
#include <optional>

namespace velt::test {
namespace fs = std::filesystem;

namespace {

bool accepts(int port) {
    const UniqueFd socket(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0));
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(static_cast<in_port_t>(port));
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    return ::connect(socket.get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0;
}

/// How many processes of this world run the program.
long processesOf(const std::string& program) {
    std::error_code gone;
    const fs::directory_iterator processes("/proc");
    return std::count_if(begin(processes), end(processes), [&](const fs::directory_entry& process) {
        return fs::read_symlink(process.path() / "exe", gone).filename() == program; // not of one that ended
    });
}

struct Change {
    const char* name;
    const char* settings; ///< as a PATCH has them
    int portThen;
};

void PrintTo(const Change& change, std::ostream* out) {
    *out << change.name;
}

class VeltdFtpFaults : public WatchedVeltd, public testing::WithParamInterface<Change> {
protected:
    void SetUp() override {
        WatchedVeltd::SetUp();
        if (IsSkipped() || HasFatalFailure()) {
            return;
        }
        veltd_.emplace([] { return becomeVeltd({}); }, CallWatch::Decide());
        ASSERT_TRUE(answers(veltd_->child())) << words();
        bringBack();
        old_ = settings();
        ASSERT_TRUE(accepts(port)) << old_;
    }

    void TearDown() override {
        if (veltd_) {
            EXPECT_EQ(ask("PATCH", "/api/settings", R"({"ftp":{"enable_ftp":false}})").status, 200);
            EXPECT_TRUE(waitUntil([] { return processesOf("velt-supervise") == 0; }, patience));
            kill(veltd_->child(), SIGTERM);
            EXPECT_TRUE(veltd_->finish(std::chrono::seconds(10)).inTime);
            veltd_.reset();
        }
        WatchedVeltd::TearDown();
    }

    static std::string settings() { return ask("GET", "/api/settings").body; }

    void bringBack() const {
        if (old_.empty() || settings() != old_) {
            ask("PATCH", "/api/settings",
                R"({"ftp":{"enable_ftp":true,"timeout":60,"portnum":)" + std::to_string(port) + "}}");
        }
    }

    /// Of a change that is done, or of one that is not.
    void expectTruth(const SweptRun& run) const {
        const bool done = answer_.status == 200;
        const std::string now = settings();
        EXPECT_TRUE(now == new_ || (now == old_ && !done)) << now;
        const bool ofConnection = run.call.subject.starts_with("socket:") ||
                                  run.call.subject.starts_with("anon_inode:") ||
                                  run.call.name.starts_with("accept");
        EXPECT_TRUE(done || answer_.status >= 400 || ofConnection) << answer_.status;
        if (answer_.status >= 400) {
            const Json::Value answer = answer_.json();
            EXPECT_TRUE(isSentence(answer["detail"].asString())) << answer_.body;
            EXPECT_TRUE(now == old_ || answer["changed"] == true) << answer_.body;
        }
    }

    /// The daemon of the settings serves.
    void expectService() const {
        const int now = settings() == new_ ? GetParam().portThen : port;
        EXPECT_TRUE(waitUntil([now] { return accepts(now); }, patience)) << now;
        for (const int other : {port, GetParam().portThen}) {
            EXPECT_TRUE(other == now || waitUntil([other] { return !accepts(other); }, patience)) << other;
        }
        EXPECT_EQ(processesOf("velt-supervise"), 1);
    }

    std::optional<CallWatch> veltd_;
    std::string old_;
    std::string new_;
    Answer answer_;
};

TEST_P(VeltdFtpFaults, AreToldAndLeaveOldOrNew) {
    FaultSweep sweep;
    sweep.server = &*veltd_;
    sweep.prepare = [this] { bringBack(); };
    sweep.act = [this] {
        answer_ = ask("PATCH", "/api/settings", GetParam().settings);
        return std::to_string(answer_.status) + " " + answer_.body;
    };
    sweep.counts = isVeltds;
    sweep.share = Share::first;
    sweep.oneOf = 6;
    sweep.check = [this](const SweptRun& run) {
        if (run.call.name.empty()) {
            ASSERT_EQ(answer_.status, 200) << answer_.body;
            new_ = settings();
        }
        expectTruth(run);
        expectService();
    };
    EXPECT_GE(sweepFaults(sweep), 15);
    // A former one goes when it has taken what waited at its port.
    EXPECT_TRUE(waitUntil([] { return processesOf("proftpd") == 1; }, patience)) << processesOf("proftpd");
}

const Change changes[] = {
    {"AHandOver", R"({"ftp":{"timeout":77}})", ftpTestPort},
    {"AMove", R"({"ftp":{"timeout":77,"portnum":2122}})", 2122},
};

INSTANTIATE_TEST_SUITE_P(All, VeltdFtpFaults, testing::ValuesIn(changes),
                         [](const auto& change) { return change.param.name; });

} // namespace
} // namespace velt::test
