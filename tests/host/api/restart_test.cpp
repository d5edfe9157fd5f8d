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
    EXPECT_EQ(answer.body, R"({"services":[{"ended":1,"kept":2,"service":"ftp"}]})");
    EXPECT_EQ(post("/api/restart").status, 200);
    EXPECT_EQ(access.askedRestarts, (std::vector<std::string>{"ftp end", " keep"}));
}

TEST_F(HostRestart, IsRefusedForWhatIsNoServiceAndForViewers) {
    for (const char* query : {"service=ftps", "service=", "sessions=all", "x=1"}) {
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
