// What a plan says, and when it changes.
#include "tests/system/support/ftp_service.h"

#include "standalone/core/last_error.h"

#include <filesystem>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

class FtpPlan : public FtpService {
protected:
    std::string hash() {
        EXPECT_EQ(VELTFTPConfSet(record), 0) << lastErrorSentence();
        const auto plan = planFtpDaemon();
        EXPECT_TRUE(plan) << lastErrorSentence();
        return plan ? plan->configurationHash : "";
    }
};

TEST_F(FtpPlan, namesTheDaemonAndItsPort) {
    hash();
    const auto plan = planFtpDaemon();
    ASSERT_TRUE(plan) << lastErrorSentence();
    EXPECT_EQ(plan->arguments, (std::vector<std::string>{"/usr/sbin/proftpd", "-n", "-c",
                                                         worldRoot / "run/velt/ftp/proftpd.conf"}));
    EXPECT_EQ(plan->executable, "/usr/sbin/proftpd");
    EXPECT_EQ(plan->listenPorts, std::vector<int>{2121});
}

TEST_F(FtpPlan, staysTheSameWhileNothingChanges) {
    offerTls(true);
    record.user_chroot = 0;
    addShare("music", "music", ShareGrant::read);
    EXPECT_EQ(hash(), hash());
}

TEST_F(FtpPlan, changesWithWhatADaemonReadsAtItsStart) {
    std::string last = hash();
    const auto expectChange = [&](const char* what) {
        const std::string now = hash();
        EXPECT_NE(now, last) << what;
        last = now;
    };
    record.max_conn_per_ip = 3;
    expectChange("a limit");
    record.user_chroot = 0;
    expectChange("the root of unconfined users");
    addShare("music", "music", ShareGrant::none);
    expectChange("an offered share");
    offerTls(true);
    expectChange("FTPS");
    fs::remove_all(worldRoot / "var/lib/velt/tls");
    expectChange("the certificate");
}

TEST_F(FtpPlan, doesNotChangeWithTheRules) {
    addShare("music", "music", ShareGrant::none);
    const std::string before = hash();
    saveRules({"u:1001:/music"});
    EXPECT_EQ(hash(), before);
}

TEST_F(FtpPlan, isRefusedWhenNeitherServiceIsEnabled) {
    record.service_flags = 0;
    ASSERT_EQ(VELTFTPConfSet(record), 0) << lastErrorSentence();
    EXPECT_FALSE(planFtpDaemon());
    EXPECT_EQ(lastErrorSentence(), "Neither FTP nor FTPS is enabled.");
}

TEST_F(FtpPlan, keepsTheFormerConfigurationWhenTheDaemonRefusesTheNewOne) {
    offerTls(true);
    hash();
    const std::string before = readFileText(worldRoot / "run/velt/ftp/proftpd.conf");
    fs::create_directories(worldRoot / "etc/velt/tls");
    writeFile(worldRoot / "etc/velt/tls/server.crt", "nonsense");
    EXPECT_FALSE(planFtpDaemon());
    EXPECT_EQ(readFileText(worldRoot / "run/velt/ftp/proftpd.conf"), before);
}

TEST_F(FtpPlan, leavesAStoredRuleSetAlone) {
    addShare("music", "music", ShareGrant::none);
    saveRules({"u:1001:/music"});
    hash();
    EXPECT_EQ(readFileText(worldRoot / "etc/velt/chroot_rules"), "velt-chroot-rules 1\nu:1001:/music\n");
    EXPECT_EQ(modeOf(worldRoot / "etc/velt/chroot_rules"), 0600U);
}

} // namespace
} // namespace velt::test
