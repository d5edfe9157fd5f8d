// What an administrator is told of services that are switched on and do not serve.
#include "standalone/standalone.h"
#include "tests/standalone/control/services_fixture.h"
#include "tests/support/waiting.h"

#include <fstream>

namespace velt {

// For the messages of failed comparisons.
void PrintTo(const ServiceDown& down, std::ostream* out) {
    *out << down.service << ": " << down.reason << (down.servesFormerSettings ? " (serves)" : "");
}

namespace test {
namespace {

using Down = std::vector<ServiceDown>;
using std::chrono::seconds;

class ServicesDownTest : public ServicesTest {
protected:
    /// An FTP daemon that ends after its start, and each time it is started again.
    void startAndCrash() const {
        planDouble().ftpOptions = {"--end-if", root_ / "end"};
        ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
        std::ofstream(root_ / "end").flush();
    }
};

TEST_F(ServicesDownTest, NothingWhenAllIsOffOrServes) {
    storeFtp(0);
    EXPECT_EQ(servicesDown(), Down{});
    storeFtp(tls);
    storeSftp(true);
    ASSERT_EQ(messageOf(startEnabledServices()), "");
    EXPECT_EQ(servicesDown(), Down{});
}

TEST_F(ServicesDownTest, AServiceThatWasNeverStarted) {
    storeFtp(tls);
    storeSftp(true);
    EXPECT_EQ(servicesDown(), (Down{{"ftp", "The FTP daemon does not run.", false, "FTP"},
                                    {"sftp", "The SFTP daemon does not run.", false, "SFTP"}}));
}

TEST_F(ServicesDownTest, TheDaemonsWordsOfAFailedStartStayUntilItSucceeds) {
    planDouble().ftpOptions = {"--refuse", "no such certificate"};
    EXPECT_LT(VLIBServicectlStart("ftpd", 0), 0);
    const Down expected{{"ftp", "The FTP daemon does not start: no such certificate.", false, "FTP"}};
    EXPECT_EQ(servicesDown(), expected);
    EXPECT_EQ(servicesDown(), expected) << "asking changes nothing";
    planDouble().ftpOptions = {};
    ASSERT_EQ(messageOf(startEnabledServices()), "");
    EXPECT_EQ(servicesDown(), Down{});
    ASSERT_EQ(VLIBServiceStop("ftpd", 0), 0);
    EXPECT_EQ(servicesDown(), (Down{{"ftp", "The FTP daemon does not run.", false, "FTP"}}));
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
    EXPECT_EQ(servicesDown(), (Down{{"sftp", "The SFTP daemon is paused.", false, "SFTP"}}));
    planDouble().sftpOptions = {"--refuse", "not today"};
    EXPECT_LT(VLIBServiceResume("sftp"), 0);
    EXPECT_EQ(servicesDown(), (Down{{"sftp", "The SFTP daemon does not start: not today.", false, "SFTP"}}));
}

TEST_F(ServicesDownTest, ARefusedRestartLeavesFormerSettingsInForce) {
    ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    storeFtp(plain, 500);
    planDouble().refuse = true;
    EXPECT_LT(VLIBServicectlStop("ftpd", 0), 0);
    EXPECT_EQ(servicesDown(), (Down{{"ftp", "The configuration was refused.", true, "FTP"}}));
    planDouble().refuse = false;
    ASSERT_EQ(messageOf(startEnabledServices()), "");
    EXPECT_EQ(servicesDown(), Down{});
}

TEST_F(ServicesDownTest, ADaemonThatKeepsCrashingTellsItsLastEnd) {
    startAndCrash();
    const Down expected{{"ftp", "The FTP daemon does not run: velt-test-daemon: told to end.", false, "FTP"}};
    EXPECT_TRUE(waitUntil([&expected] { return servicesDown() == expected; }, patience))
        << testing::PrintToString(servicesDown());
}

TEST_F(ServicesDownTest, RestartsAreCountedByDaemon) {
    startAndCrash();
    EXPECT_TRUE(waitUntil([] { return daemonRestarts().at("ftp") >= 2; }, patience));
    EXPECT_EQ(daemonRestarts().at("sftp"), 0U);
    EXPECT_EQ(daemonRestarts().size(), allDaemons().size());
}

TEST_F(ServicesDownTest, DamagedSettingsAreListedSinceNobodyKnowsWhatTheySay) {
    storeSftp(true);
    ASSERT_EQ(messageOf(startEnabledServices()), "");
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
    const std::string refusal = messageOf(startEnabledServices());
    EXPECT_NE(refusal.find("ftp.conf"), std::string::npos) << refusal;
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
