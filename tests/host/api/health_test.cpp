// What the host tells of the server's health, and to whom.

#include "tests/host/fake_standalone.h"
#include "tests/host/host_test.h"
#include "tests/support/fake_platform/fake_platform.h"
#include "tests/support/waiting.h"

#include <atomic>
#include <chrono>
#include <memory>

namespace {

using std::chrono::seconds;
using velt::Severity;
using velt::test::patience;
using velt::test::waitUntil;

const velt::Finding expires{"certificate-expires", Severity::warning, "ftp", "It expires soon.",
                            "veltctl restart ftp"};
const velt::Finding down{"service-down", Severity::error, "sftp", "It does not run.", "veltctl restart sftp"};
const velt::Finding remark{"external-address-private", Severity::notice, "ftp", "It is private.",
                           "veltctl x"};

class HostHealth : public HostTest {
protected:
    void SetUp() override {
        fake::Platform::instance().reset();
        fake = {};
        settings.workers = 1;
    }

    void TearDown() override {
        HostTest::TearDown();
        fake = {};
    }

    Answer probe(const std::string& target) const {
        return Client::tcp(port).ask("GET " + target + " HTTP/1.1\r\nHost: any.example\r\n\r\n");
    }

    FakeStandalone& fake = FakeStandalone::instance();
};

TEST_F(HostHealth, IsToldWithWhatMendsIt) {
    fake.findings = {down, expires};
    start();
    const Answer answer = ask("GET", "/api/health", viewer);
    EXPECT_EQ(answer.status, 200);
    EXPECT_EQ(
        answer.body,
        R"({"findings":[{"id":"service-down","mend":"veltctl restart sftp","sentence":"It does not run.",)"
        R"("severity":"error","subject":"sftp"},{"id":"certificate-expires","mend":"veltctl restart ftp",)"
        R"("sentence":"It expires soon.","severity":"warning","subject":"ftp"}],"status":"failed"})");
}

TEST_F(HostHealth, IsAsGoodAsTheWorstFinding) {
    start();
    const auto statusWith = [this](const velt::Findings& findings) {
        stop();
        fake.findings = findings;
        start();
        return get("/api/health").json()["status"].asString();
    };
    EXPECT_EQ(statusWith({}), "ok");
    EXPECT_EQ(statusWith({remark}), "ok");
    EXPECT_EQ(statusWith({expires, remark}), "degraded");
    EXPECT_EQ(statusWith({down, expires}), "failed");
}

TEST_F(HostHealth, IsForThoseWithAccess) {
    start();
    EXPECT_EQ(probe("/api/health").status, 401);
    EXPECT_EQ(probe("/metrics").status, 401);
    EXPECT_EQ(fake.judgements, 0) << "a stranger has nothing judged";
}

TEST_F(HostHealth, WhatWasMendedAMomentAgoIsNotTold) {
    fake.findings = {down};
    start();
    EXPECT_EQ(get("/api/health").json()["status"], "failed");
    fake.findings = {};
    EXPECT_EQ(get("/api/health").json()["status"], "ok");
}

TEST_F(HostHealth, OneThatHadBegunBeforeIsNotTold) {
    const auto hold = std::make_shared<std::atomic<int>>(1);
    fake.whileJudged = [hold] {
        if (hold->fetch_add(1) == 1) {
            waitUntil([&] { return hold->load() > 100; }, seconds(10));
        }
    };
    start();
    Client early = connect();
    early.send(requestText("GET", "/api/health", admin));
    EXPECT_TRUE(waitUntil([&] { return hold->load() > 1; }, patience));
    Client late = connect();
    late.send(requestText("GET", "/api/health", admin));
    *hold = 200;
    EXPECT_EQ(early.receive().status, 200);
    EXPECT_EQ(late.receive().status, 200);
    EXPECT_GE(fake.judgements, 2);
}

TEST_F(HostHealth, ThoseWhoAskAndAskLeaveHalfOfTheTime) {
    constexpr std::chrono::milliseconds slow{60};
    fake.whileJudged = [slow] { std::this_thread::sleep_for(slow); };
    start();
    const auto begun = std::chrono::steady_clock::now();
    for (int i = 0; i < 5; ++i) {
        EXPECT_EQ(get("/api/health").status, 200);
    }
    EXPECT_GE(std::chrono::steady_clock::now() - begun, 9 * slow) << "five, and the pauses between them";
}

TEST_F(HostHealth, ASlowJudgementDelaysNobodyElse) {
    // Judgements go on until the host is stopped, after this test's own end.
    const auto slow = std::make_shared<std::atomic<bool>>(true);
    fake.whileJudged = [slow] { waitUntil([&] { return !*slow; }, seconds(10)); };
    start();
    Client waiting = connect();
    waiting.send(requestText("GET", "/api/health", admin));
    EXPECT_EQ(get("/api/status").status, 200);
    EXPECT_EQ(get("/metrics").status, 200);
    EXPECT_EQ(probe("/healthz").status, 200);
    EXPECT_EQ(probe("/readyz").body, R"({"status":"unknown"})");
    *slow = false;
    EXPECT_EQ(waiting.receive().status, 200);
}

TEST_F(HostHealth, AStrangerLearnsThatTheHostLives) {
    fake.findings = {down};
    start();
    const Answer answer = probe("/healthz");
    EXPECT_EQ(answer.status, 200);
    EXPECT_EQ(answer.body, R"({"status":"ok"})");
    EXPECT_EQ(probe("/healthz?x=y").status, 200);
    EXPECT_EQ(get("/healthz").body, answer.body) << "a token does no harm";
    EXPECT_EQ(ask("GET", "/healthz", "Authorization: Bearer wrong\r\n").status, 401) << "a wrong one does";
    EXPECT_EQ(ask("POST", "/healthz", "").status, 401);
    EXPECT_EQ(fake.judgements, 0);
}

TEST_F(HostHealth, AStrangerLearnsWhetherAllWorks) {
    start();
    EXPECT_TRUE(waitUntil([this] { return probe("/readyz").status == 200; }, patience));
    EXPECT_EQ(probe("/readyz").body, R"({"status":"ok"})");
    stop();
    fake.findings = {expires, remark};
    start();
    EXPECT_TRUE(waitUntil([this] { return probe("/readyz").status == 200; }, patience));
    stop();
    fake.findings = {down};
    start();
    EXPECT_EQ(probe("/readyz").status, 503) << "before the first judgement, too";
    EXPECT_TRUE(waitUntil([this] { return probe("/readyz").body == R"({"status":"failed"})"; }, patience));
    EXPECT_EQ(probe("/readyz").status, 503);
    EXPECT_EQ(get("/readyz").status, 503);
}

TEST_F(HostHealth, ProbesHaveNoMoreJudgedThanEveryTenSeconds) {
    start();
    for (int i = 0; i < 50; ++i) {
        probe("/readyz");
    }
    EXPECT_LE(fake.judgements, 2);
}

TEST_F(HostHealth, FindingsAreMeasured) {
    fake.findings = {down, expires};
    start();
    const std::string error = R"(velt_health_findings{id="service-down",severity="error"} 1)";
    EXPECT_TRUE(waitUntil([&] { return get("/metrics").body.find(error) != std::string::npos; }, patience));
    EXPECT_NE(
        get("/metrics").body.find(R"(velt_health_findings{id="certificate-expires",severity="warning"} 1)"),
        std::string::npos);
    fake.findings = {expires};
    EXPECT_EQ(get("/api/health").json()["findings"].size(), 1U);
    EXPECT_NE(get("/metrics").body.find(R"(velt_health_findings{id="service-down",severity="error"} 0)"),
              std::string::npos)
        << "what is mended does not stand there for ever";
}

} // namespace
