// Changes of real services: ports that change hands, refusals, and changes that nobody confirms.
#include "tests/support/files.h"
#include "tests/support/text.h"
#include "tests/support/waiting.h"
#include "tests/system/support/plan_service.h"

#include <filesystem>
#include <optional>
#include <thread>

namespace velt::test {
namespace {

using HostChange = PlanService;

TEST_F(HostChange, twoServicesExchangeTheirPorts) {
    done({"ftp", "set", "enable_ftp=on", "portnum=2011"});
    done({"sftp", "set", "enable=on", "portnum=2012"});
    expectAsPlanned(R"({"ftp": {"portnum": 2012}, "sftp": {"portnum": 2011}})");
    const std::string greetings = runProcess({"bash", "-c",
                                              "for port in 2011 2012; do exec 3<>/dev/tcp/127.0.0.1/$port; "
                                              "head -c 4 <&3; exec 3>&-; done"})
                                      .output;
    EXPECT_EQ(greetings, "SSH-220 ");
}

TEST_F(HostChange, aRangeMayTakeThePortThatIsLeft) {
    done({"ftp", "set", "enable_ftp=on", "portnum=2011"});
    expectAsPlanned(R"({"ftp": {"portnum": 2021, "custom_port_range": true, "custom_port": "2001:2019"}})");
}

TEST_F(HostChange, aTakenPortIsFoundByTheDryRunToo) {
    done({"sftp", "set", "enable=on", "portnum=2012"});
    const std::string body = R"({"ftp": {"enable_ftp": true, "portnum": )" + std::to_string(tcpPort) + "}}";
    const HttpResult dry = patch(body, "?dry_run=true");
    EXPECT_EQ(dry.status, 409) << dry.body;
    EXPECT_EQ(dry.json["errors"][0]["field"], "/ftp/portnum");
    const HttpResult real = patch(body);
    EXPECT_EQ(real.status, 409);
    EXPECT_EQ(real.json["detail"], dry.json["detail"]);
}

TEST_F(HostChange, aRestartPausesWhatCannotShareItsPort) {
    done({"ftp", "set", "enable_ftp=on"});
    done({"sftp", "set", "enable=on", "portnum=2012"});
    const auto effectsOf = [](const HttpResult& answer) {
        std::string effects;
        for (const Json::Value& each : answer.json["effects"]) {
            effects += each["effect"].asString() + " " + each["subject"].asString() + ", ";
        }
        return effects;
    };
    const auto plan = [&](const std::string& service) {
        return effectsOf(curl("/api/restart?dry_run=true&service=" + service, "{}", {"--request", "POST"}));
    };
    EXPECT_EQ(plan("ftp"), "hand over ftp, ");
    EXPECT_EQ(plan("sftp"), "pause sftp, start sftp, ");
    const HttpResult real = curl("/api/restart", "{}", {"--request", "POST"});
    EXPECT_EQ(real.json["services"].size(), 2U) << real.body;
}

TEST_F(HostChange, aCertificateThatCannotBeUsedIsNoFaultOfTheRequest) {
    done({"ftp", "set", "enable_ftps=on"});
    std::filesystem::create_directories(worldRoot / "etc/velt/tls");
    writeFile(worldRoot / "etc/velt/tls/server.crt", "nonsense");
    const std::string body = R"({"ftp": {"timeout": 411}})";
    const HttpResult dry = patch(body, "?dry_run=true");
    EXPECT_EQ(dry.status, 409) << dry.body;
    EXPECT_EQ(dry.json["title"], "The certificate of FTPS cannot be used");
    const HttpResult real = patch(body);
    EXPECT_EQ(real.status, 409);
    EXPECT_EQ(real.json["title"], dry.json["title"]);
    EXPECT_EQ(real.json["detail"], dry.json["detail"]);
    EXPECT_EQ(curl("/api/restart", "{}", {"--request", "POST"}).status, 409);
    std::filesystem::remove(worldRoot / "etc/velt/tls/server.crt");
    EXPECT_EQ(patch(body).status, 200);
}

TEST_F(HostChange, whatDoctorWouldFindIsAWarningOfThePlan) {
    done({"ftp", "set", "custom_port_range=on", "custom_port=3000:3100"});
    const UniqueFd other = listenOn(3005);
    const std::string body = R"({"ftp": {"enable_ftp": true, "use_ext_ip": true},
        "chroot_rules": [{"type": "user", "name": "bob", "path": "/attic"}]})";
    const Json::Value plan = patch(body, "?dry_run=true").json["warnings"];
    ASSERT_EQ(plan.size(), 3U) << patch(body, "?dry_run=true").body;
    EXPECT_TRUE(contains(plan[0].asString(), "listens on port 3005, in the passive range")) << textOf(plan);
    EXPECT_TRUE(contains(plan[1].asString(), "but there is none")) << textOf(plan);
    EXPECT_TRUE(contains(plan[2].asString(), "There is no share \"attic\"")) << textOf(plan);
    EXPECT_EQ(patch(body).json["warnings"], plan);
    const Json::Value health = curl("/api/health").json;
    for (const Json::Value& each : plan) {
        EXPECT_TRUE(contains(textOf(health), textOf(each))) << textOf(health);
    }
    EXPECT_EQ(patch(R"({"ftp": {"timeout": 411}})", "?dry_run=true").json["warnings"].size(), 0U)
        << "only what is new";
    EXPECT_EQ(patch(R"({"chroot_rules": []})").status, 200);
}

