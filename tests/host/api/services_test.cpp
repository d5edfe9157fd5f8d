// What the host tells about the services, and that it never says "done" while one that is switched on is
// down.

#include "tests/host/fake_standalone.h"
#include "tests/host/host_test.h"
#include "tests/support/fake_platform/fake_platform.h"

namespace {

const std::string ftp = "/api/VELT.Core.FileServ.FTP/v";
const std::string chroot = "/api/VELT.Core.FileServ.FTP.ChrootUser/v";
const std::string sftp = "/api/VELT.Core.FileServ.FTP.SFTP/v1/";
const velt::ServiceDown ftpDown{"ftp", "The FTP daemon does not start: no luck.", false, "FTP"};

class HostServices : public HostTest {
protected:
    void SetUp() override {
        platform.reset();
        access = {};
        settings.workers = 1; // the fake platform knows one thread
        start();
    }

    /// Whether the line is in the metrics.
    bool measured(const std::string& line) const {
        return ("\n" + get("/metrics").body).find("\n" + line + "\n") != std::string::npos;
    }

    fake::Platform& platform = fake::Platform::instance();
    FakeStandalone& access = FakeStandalone::instance();
};

TEST_F(HostServices, AChangeIsDoneThoughAnotherServiceIsDown) {
    access.down = {ftpDown};
    // The first finds something to change, the second does not.
    for (int i = 1; i <= 2; ++i) {
        const Answer answer = post(sftp + "set", R"({"enable":true,"portnum":2222})");
        EXPECT_EQ(answer.status, 200);
        EXPECT_EQ(answer.header("content-type"), "application/json");
        const Json::Value report = answer.json();
        EXPECT_EQ(report["down"][0]["service"], "ftp");
        EXPECT_EQ(report["down"][0]["reason"], "The FTP daemon does not start: no luck.");
        EXPECT_EQ(report["changes"].empty(), i == 2) << answer.body;
        EXPECT_EQ(access.starts, i) << "each change tries to start it";
    }
    EXPECT_TRUE(logged(" The FTP service does not run. The FTP daemon does not start: no luck."));
    EXPECT_TRUE(measured(
        R"(velt_requests_total{api="VELT.Core.FileServ.FTP.SFTP",method="set",outcome="success",version="1"} 2)"));
}

TEST_F(HostServices, AChangeThatGetsTheServiceUpIsDone) {
    access.down = {ftpDown};
    access.startHelps = true;
    EXPECT_EQ(post(sftp + "set", R"({"enable":true})").status, 204);
    EXPECT_EQ(access.starts, 1);
    EXPECT_EQ(access.actor, "admin");
    EXPECT_EQ(post(sftp + "set", R"({"enable":true})").status, 204);
    EXPECT_EQ(access.starts, 1) << "nothing is started when all is well";
}

TEST_F(HostServices, AServiceWithFormerSettingsIsNamed) {
    access.down = {{"sftp", "The configuration was refused.", true, "SFTP"}};
    const Json::Value report = post(sftp + "set", R"({"enable":true})").json();
    EXPECT_EQ(report["down"][0]["serves_former_settings"], true);
}

TEST_F(HostServices, NothingElseStartsServicesDuringAChange) {
    access.watchHeld = 0;
    EXPECT_EQ(get(sftp + "get").status, 200);
    EXPECT_EQ(access.watchHeld, 0) << "a read changes nothing";
    EXPECT_EQ(post(sftp + "set", R"({"enable":true})").status, 204);
    EXPECT_EQ(access.watchHeld, 1);
    stop();
    EXPECT_EQ(access.watchHolds, 0);
}

TEST_F(HostServices, ReadsAndRefusalsStartNothing) {
    access.down = {ftpDown};
    EXPECT_EQ(get(sftp + "get").status, 200);
    EXPECT_EQ(get("/api/status").status, 200);
    EXPECT_EQ(post(sftp + "set", "{}").status, 422);
    EXPECT_EQ(access.starts, 0);
}

TEST_F(HostServices, StatusAndMetricsTellWhatIsSwitchedOnButDown) {
    platform.services["ftpd"] = 1;
    platform.conf.service_flags = 1;
    platform.sftp.enable = 1;
    platform.sftpAlive = 0;
    access.down = {ftpDown, {"sftp", "The SFTP daemon is paused.", false, "SFTP"}};
    const Json::Value services = get("/api/status").json()["services"];
    EXPECT_EQ(services[0]["enabled"], true);
    EXPECT_EQ(services[0]["running"], false);
    EXPECT_EQ(services[0]["reason"], "The FTP daemon does not start: no luck.");
    EXPECT_EQ(services[1]["running"], false);
    EXPECT_FALSE(services[1].isMember("reason")) << "FTPS is off and shall be";
    EXPECT_EQ(services[2]["wanted"], true);
    EXPECT_EQ(services[2]["running"], false);
    EXPECT_EQ(services[2]["reason"], "The SFTP daemon is paused.");
    EXPECT_TRUE(measured(R"(velt_service_enabled{service="ftp"} 1)"));
    EXPECT_TRUE(measured(R"(velt_service_up{service="ftp"} 0)"));
    EXPECT_TRUE(measured(R"(velt_service_enabled{service="sftp"} 1)"));
    EXPECT_TRUE(measured(R"(velt_service_up{service="sftp"} 0)"));
    access.down[0].servesFormerSettings = true;
    EXPECT_EQ(get("/api/status").json()["services"][0]["running"], true);
    EXPECT_TRUE(measured(R"(velt_service_up{service="ftp"} 1)"));
}

TEST_F(HostServices, SettingsThatCannotBeReadAreNotHidden) {
    access.settingsFail = true;
    platform.fail("VELTFTPConfGet", 1); // of the module
    access.down = {{"ftp", "The file ftp.conf, line 1, is damaged.", false, "FTP"}};
    const Json::Value services = get("/api/status").json()["services"];
    ASSERT_EQ(services.size(), 3U);
    EXPECT_TRUE(services[0]["enabled"].isNull());
    EXPECT_TRUE(services[0]["port"].isNull());
    EXPECT_EQ(services[0]["running"], false);
    EXPECT_EQ(services[0]["reason"], "The file ftp.conf, line 1, is damaged.");
}

TEST_F(HostServices, RestartsOfCrashedDaemonsAreCounted) {
    access.restarts = {{"ftp", 2}, {"sftp", 0}};
    EXPECT_TRUE(measured(R"(velt_daemon_restarts_total{daemon="ftp"} 2)"));
    EXPECT_TRUE(measured(R"(velt_daemon_restarts_total{daemon="sftp"} 0)"));
    access.restarts["ftp"] = 3;
    EXPECT_TRUE(measured(R"(velt_daemon_restarts_total{daemon="ftp"} 3)"));
    EXPECT_TRUE(measured(R"(velt_daemon_restarts_total{daemon="ftp"} 3)")) << "none is counted twice";
    access.restarts["ftp"] = 1;
    EXPECT_TRUE(measured(R"(velt_daemon_restarts_total{daemon="ftp"} 4)"))
        << "counted anew, by a new supervisor";
}

TEST_F(HostServices, StatusComesFromTheModulesAnswers) {
    platform.services["ftpd"] = 1;
    platform.sftp.port = 2022;
    const Json::Value status = get("/api/status").json();
    EXPECT_EQ(status["services"][0]["name"], "ftp");
    EXPECT_EQ(status["services"][0]["enabled"], true);
    EXPECT_EQ(status["services"][0]["port"], 21);
    EXPECT_EQ(status["services"][1]["enabled"], false);
    EXPECT_EQ(status["services"][2]["name"], "sftp");
    EXPECT_EQ(status["services"][2]["port"], 2022);
}

TEST_F(HostServices, StatusTellsWhatIsStoredBesideWhatRuns) {
    platform.conf.service_flags = 2;
    platform.sftp.enable = 1;
    platform.sftpAlive = 0;
    const Json::Value services = get("/api/status").json()["services"];
    EXPECT_EQ(services[0]["wanted"], false);
    EXPECT_EQ(services[1]["wanted"], true);
    EXPECT_EQ(services[1]["enabled"], false);
    EXPECT_EQ(services[2]["wanted"], true);
    EXPECT_EQ(services[2]["enabled"], false);
}

TEST_F(HostServices, MetricsCountRequestsByRowAndOutcome) {
    platform.services["ftpd"] = 1;
    get(ftp + "3/get");
    post(sftp + "set", "{}");
    post(sftp + "set", R"({"enable":true})");
    const std::string text = get("/metrics").body;
    for (
        const char* line :
        {R"(velt_requests_total{api="VELT.Core.FileServ.FTP",method="get",outcome="success",version="3"} 1)",
         R"(velt_requests_total{api="VELT.Core.FileServ.FTP.SFTP",method="set",outcome="1901",version="1"} 1)",
         R"(velt_service_up{service="ftp"} 1)", R"(velt_service_up{service="ftps"} 0)",
         R"(velt_service_up{service="sftp"} 1)", R"(velt_daemon_starts_total{service="sftp"} 1)",
         "velt_request_duration_seconds_bucket"}) {
        EXPECT_NE(text.find(line), std::string::npos) << line << "\n" << text;
    }
}

TEST_F(HostServices, TheStatusHasTheirSessions) {
    access.activity.sessions = {{velt::SessionProtocol::ftps, 3}, {velt::SessionProtocol::sftp, 40}};
    access.lostRecords = 7;
    const Json::Value status = get("/api/status").json();
    EXPECT_EQ(status["services"][0]["sessions"], 0);
    EXPECT_EQ(status["services"][1]["sessions"], 3);
    EXPECT_EQ(status["services"][2]["sessions"], 40);
    EXPECT_EQ(status["lost_records"], 7);
}

TEST_F(HostServices, WhatUsersDoIsMeasured) {
    using velt::SessionProtocol;
    for (const char* const line :
         {"velt_sessions{protocol=\"ftp\"} 0", "velt_records_lost_total 0", "velt_records_damaged_total 0",
          "velt_transfer_octets_total{direction=\"download\",protocol=\"ftp\"} 0",
          "velt_logins_total{outcome=\"configuration\",protocol=\"sftp\"} 0"}) {
        EXPECT_TRUE(measured(line)) << line << "\n" << get("/metrics").body;
    }
    access.activity.sessions = {{SessionProtocol::ftp, 2}};
    access.activity.octets = {{SessionProtocol::sftp, {1000, 5}}};
    access.activity.logins = {{{SessionProtocol::ftps, "password"}, 9},
                              {{SessionProtocol::ftps, "anything else"}, 1}};
    access.lostRecords = 4;
    access.activity.damaged = 6;
    for (int i = 0; i < 2; ++i) {
        for (const char* const line :
             {"velt_sessions{protocol=\"ftp\"} 2", "velt_records_lost_total 4",
              "velt_records_damaged_total 6",
              "velt_transfer_octets_total{direction=\"upload\",protocol=\"sftp\"} 1000",
              "velt_transfer_octets_total{direction=\"download\",protocol=\"sftp\"} 5",
              "velt_logins_total{outcome=\"password\",protocol=\"ftps\"} 9"}) {
            EXPECT_TRUE(measured(line)) << line << "\n" << get("/metrics").body;
        }
    }
    EXPECT_EQ(get("/metrics").body.find("anything"), std::string::npos) << "no label of others' making";
    access.activity.sessions.clear();
    access.lostRecords = 0;
    EXPECT_TRUE(measured("velt_sessions{protocol=\"ftp\"} 0"));
    EXPECT_TRUE(measured("velt_records_lost_total 4")) << "a counter never goes back";
}

} // namespace
