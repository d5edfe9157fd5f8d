// veltd while it answers and one system call after another fails: it says what is so, the settings are old or
// new, nothing is left behind, and the next request is answered.
#include "tests/system/support/watched_veltd.h"

#include "tests/support/waiting.h"

#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <optional>

namespace velt::test {
namespace fs = std::filesystem;

namespace {

struct Request {
    const char* name;
    const char* method;
    const char* target; ///< ending with "/", it lacks the id of what is undone or removed
    const char* body;
    const char* end = ""; ///< of the target, behind the id
    int good = 200;
};

void PrintTo(const Request& request, std::ostream* out) {
    *out << request.name;
}

class VeltdRequestFaults : public WatchedVeltd, public testing::WithParamInterface<Request> {
protected:
    void SetUp() override {
        WatchedVeltd::SetUp();
        if (IsSkipped() || HasFatalFailure()) {
            return;
        }
        veltd_.emplace([] { return becomeVeltd({}); }, CallWatch::Decide());
        ASSERT_TRUE(answers(veltd_->child())) << words();
        ask("PATCH", "/api/settings", oldSettings);
        old_ = settings();
        ASSERT_NE(old_, "");
        EXPECT_TRUE(waitUntil([] { return ask("GET", "/readyz").status == 200; }, patience));
    }

    void TearDown() override {
        if (veltd_) {
            kill(veltd_->child(), SIGTERM);
            const ChildEnd end = veltd_->finish(std::chrono::seconds(10));
            EXPECT_TRUE(end.inTime);
            EXPECT_EQ(end.status, 0) << words();
            veltd_.reset();
        }
        WatchedVeltd::TearDown();
    }

    static constexpr const char* oldSettings = R"({"ftp":{"timeout":60},"sftp":{"portnum":2222}})";
    static constexpr const char* newSettings = R"({"ftp":{"timeout":77},"sftp":{"portnum":2223}})";

    static std::string settings() { return ask("GET", "/api/settings").body; }

    static std::string tokens() {
        std::string names;
        const Json::Value listed = ask("GET", "/api/tokens").json();
        for (const Json::Value& token : listed["tokens"]) {
            names += token["name"].asString() + " ";
        }
        return names;
    }

    /// What is undone or removed by the request; "" for others.
    std::string idOfItsObject() const {
        const std::string target = GetParam().target;
        if (target == "/api/history/") {
            return std::to_string(ask("PATCH", "/api/settings", newSettings).json()["id"].asInt());
        }
        return target == "/api/tokens/"
                   ? ask("POST", "/api/tokens", R"({"name":"doomed","role":"admin"})").json()["id"].asString()
                   : "";
    }

    /// The state that each run finds: the former settings and tokens, or those that it is to change.
    void bringBack() {
        if (settings() != old_) {
            ask("PATCH", "/api/settings", oldSettings);
        }
        const Json::Value listed = ask("GET", "/api/tokens").json();
        for (const Json::Value& token : listed["tokens"]) {
            if (token["name"] != "curl") {
                ask("DELETE", "/api/tokens/" + token["id"].asString());
            }
        }
        target_ = GetParam().target + idOfItsObject() + GetParam().end;
        before_ = state();
    }

    static std::string state() { return tokens() + "\n" + settings(); }

    void expectTruth(const SweptRun& run, const std::string& after) const {
        // A row says more than usual when something beside its change has failed.
        const bool warned = answer_.status == 200 && !answer_.json()["warnings"].empty();
        const bool done = answer_.status == GetParam().good || warned;
        const std::string now = state();
        EXPECT_TRUE(now == after || (now == before_ && !done)) << now;
        if (done) {
            return;
        }
        // A connection that breaks has no answer.
        const bool ofConnection = run.call.subject.starts_with("socket:") ||
                                  run.call.subject.starts_with("anon_inode:") ||
                                  run.call.name.starts_with("accept");
        EXPECT_TRUE(answer_.status >= 400 || (answer_.status == 0 && ofConnection)) << answer_.status;
        if (answer_.status != 0) {
            const Json::Value problem = answer_.json();
            const bool probe = problem["status"].isString();
            EXPECT_TRUE(probe || isSentence(problem["detail"].asString())) << answer_.body;
            EXPECT_TRUE(now == before_ || problem["changed"] == true || !problem.isMember("changed"))
                << answer_.body;
        }
    }

    long descriptors() const {
        const fs::path folder = "/proc/" + std::to_string(veltd_->child()) + "/fd";
        return std::distance(fs::directory_iterator(folder), fs::directory_iterator());
    }

    std::optional<CallWatch> veltd_;
    std::string old_;
    std::string target_;
    std::string before_;
    Answer answer_;
};

TEST_P(VeltdRequestFaults, AreToldAndLeaveOldOrNew) {
    bringBack();
    std::string after;
    std::set<std::string> known;
    long open = 0;
    FaultSweep sweep;
    sweep.server = &*veltd_;
    sweep.prepare = [this] { bringBack(); };
    sweep.act = [this] {
        answer_ = ask(GetParam().method, target_, GetParam().body);
        return std::to_string(answer_.status) + " " + answer_.body;
    };
    sweep.counts = isVeltds;
    sweep.share = Share::first;
    sweep.check = [&](const SweptRun& run) {
        if (run.call.name.empty()) {
            EXPECT_EQ(answer_.status, GetParam().good) << answer_.body;
            after = state();
            known = files();
            open = descriptors();
            return;
        }
        expectTruth(run, after);
        // One that cannot be locked may be another's; the next store takes it up.
        EXPECT_TRUE(run.call.name == "flock" || std::ranges::includes(known, files()))
            << testing::PrintToString(files());
        // The database may keep one of its file that it could not look at, until it is closed next.
        const long most = open + (run.call.subject.ends_with("/log.db") ? 3 : 0);
        EXPECT_TRUE(waitUntil([&] { return descriptors() <= most; }, std::chrono::seconds(3)))
            << descriptors() << " descriptors, " << open << " without a fault";
    };
    EXPECT_GE(sweepFaults(sweep), 3);
}

const Request requests[] = {
    {"TheDocument", "GET", "/api/settings", ""},
    {"AChangeOfTheDocument", "PATCH", "/api/settings", R"({"ftp":{"timeout":77},"sftp":{"portnum":2223}})"},
    {"ARowThatReads", "GET", "/api/VELT.Core.FileServ.FTP/v3/get", ""},
    {"ARowThatChanges", "POST", "/api/VELT.Core.FileServ.FTP.SFTP/v1/set",
     R"({"enable":false,"portnum":2223})", "", 204},
    {"TheHistory", "GET", "/api/history", ""},
    {"AnUndo", "POST", "/api/history/", "", "/undo"},
    {"ANewToken", "POST", "/api/tokens", R"({"name":"new","role":"admin"})", "", 201},
    {"ATokenThatGoes", "DELETE", "/api/tokens/", "", "", 204},
    {"TheStatus", "GET", "/api/status", ""},
    {"TheLog", "GET", "/api/log", ""},
    {"TheHealth", "GET", "/api/health", ""},
    {"Readiness", "GET", "/readyz", ""},
};

INSTANTIATE_TEST_SUITE_P(All, VeltdRequestFaults, testing::ValuesIn(requests),
                         [](const auto& request) { return request.param.name; });

} // namespace
} // namespace velt::test
