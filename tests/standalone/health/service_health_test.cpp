// What is found about services that run, or should.
#include "standalone/core/installed_files.h"
#include "standalone/standalone.h"
#include "tests/standalone/control/services_fixture.h"
#include "tests/standalone/health/health_test.h"

#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include <filesystem>

namespace velt::test {
namespace {

using ServiceHealth = ServicesTest;

TEST_F(ServiceHealth, ADownServiceIsNamedWithItsReason) {
    planDouble().ftpOptions = {"--refuse", "no such certificate"};
    EXPECT_LT(VLIBServicectlStart("ftpd", 0), 0);
    EXPECT_EQ(serviceFindings(),
              (Findings{{"service-down", Severity::error, "ftp",
                         "The FTP service does not run. The FTP daemon does not start: no such certificate.",
                         "veltctl restart ftp"}}));
    EXPECT_EQ(greetingFindings(), Findings()) << "it is said once";
}

TEST_F(ServiceHealth, FormerSettingsAreAWarning) {
    ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    storeFtp(plain, 500);
    planDouble().refuse = true;
    EXPECT_LT(VLIBServicectlStop("ftpd", 0), 0);
    EXPECT_EQ(summary(serviceFindings()), "warning service-former-settings");
}

TEST_F(ServiceHealth, SettingsThatTheDaemonWouldRefuseAreNamedWhileItRuns) {
    ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    EXPECT_EQ(settingsInForceFindings(), Findings());
    planDouble().refuse = true;
    EXPECT_EQ(settingsInForceFindings(),
              (Findings{{"next-start-fails", Severity::warning, "ftp",
                         "The FTP service runs, but could not be started again. The configuration was "
                         "refused.",
                         "Mend this, then run: veltctl restart ftp"}}));
    planDouble().refuse = false;
}

TEST_F(ServiceHealth, AMoveToAPortThatIsBoundAndDoesNotListenIsNamed) {
    ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    ftpPort_ = freePort();
    const int other = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(static_cast<in_port_t>(ftpPort_));
    ASSERT_EQ(::bind(other, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
    storeFtp(plain);
    EXPECT_LT(VLIBServicectlStop("ftpd", 0), 0);
    const Findings found = serviceFindings();
    EXPECT_EQ(summary(found), "warning service-former-settings");
    EXPECT_NE(found.at(0).sentence.find(std::to_string(ftpPort_)), std::string::npos) << found.at(0).sentence;
    EXPECT_EQ(found.at(0).mend,
              "End the program that has the port, or choose another port, then run: veltctl restart ftp");
    ::close(other);
}

TEST_F(ServiceHealth, ADaemonOfAReplacedProgramIsNamed) {
    const std::string program = root_ / "daemon";
    DaemonOrder order = testOrder(ftpPort_, "replaced");
    std::filesystem::copy_file(order.arguments.at(0), program);
    order.arguments.at(0) = program;
    ASSERT_EQ(messageOf(SupervisedDaemon(ftpDaemon).start(order)), "");
    EXPECT_EQ(replacedProgramFindings(), Findings());
    std::filesystem::copy_file(program, program + ".new");
    std::filesystem::rename(program + ".new", program);
    EXPECT_EQ(replacedProgramFindings(), (Findings{{"program-replaced", Severity::warning, "ftp",
                                                    "The FTP daemon still runs with the former version of " +
                                                        program + ", which has been replaced.",
                                                    "veltctl restart ftp"}}));
}

TEST_F(ServiceHealth, AReplacedSupervisorIsNamedAndGoesWithItsSessions) {
    const auto program = root_ / "velt-supervise";
    std::filesystem::copy_file(installedFile("velt-supervise"), program);
    ASSERT_EQ(::setenv("VELT_LIBEXEC_DIR", root_.c_str(), 1), 0);
    ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    Client client(ftpPort_);
    ASSERT_TRUE(client.isServed());
    std::filesystem::copy_file(program, program.string() + ".new");
    std::filesystem::rename(program.string() + ".new", program);
    const Findings expected{{"program-replaced", Severity::warning, "ftp",
                             "The supervisor of the FTP daemon still runs with the former version of " +
                                 program.string() + ", which has been replaced.",
                             "veltctl restart ftp --end-sessions"}};
    EXPECT_EQ(replacedProgramFindings(), expected);
    EXPECT_EQ(messageOf(restartServices(SessionPolicy::keep, "ftp")), "");
    EXPECT_TRUE(client.isServed());
    EXPECT_EQ(replacedProgramFindings(), expected);
    EXPECT_EQ(restartServices(SessionPolicy::end, "ftp").valueOr({}),
              (std::vector<ServiceSessions>{{"ftp", 1, 0}}));
    EXPECT_FALSE(client.isServed());
    EXPECT_TRUE(Client(ftpPort_).isServed());
    EXPECT_EQ(replacedProgramFindings(), Findings());
}

TEST_F(ServiceHealth, AServiceThatAcceptsAndSaysNothingIsNamed) {
    storeSftp(true);
    ASSERT_EQ(messageOf(startEnabledServices()), "");
    const Findings found = greetingFindings();
    EXPECT_EQ(summary(found), "error no-greeting, error no-greeting");
    EXPECT_EQ(found.at(0).sentence, "The FTP daemon listens on port " + std::to_string(ftpPort_) +
                                        ", but does not greet: it did not answer in time.");
    EXPECT_EQ(found.at(1).mend, "veltctl restart sftp");
}

TEST_F(ServiceHealth, TheJudgementHasTheGravestFirst) {
    ASSERT_TRUE(replaceFile(
        statePath("/etc/velt/shares.json"),
        R"({"version": 1, "shares": [{"name": "s", "path": "/srv", "users": {"no-such": "read"}}]})", 0644));
    ASSERT_TRUE(replaceFile(statePath("/etc/velt/chroot_rules"), "nonsense\n", 0600));
    const Findings found = judgeHealth();
    ASSERT_GE(found.size(), 3U);
    for (std::size_t i = 1; i < found.size(); ++i) {
        EXPECT_GE(found[i - 1].severity, found[i].severity);
    }
    const std::string all = summary(found);
    EXPECT_NE(all.find("error service-down"), std::string::npos) << all;
    EXPECT_NE(all.find("error rules-damaged"), std::string::npos) << all;
    EXPECT_NE(all.find("warning shares-unknown-account"), std::string::npos) << all;
}

TEST_F(ServiceHealth, LeavesTheLastErrorAlone) {
    fail(ErrorNumber::portTaken, "Something else.");
    ASSERT_TRUE(replaceFile(statePath("/etc/velt/chroot_rules"), "nonsense\n", 0600));
    judgeHealth();
    EXPECT_EQ(lastErrorSentence(), "Something else.");
}

} // namespace
} // namespace velt::test