TEST_F(HostChange, anUnconfirmedChangeIsTakenBackByTheNextVeltd) {
    done({"ftp", "set", "enable_ftp=on"});
    const std::string before = exported();
    done({"ftp", "set", "timeout=444", "--confirm-within", "3"});
    killHost();
    startHost();
    EXPECT_TRUE(contains(exported(), "444"));
    EXPECT_TRUE(waitUntil([&] { return exported() == before; }, std::chrono::seconds(60)));
}

/// Whether the service is said to run.
bool runs(const Json::Value& status, const std::string& service) {
    for (const Json::Value& each : status["services"]) {
        if (each["name"] == service) {
            return each["running"].asBool();
        }
    }
    ADD_FAILURE() << "no service " << service;
    return false;
}

class HostClosing : public PlanService {
protected:
    void SetUp() override {
        PlanService::SetUp();
        furnishSftp();
        done({"ftp", "set", "enable_ftp=on"});
        done({"sftp", "set", "enable=on"});
        session_.emplace(aliceAt());
        download_ = std::thread([this] { result_ = sftp(2222, "get large /mnt/got\n", "700"); });
        EXPECT_TRUE(waitUntil([] { return std::filesystem::exists("/mnt/got"); }, patience));
    }

    void TearDown() override {
        endDownload();
        std::filesystem::remove("/mnt/got");
        PlanService::TearDown();
    }

    /// What it came to.
    int endDownload() {
        if (download_.joinable()) {
            download_.join();
        }
        return result_.exitCode;
    }

    bool sessionGoesOn() { return session_->command("NOOP").code == 200; }
    static bool accepts(int atPort) { return connectTo("127.0.0.1", atPort).get() >= 0; }

    std::optional<FtpSession> session_;
    std::thread download_;
    ProcessResult result_;
};

TEST_F(HostClosing, keptSessionsGoOnWhileTheServicesAcceptNobody) {
    done({"ftp", "set", "enable_ftp=off", "--keep-sessions"});
    done({"sftp", "set", "enable=off", "--keep-sessions"});
    EXPECT_FALSE(accepts(port) || accepts(2222));
    EXPECT_EQ(systemNow().firewall, std::vector<std::string>());
    const Json::Value status = curl("/api/status").json;
    EXPECT_FALSE(runs(status, "ftp") || runs(status, "sftp")) << textOf(status);
    EXPECT_EQ(curl("/api/health").json["findings"].size(), 0U) << curl("/api/health").body;
    EXPECT_TRUE(sessionGoesOn());
    stopHost();
    startHost();
    EXPECT_TRUE(sessionGoesOn()) << "after a restart of veltd";
    done({"ftp", "set", "timeout=444"});
    EXPECT_TRUE(sessionGoesOn()) << "after a change that does not concern it";
    EXPECT_EQ(endDownload(), 0) << result_.errors;
    EXPECT_EQ(std::filesystem::file_size("/mnt/got"), largeSize);
    EXPECT_EQ(session_->command("QUIT").code, 221);
    EXPECT_TRUE(
        waitUntil([] { return !std::filesystem::exists(worldRoot / "run/velt/ftpd.state"); }, patience));
    const Json::Value log = curl("/api/log?limit=100").json;
    EXPECT_FALSE(contains(textOf(log), "another program")) << textOf(log);
}

TEST_F(HostClosing, aServiceThatIsSwitchedOnAgainTakesThemOver) {
    const std::string off = R"({"ftp": {"enable_ftp": false}, "sftp": {"enable": false}})";
    EXPECT_EQ(patch(off, "?sessions=keep").json["sessions_ended"], 0);
    const HttpResult on = patch(R"({"ftp": {"enable_ftp": true}, "sftp": {"enable": true}})");
    EXPECT_EQ(on.json["sessions_ended"], 0) << on.body;
    EXPECT_EQ(fetchHome(), "alice");
    EXPECT_TRUE(servesSftp(2222));
    EXPECT_TRUE(sessionGoesOn());
    EXPECT_EQ(session_->receive("RETR home-of").value_or(""), "alice");
    const Json::Value status = curl("/api/status").json;
    EXPECT_TRUE(runs(status, "ftp") && runs(status, "sftp")) << textOf(status);
    EXPECT_EQ(curl("/api/health").json["findings"].size(), 0U) << curl("/api/health").body;
    EXPECT_EQ(patch(off, "?dry_run=true").json["sessions_ended"], 2);
    EXPECT_EQ(patch(off).json["sessions_ended"], 2);
    EXPECT_FALSE(sessionGoesOn());
    EXPECT_NE(endDownload(), 0);
}

TEST_F(HostClosing, keptSessionsEndWhereAskedFor) {
    const std::string off = R"({"ftp": {"enable_ftp": false}})";
    EXPECT_EQ(patch(off, "?sessions=keep").status, 200);
    const HttpResult plan = patch(R"({"ftp": {"timeout": 445}})", "?dry_run=true&sessions=end");
    EXPECT_EQ(plan.json["sessions_ended"], 1) << plan.body;
    EXPECT_EQ(patch(R"({"ftp": {"timeout": 445}})", "?sessions=end").json["sessions_ended"], 1);
    EXPECT_FALSE(sessionGoesOn());
}

} // namespace
} // namespace velt::test
