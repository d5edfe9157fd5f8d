// What a plan says, and when it changes.
#include "tests/system/support/ftp_service.h"

#include "standalone/contract/last_error.h"
#include "standalone/daemons/proftpd/proftpd_plan.h"
#include "tests/support/files.h"
#include "tests/support/result.h"

#include <filesystem>
#include <iterator>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

class FtpPlan : public FtpService {
protected:
    std::string hash() {
        EXPECT_EQ(VELTFTPConfSet(record), 0) << lastErrorSentence();
        return plan().order.configurationHash;
    }

    /// What follows from the stored settings.
    static DaemonPlan plan() {
        const auto planned = planFtpDaemon();
        EXPECT_EQ(messageOf(planned), "");
        EXPECT_TRUE(planned && *planned);
        return planned && *planned ? **planned : DaemonPlan();
    }
};

TEST_F(FtpPlan, namesTheDaemonAndItsPort) {
    hash();
    const auto [order, folder] = plan();
    EXPECT_EQ(folder, worldRoot / "run/velt/ftp/configurations" / order.configurationHash);
    EXPECT_EQ(order.arguments,
              (std::vector<std::string>{"/usr/sbin/proftpd", "-n", "-c", folder / "proftpd.conf"}));
    EXPECT_EQ(order.ports, std::vector<int>{2121});
}

TEST_F(FtpPlan, staysTheSameWhileNothingChanges) {
    offerTls(true);
    record.user_chroot = 0;
    addShare("music", "music", Access::read);
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
    letAnonymousIn();
    expectChange("anonymous users");
    letAnonymousIn("music");
    expectChange("their confinement");
    letAnonymousIn("films");
    expectChange("their share");
    offerTls(true);
    expectChange("FTPS");
    fs::remove_all(worldRoot / "var/lib/velt/tls");
    expectChange("the certificate");
}

TEST_F(FtpPlan, doesNotChangeWithWhatIsReadAtLogins) {
    record.user_chroot = 0;
    addShare("music", "music", Access::none);
    const std::string before = hash();
    storeRules({"u:1001:/music"});
    EXPECT_EQ(hash(), before);
    addShare("films", "films", Access::none);
    EXPECT_EQ(hash(), before);
}

TEST_F(FtpPlan, isNoneWhenNeitherServiceIsEnabled) {
    record.service_flags = 0;
    ASSERT_EQ(VELTFTPConfSet(record), 0) << lastErrorSentence();
    const auto none = planFtpDaemon();
    ASSERT_EQ(messageOf(none), "");
    EXPECT_FALSE(*none);
}

TEST_F(FtpPlan, keepsTheFormerConfigurationUntilItIsToBeRemoved) {
    addShare("one", "one", Access::read);
    addShare("two", "two", Access::read);
    letAnonymousIn("one");
    hash();
    const auto former = plan();
    letAnonymousIn("two");
    hash();
    const auto next = plan();
    EXPECT_NE(former.folder, next.folder);
    EXPECT_TRUE(fs::exists(former.folder / "proftpd.conf"));
    EXPECT_EQ(contentsOf(former.folder / "anonymous"), "one");
    EXPECT_EQ(contentsOf(next.folder / "anonymous"), "two");
    removeFormerPlans(next);
    EXPECT_FALSE(fs::exists(former.folder));
    EXPECT_TRUE(fs::exists(next.folder / "proftpd.conf"));
}

TEST_F(FtpPlan, writesNothingWhenTheDaemonRefusesTheNewConfiguration) {
    offerTls(true);
    hash();
    const auto configurations = worldRoot / "run/velt/ftp/configurations";
    const auto count = [&] {
        return std::distance(fs::directory_iterator(configurations), fs::directory_iterator());
    };
    EXPECT_EQ(count(), 1);
    fs::create_directories(worldRoot / "etc/velt/tls");
    writeFile(worldRoot / "etc/velt/tls/server.crt", "nonsense");
    EXPECT_FALSE(planFtpDaemon());
    EXPECT_EQ(count(), 1);
}

TEST_F(FtpPlan, leavesAStoredRuleSetAlone) {
    addShare("music", "music", Access::none);
    storeRules({"u:1001:/music"});
    hash();
    EXPECT_EQ(contentsOf(worldRoot / "etc/velt/chroot_rules"), "velt-chroot-rules 1\nu:1001:/music\n");
    EXPECT_EQ(modeOf(worldRoot / "etc/velt/chroot_rules"), 0600U);
}

} // namespace
} // namespace velt::test
