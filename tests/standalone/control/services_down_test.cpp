// What an administrator is told of services that are switched on and do not serve.
#include "standalone/standalone.h"
#include "tests/standalone/control/services_fixture.h"

#include <csignal>

namespace velt {

// For the messages of failed comparisons.
void PrintTo(const ServiceDown& down, std::ostream* out) {
    *out << down.service << ": " << down.reason << (down.servesFormerSettings ? " (serves)" : "");
}

namespace test {
namespace {

using Down = std::vector<ServiceDown>;
using std::chrono::seconds;

class ServicesDownTest : public ServicesTest {};

TEST_F(ServicesDownTest, NothingWhenAllIsOffOrServes) {
    storeFtp(0);
    EXPECT_EQ(servicesDown(), Down{});
    storeFtp(tls);
    storeSftp(true);
    ASSERT_EQ(startEnabledServices(), 0) << lastErrorSentence();
    EXPECT_EQ(servicesDown(), Down{});
}

TEST_F(ServicesDownTest, AServiceThatWasNeverStarted) {
    storeFtp(tls);
    storeSftp(true);
    EXPECT_EQ(servicesDown(), (Down{{"ftp", "The FTP daemon does not run.", false},
                                    {"sftp", "The SFTP daemon does not run.", false}}));
}

TEST_F(ServicesDownTest, TheDaemonsWordsOfAFailedStartStayUntilItSucceeds) {
    planDouble().ftpOptions = {"--refuse", "no such certificate"};
    EXPECT_LT(VLIBServicectlStart("ftpd", 0), 0);
    const Down expected{{"ftp", "The FTP daemon does not start: no such certificate.", false}};
    EXPECT_EQ(servicesDown(), expected);
    EXPECT_EQ(servicesDown(), expected) << "asking changes nothing";
    planDouble().ftpOptions = {};
    ASSERT_EQ(startEnabledServices(), 0) << lastErrorSentence();
    EXPECT_EQ(servicesDown(), Down{});
    ASSERT_EQ(VLIBServiceStop("ftpd", 0), 0);
    EXPECT_EQ(servicesDown(), (Down{{"ftp", "The FTP daemon does not run.", false}}));
}

TEST_F(ServicesDownTest, ATakenPortIsNamedWithItsHolder) {
    storeFtp(0);
    storeSftp(true);
    const Listener other(sftpPort_);
    EXPECT_LT(VLIBServiceStart("sftp", 0), 0);
    const Down down = servicesDown();
    ASSERT_EQ(down.size(), 1U);
    EXPECT_EQ(down[0].service, "sftp");
    EXPECT_NE(down[0].reason.find("process " + std::to_string(::getpid())), std::string::npos)
        << down[0].reason;
}

TEST_F(ServicesDownTest, AFailedResumeOfAPausedService) {
    storeFtp(0);
    storeSftp(true);
    ASSERT_EQ(VLIBServiceStart("sftp", 0), 0) << lastErrorSentence();
    ASSERT_EQ(VLIBServicePause("sftp"), 0) << lastErrorSentence();
    EXPECT_EQ(servicesDown(), (Down{{"sftp", "The SFTP daemon is paused.", false}}));
    planDouble().sftpOptions = {"--refuse", "not today"};
    EXPECT_LT(VLIBServiceResume("sftp"), 0);
    EXPECT_EQ(servicesDown(), (Down{{"sftp", "The SFTP daemon does not start: not today.", false}}));
}

TEST_F(ServicesDownTest, ARefusedRestartLeavesFormerSettingsInForce) {
    ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    storeFtp(plain, 500);
    planDouble().refuse = true;
    EXPECT_LT(VLIBServicectlStop("ftpd", 0), 0);
    EXPECT_EQ(servicesDown(), (Down{{"ftp", "The configuration was refused.", true}}));
    planDouble().refuse = false;
    ASSERT_EQ(startEnabledServices(), 0) << lastErrorSentence();
    EXPECT_EQ(servicesDown(), Down{});
}

TEST_F(ServicesDownTest, ADaemonThatKeepsCrashingTellsItsLastEnd) {
    planDouble().ftpOptions = {"--live", "500"};
    ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    const Down expected{{"ftp", "The FTP daemon does not run: velt-test-daemon: lived long enough.", false}};
    EXPECT_TRUE(waitUntil([&expected] { return servicesDown() == expected; }, seconds(20)))
        << testing::PrintToString(servicesDown());
}

TEST_F(ServicesDownTest, RestartsAreCountedByDaemon) {
    planDouble().ftpOptions = {"--live", "500"};
    ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    EXPECT_TRUE(waitUntil([] { return daemonRestarts("ftpd") >= 2; }, seconds(20)));
    EXPECT_EQ(daemonRestarts("sftp"), 0U);
    EXPECT_EQ(daemonRestarts("nonsense"), 0U);
}

TEST_F(ServicesDownTest, DamagedSettingsAreListedSinceNobodyKnowsWhatTheySay) {
    storeSftp(true);
    ASSERT_EQ(startEnabledServices(), 0) << lastErrorSentence();
    ASSERT_TRUE(replaceFile(statePath("/etc/velt/ftp.conf"), "nonsense\n", 0644));
    ASSERT_EQ(VLIBServicectlStop("ftpd", 0), 0);
    ASSERT_TRUE(replaceFile(statePath("/etc/velt/sftp.conf"), "nonsense\n", 0644));
    const Down down = servicesDown();
    ASSERT_EQ(down.size(), 2U);
    EXPECT_NE(down[0].reason.find("ftp.conf, line 1"), std::string::npos) << down[0].reason;
    EXPECT_FALSE(down[0].servesFormerSettings);
    EXPECT_NE(down[1].reason.find("sftp.conf, line 1"), std::string::npos) << down[1].reason;
    EXPECT_TRUE(down[1].servesFormerSettings);
}

TEST_F(ServicesDownTest, DamagedSettingsOfOneServiceDoNotKeepTheOtherDown) {
    storeSftp(true);
    ASSERT_TRUE(replaceFile(statePath("/etc/velt/ftp.conf"), "nonsense\n", 0644));
    EXPECT_LT(startEnabledServices(), 0);
    EXPECT_NE(lastErrorSentence().find("ftp.conf"), std::string::npos) << lastErrorSentence();
    EXPECT_TRUE(accepts(sftpPort_));
}

TEST_F(ServicesDownTest, LeavesTheLastErrorAlone) {
    fail(ErrorNumber::portTaken, "Something else.");
    ASSERT_TRUE(replaceFile(statePath("/etc/velt/ftp.conf"), "nonsense\n", 0644));
    EXPECT_EQ(servicesDown().size(), 1U);
    EXPECT_EQ(lastErrorSentence(), "Something else.");
    EXPECT_EQ(VLIBCErrGet(), static_cast<int>(ErrorNumber::portTaken));
}

} // namespace
} // namespace test
} // namespace velt
