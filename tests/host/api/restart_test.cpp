// Restarting the services.
#include "tests/host/fake_standalone.h"
#include "tests/host/host_test.h"
#include "tests/support/fake_platform/fake_platform.h"

namespace {

class HostRestart : public HostTest {
protected:
    void SetUp() override {
        fake::Platform::instance().reset();
        access = {};
        settings.workers = 1; // the fake platform knows one thread
        start();
    }

    FakeStandalone& access = FakeStandalone::instance();
};

TEST_F(HostRestart, TellsWhatBecameOfTheSessions) {
    access.sessions = {{"ftp", 1, 2}};
    const Answer answer = post("/api/restart?service=ftp&sessions=end");
    EXPECT_EQ(answer.status, 200);
    EXPECT_EQ(answer.body,
              R"({"dry_run":false,"services":[{"ended":1,"kept":2,"service":"ftp"}],"sessions_ended":1})");
    EXPECT_EQ(post("/api/restart").status, 200);
    EXPECT_EQ(access.askedRestarts, (std::vector<std::string>{"ftp end", " keep"}));
}

TEST_F(HostRestart, IsWrittenDown) {
    access.sessions = {{"ftp", 1, 2}};
    ASSERT_EQ(post("/api/restart?service=ftp&sessions=end").status, 200);
    access.sessions = {{"ftp", 0, 0}, {"sftp", 0, 0}};
    ASSERT_EQ(post("/api/restart").status, 200);
    EXPECT_EQ(access.audit, (std::vector<std::string>{"ftp: ftp: 2 sessions went on, 1 ended",
                                                      "all services: there were no sessions"}));
}

TEST_F(HostRestart, ADryRunIsStaged) {
    const Answer plan = post("/api/restart?dry_run=true&sessions=end");
    EXPECT_EQ(plan.status, 200);
    EXPECT_EQ(plan.json()["dry_run"], true);
    EXPECT_EQ(plan.json()["sessions_ended"], 3);
    EXPECT_TRUE(access.audit.empty());
    access.restartFails = true;
    access.sentence = "The port is taken.";
    EXPECT_EQ(post("/api/restart?dry_run=true").json()["detail"], access.sentence);
}

TEST_F(HostRestart, IsRefusedForWhatIsNoServiceAndForViewers) {
    for (const char* query : {"service=ftps", "service=", "sessions=all", "dry_run=maybe", "x=1"}) {
        EXPECT_EQ(post(std::string("/api/restart?") + query).status, 400) << query;
    }
    EXPECT_EQ(ask("POST", "/api/restart", viewer).status, 403);
    EXPECT_TRUE(access.askedRestarts.empty());
}

TEST_F(HostRestart, AFailureIsToldInThePlatformsWords) {
    access.restartFails = true;
    access.sentence = "The FTP daemon does not start: no luck.";
    const Answer answer = post("/api/restart");
    EXPECT_EQ(answer.status, 500);
    EXPECT_EQ(answer.json()["detail"], access.sentence);
}

} // namespace
