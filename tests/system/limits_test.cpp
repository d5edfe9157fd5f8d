// Time-out, rates, connections, file names and file contents.
#include "tests/system/support/ftp_service.h"

#include "standalone/contract/last_error.h"
#include "tests/support/files.h"
#include "tests/support/text.h"
#include "tests/support/waiting.h"

#include <sys/socket.h>

#include <array>
#include <chrono>
#include <thread>

namespace velt::test {
namespace {

TEST_F(FtpService, idleSessionsEnd) {
    ASSERT_EQ(VELTFTPTimeOutSet(1), 0) << lastErrorSentence();
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    const auto begin = Clock::now();
    EXPECT_EQ(session.read().code, 421);
    EXPECT_GT(secondsSince(begin), 0.5);
    EXPECT_LT(secondsSince(begin), 5);
}

class FtpRates : public FtpService {
protected:
    const std::string data_ = std::string(300UL * 1024, 'x');

    double secondsToReceive(FtpSession& session) {
        const auto begin = Clock::now();
        EXPECT_EQ(session.receive("RETR data"), data_);
        return secondsSince(begin);
    }
    double secondsToSend(FtpSession& session, const std::string& command) {
        const auto begin = Clock::now();
        EXPECT_EQ(session.send(command, data_), 226);
        return secondsSince(begin);
    }
};

TEST_F(FtpRates, limitDownloadsAndUploadsEachForItself) {
    record.enable_flow_ctrl = 1;
    record.maxdownloadrate = 100;
    record.maxuploadrate = 200;
    start();
    writeFile("/mnt/home/alice/data", data_, aliceId);
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    ASSERT_EQ(session.command("TYPE I").code, 200);
    const double down = secondsToReceive(session);
    EXPECT_GT(down, 2.2);
    EXPECT_LT(down, 6);
    const double up = secondsToSend(session, "STOR sent");
    EXPECT_GT(up, 1.0);
    EXPECT_LT(up, 4);
    EXPECT_GT(secondsToSend(session, "APPE sent"), 1.0);
    EXPECT_GT(secondsToSend(session, "STOU"), 1.0);
}

TEST_F(FtpRates, areNoLimitWhenSwitchedOff) {
    record.maxdownloadrate = 10;
    record.maxuploadrate = 10;
    start();
    writeFile("/mnt/home/alice/data", data_, aliceId);
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    ASSERT_EQ(session.command("TYPE I").code, 200);
    EXPECT_LT(secondsToReceive(session), 2);
    EXPECT_LT(secondsToSend(session, "STOR sent"), 2);
}

TEST_F(FtpService, connectionsOfOneAddressAreCounted) {
    record.max_conn_per_ip = 2;
    start();
    FtpSession first(port);
    FtpSession second(port);
    EXPECT_EQ(first.greeting().code, 220);
    EXPECT_EQ(second.greeting().code, 220);
    EXPECT_EQ(FtpSession(port).greeting().code, 530);
    const UniqueFd other = connectTo("127.0.0.1", port, "127.0.0.2");
    std::array<char, 4> greeting{};
    EXPECT_EQ(recv(other.get(), greeting.data(), 3, MSG_WAITALL), 3);
    EXPECT_STREQ(greeting.data(), "220") << "another address has places of its own";
    EXPECT_EQ(first.command("QUIT").code, 221);
    int code = 530;
    for (int i = 0; i < 100 && code != 220; i++) {
        std::this_thread::sleep_for(std::chrono::milliseconds(20));
        code = FtpSession(port).greeting().code;
    }
    EXPECT_EQ(code, 220) << "the place is free again";
}

TEST_F(FtpService, connectionsAreUnlimitedByDefault) {
    start();
    std::vector<FtpSession> sessions;
    for (int i = 0; i < 12; i++) {
        sessions.emplace_back(port);
        EXPECT_EQ(sessions.back().greeting().code, 220);
    }
}

const std::string latin1 = "gr\xfc\xdf";
const std::string utf8 = "gr\xc3\xbc\xc3\x9f";

TEST_F(FtpService, withoutUtf8SupportNamesAreInTheCodePage) {
    record.support_utf8 = 0;
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    EXPECT_FALSE(contains(session.command("FEAT").text, "UTF8"));
    EXPECT_EQ(session.command("OPTS UTF8 ON").code, 451);
    EXPECT_EQ(session.send("STOR " + latin1, "x"), 226);
    EXPECT_TRUE(std::filesystem::exists("/mnt/home/alice/" + utf8));
    EXPECT_TRUE(contains(session.receive("NLST").value_or(""), latin1));
}

TEST_F(FtpService, utf8OnRequestStartsInTheCodePage) {
    record.support_utf8 = 1;
    ASSERT_EQ(VELTFTPUseUTF8Set(0), 0) << lastErrorSentence();
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    EXPECT_TRUE(contains(session.command("FEAT").text, "UTF8"));
    EXPECT_EQ(session.send("STOR " + latin1, "x"), 226);
    EXPECT_EQ(session.command("OPTS UTF8 ON").code, 200);
    EXPECT_TRUE(contains(session.receive("NLST").value_or(""), utf8));
    EXPECT_EQ(session.command("OPTS UTF8 OFF").code, 200);
    EXPECT_TRUE(contains(session.receive("NLST").value_or(""), latin1));
}

TEST_F(FtpService, withUtf8NamesAreUtf8FromTheStart) {
    record.support_utf8 = 1;
    ASSERT_EQ(VELTFTPUseUTF8Set(1), 0) << lastErrorSentence();
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    EXPECT_TRUE(contains(session.command("FEAT").text, "UTF8"));
    EXPECT_EQ(session.send("STOR " + utf8, "x"), 226);
    EXPECT_TRUE(std::filesystem::exists("/mnt/home/alice/" + utf8));
    EXPECT_EQ(session.command("OPTS UTF8 OFF").code, 451);
}

TEST_F(FtpService, asciiModeConvertsLineEnds) {
    ASSERT_EQ(VELTFTPASCIIEnabledSet(1), 0) << lastErrorSentence();
    start();
    writeFile("/mnt/home/alice/text", "a\nb\n", aliceId);
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    ASSERT_EQ(session.command("TYPE A").code, 200);
    EXPECT_EQ(session.receive("RETR text"), "a\r\nb\r\n");
    EXPECT_EQ(session.send("STOR sent", "c\r\nd\r\n"), 226);
    EXPECT_EQ(contentsOf("/mnt/home/alice/sent"), "c\nd\n");
}

TEST_F(FtpService, asciiModeOffLeavesContentsAlone) {
    ASSERT_EQ(VELTFTPASCIIEnabledSet(0), 0) << lastErrorSentence();
    start();
    writeFile("/mnt/home/alice/text", "a\nb\n", aliceId);
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    ASSERT_EQ(session.command("TYPE A").code, 200);
    EXPECT_EQ(session.receive("RETR text"), "a\nb\n");
    EXPECT_EQ(session.send("STOR sent", "c\r\nd\r\n"), 226);
    EXPECT_EQ(contentsOf("/mnt/home/alice/sent"), "c\r\nd\r\n");
}

TEST_F(FtpService, umaskKeepsOthersFromWriting) {
    ASSERT_EQ(VELTFTPUmaskEnabledSet(true), 0) << lastErrorSentence();
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    EXPECT_EQ(session.send("STOR sent", "x"), 226);
    EXPECT_EQ(session.command("MKD made").code, 257);
    EXPECT_EQ(modeOf("/mnt/home/alice/sent"), 0644U);
    EXPECT_EQ(modeOf("/mnt/home/alice/made"), 0755U);
}

TEST_F(FtpService, umaskOffLeavesAllRights) {
    ASSERT_EQ(VELTFTPUmaskEnabledSet(false), 0) << lastErrorSentence();
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    EXPECT_EQ(session.send("STOR sent", "x"), 226);
    EXPECT_EQ(session.command("MKD made").code, 257);
    EXPECT_EQ(modeOf("/mnt/home/alice/sent"), 0666U);
    EXPECT_EQ(modeOf("/mnt/home/alice/made"), 0777U);
}

} // namespace
} // namespace velt::test
