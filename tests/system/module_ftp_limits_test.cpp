// The FTP settings through the module: time-out, rates, connections, file names and file contents.
#include "tests/support/waiting.h"
#include "tests/system/support/module_service.h"

#include <chrono>
#include <thread>

namespace velt::test {
namespace {

TEST_F(ModuleService, endsIdleSessionsAfterTheTimeOut) {
    ASSERT_EQ(setFtp(R"({"timeout": 1})").code, 0);
    EXPECT_EQ(getFtp()["timeout"], 1);
    const auto begin = Clock::now();
    FtpSession session = aliceAt();
    EXPECT_EQ(session.read().code, 421);
    EXPECT_LT(secondsSince(begin), 5);
    ASSERT_EQ(setFtp(R"({"timeout": 100})").code, 0);
    FtpSession longer = aliceAt();
    std::this_thread::sleep_for(std::chrono::milliseconds(1500));
    EXPECT_EQ(longer.command("NOOP").code, 200);
}

TEST_F(ModuleService, limitsEachDirectionForItself) {
    ASSERT_EQ(setFtp(R"({"enable_flow_ctrl": true, "maxdownloadrate": 100, "maxuploadrate": 0})").code, 0);
    EXPECT_GT(secondsToFetch(), 1.0);
    EXPECT_LT(secondsToSend(), 1.0);
    ASSERT_EQ(setFtp(R"({"maxdownloadrate": 0, "maxuploadrate": 100})").code, 0);
    EXPECT_LT(secondsToFetch(), 1.0);
    EXPECT_GT(secondsToSend(), 1.0);
    EXPECT_EQ(getFtp()["maxdownloadrate"], 0);
    EXPECT_EQ(getFtp()["maxuploadrate"], 100);
}

TEST_F(ModuleService, limitsNothingWithoutFlowControl) {
    ASSERT_EQ(setFtp(R"({"enable_flow_ctrl": false, "maxdownloadrate": 10, "maxuploadrate": 10})").code, 0);
    EXPECT_EQ(getFtp()["enable_flow_ctrl"], false);
    EXPECT_LT(secondsToFetch(), 1.0);
    EXPECT_LT(secondsToSend(), 1.0);
}

TEST_F(ModuleService, countsTheConnectionsOfOneAddress) {
    ASSERT_EQ(setFtp(R"({"max_conn_per_ip": 2})").code, 0);
    EXPECT_EQ(getFtp()["max_conn_per_ip"], 2);
    {
        FtpSession first(port);
        FtpSession second(port);
        EXPECT_EQ(first.greeting().code, 220);
        EXPECT_EQ(second.greeting().code, 220);
        EXPECT_EQ(FtpSession(port).greeting().code, 530);
    }
    ASSERT_EQ(setFtp(R"({"max_conn_per_ip": 0})").code, 0);
    std::vector<FtpSession> sessions;
    for (int i = 0; i < 5; i++) {
        sessions.emplace_back(port);
        EXPECT_EQ(sessions.back().greeting().code, 220);
    }
}

TEST_F(ModuleService, hasThreeModesOfFileNames) {
    ASSERT_EQ(setFtp(R"({"utf8_mode": 2})").code, 0);
    EXPECT_EQ(getFtp()["utf8_mode"], 2);
    EXPECT_EQ(nameForms(aliceAt()), (NameForms{true, true}));
    ASSERT_EQ(setFtp(R"({"utf8_mode": 1})").code, 0);
    EXPECT_EQ(getFtp()["utf8_mode"], 1);
    EXPECT_EQ(nameForms(aliceAt()), (NameForms{true, false}));
    ASSERT_EQ(setFtp(R"({"utf8_mode": 0})").code, 0);
    EXPECT_EQ(getFtp()["utf8_mode"], 0);
    EXPECT_EQ(nameForms(aliceAt()), (NameForms{false, false}));
}

TEST_F(ModuleService, setsFileNamesInEarlierVersionsToo) {
    ASSERT_EQ(setFtp(R"({"enable_utf8": true})", 1).code, 0);
    ASSERT_EQ(setFtp(R"({"use_utf8": true})", 2).code, 0);
    EXPECT_EQ(nameForms(aliceAt()), (NameForms{true, true}));
    ASSERT_EQ(setFtp(R"({"enable_utf8": false})", 1).code, 0);
    EXPECT_EQ(getFtp(1)["enable_utf8"], true) << "not while sessions start in UTF-8";
    ASSERT_EQ(setFtp(R"({"use_utf8": false})", 2).code, 0);
    EXPECT_EQ(getFtp(2)["use_utf8"], false);
    EXPECT_EQ(nameForms(aliceAt()), (NameForms{true, false}));
    ASSERT_EQ(setFtp(R"({"enable_utf8": false})", 1).code, 0);
    EXPECT_EQ(nameForms(aliceAt()), (NameForms{false, false}));
}

TEST_F(ModuleService, convertsLineEndsInAsciiModeOnly) {
    writeFile("/mnt/home/alice/text", "a\nb\n", aliceId);
    for (const bool enabled : {true, false}) {
        ASSERT_EQ(setFtp(enabled ? R"({"enable_ascii": true})" : R"({"enable_ascii": false})").code, 0);
        EXPECT_EQ(getFtp()["enable_ascii"], enabled);
        FtpSession session = aliceAt();
        ASSERT_EQ(session.command("TYPE A").code, 200);
        EXPECT_EQ(session.receive("RETR text"), enabled ? "a\r\nb\r\n" : "a\nb\n");
    }
}

} // namespace
} // namespace velt::test
