// The firewall in force, seen from another host.

#include "base/file.h"
#include "ftp/ftp_library.h"
#include "platform/firewall.h"
#include "platform/service.h"
#include "platform/sftp.h"
#include "standalone/contract/last_error.h"
#include "standalone/core/effects.h"
#include "standalone/core/state_lock.h"
#include "standalone/core/state_root.h"
#include "tests/standalone/control/plan_double.h"
#include "tests/standalone/firewall/firewall_test.h"
#include "tests/support/run_program.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <sched.h>
#include <sys/mount.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <cstdlib>
#include <optional>
#include <thread>
#include <utility>

namespace velt::test {
namespace {

TEST_F(FirewallTest, AcceptIsTheDefaultAndClosesNothing) {
    const OpenPort control(2121);
    const OpenPort other(8080);
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_NE(listTable().find("2121"), std::string::npos) << listTable();
    EXPECT_NE(listTable().find("55536-55899"), std::string::npos) << listTable();
    EXPECT_TRUE(network_->neighbourReaches(2121));
    EXPECT_TRUE(network_->neighbourReaches(8080));
}

TEST_F(FirewallTest, DropOpensThePortsOfTheServicesAndTheFurtherOnes) {
    const OpenPort control(2121);
    const OpenPort passive(40001);
    const OpenPort further(8022);
    const OpenPort closed(8080);
    ASSERT_TRUE(network_->neighbourReaches(8080));
    storeFtp(2121, VELT_FTP_SERVICE_PLAIN, 40000, 40010);
    setMode("mode = drop\nports = 8020-8030");
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_TRUE(network_->neighbourReaches(2121));
    EXPECT_TRUE(network_->neighbourReaches(40001));
    EXPECT_TRUE(network_->neighbourReaches(8022));
    EXPECT_FALSE(network_->neighbourReaches(8080));
}

TEST_F(FirewallTest, TheRulesFollowThePorts) {
    const OpenPort former(2121);
    const OpenPort next(2122);
    const OpenPort sftp(2222);
    setMode("mode = drop");
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_TRUE(network_->neighbourReaches(2121));
    EXPECT_FALSE(network_->neighbourReaches(2122));
    storeFtp(2122, VELT_FTP_SERVICE_TLS);
    ASSERT_EQ(VELTSFTPConfigSet(1, 2222), 0) << lastErrorSentence();
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_FALSE(network_->neighbourReaches(2121));
    EXPECT_TRUE(network_->neighbourReaches(2122));
    EXPECT_TRUE(network_->neighbourReaches(2222));
    storeFtp(2122, 0);
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_FALSE(network_->neighbourReaches(2122));
}

TEST_F(FirewallTest, TheRulesFollowWhatIsEnabled) {
    planDouble() = {};
    planDouble().ftpOptions = planDouble().sftpOptions = {"--any"};
    storeFtp(2121, 0);
    ASSERT_EQ(VELTSFTPConfigSet(0, 2222), 0) << lastErrorSentence();
    setMode("mode = drop");
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    storeFtp(2121, VELT_FTP_SERVICE_PLAIN);
    ASSERT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    EXPECT_TRUE(network_->neighbourReaches(2121));
    ASSERT_EQ(VELTSFTPConfigSet(1, 2222), 0) << lastErrorSentence();
    ASSERT_EQ(VLIBServiceStart("sftp", 0), 0) << lastErrorSentence();
    EXPECT_TRUE(network_->neighbourReaches(2222));
    storeFtp(2121, 0);
    EXPECT_EQ(VLIBServicectlStop("ftpd", 0), 0) << lastErrorSentence();
    ASSERT_EQ(VELTSFTPConfigSet(0, 2222), 0) << lastErrorSentence();
    EXPECT_EQ(VLIBServiceStop("sftp", 0), 0) << lastErrorSentence();
    const OpenPort formerFtp(2121);
    const OpenPort formerSftp(2222);
    EXPECT_FALSE(network_->neighbourReaches(2121));
    EXPECT_FALSE(network_->neighbourReaches(2222));
}

TEST_F(FirewallTest, RulesThatCannotBeLoadedKeepNoServiceDown) {
    planDouble() = {};
    setMode("mode = open");
    fail(ErrorNumber::log, "An earlier one.");
    EXPECT_EQ(VLIBServicectlStart("ftpd", 0), 0) << lastErrorSentence();
    EXPECT_EQ(VLIBServicectlStop("ftpd", 0), 0) << lastErrorSentence();
    EXPECT_EQ(lastErrorSentence(), "An earlier one.") << "nothing that was asked for has failed";
}

TEST_F(FirewallTest, SettingsInTheMiddleOfAChangeAreWaitedFor) {
    std::optional<Result<StateLock>> change(StateLock::take());
    ASSERT_TRUE(*change);
    std::atomic<bool> done = false;
    std::thread loader([&done] {
        EXPECT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
        done = true;
    });
    std::this_thread::sleep_for(std::chrono::milliseconds(300));
    EXPECT_FALSE(done);
    storeFtp(2122, VELT_FTP_SERVICE_PLAIN);
    change.reset();
    loader.join();
    EXPECT_NE(listTable().find("2122"), std::string::npos) << listTable();
}

TEST_F(FirewallTest, OverlappingPortsAreOneSet) {
    setMode("mode = drop\nports = 2121 2100-2130 22");
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    const OpenPort control(2121);
    EXPECT_TRUE(network_->neighbourReaches(2121));
}

TEST_F(FirewallTest, OffRemovesTheRules) {
    const OpenPort other(8080);
    setMode("mode = drop");
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_FALSE(network_->neighbourReaches(8080));
    setMode("mode = off");
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_TRUE(network_->neighbourReaches(8080));
    EXPECT_EQ(listTable(), "");
}

TEST_F(FirewallTest, ADamagedFileLeavesTheRulesInForce) {
    setMode("mode = drop");
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    const std::string before = listTable();
    setMode("mode = open");
    EXPECT_LT(VELTFwRuleHup(), 0);
    EXPECT_NE(lastErrorSentence().find("firewall.conf, line 2: "), std::string::npos) << lastErrorSentence();
    EXPECT_EQ(listTable(), before);
}

TEST_F(FirewallTest, AnotherFirewallThatDropsIsPointedOut) {
    ASSERT_EQ(
        runProcess({"nft", "-f", "-"},
                   "table ip other {\nchain input {\ntype filter hook input priority 0; policy drop;\n}\n}\n")
            .exitCode,
        0);
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_NE(warning().find("\"ip other input\""), std::string::npos) << warning();
    ASSERT_EQ(runProcess({"nft", "delete", "table", "ip", "other"}).exitCode, 0);
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_EQ(warning(), "");
}

TEST_F(FirewallTest, AnInstallationElsewhereWithoutAFileLeavesTheRulesAlone) {
    setMode("mode = drop");
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    const std::string before = listTable();
    setStateRoot(root_ / "second");
    EXPECT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_EQ(listTable(), before);
    setMode("mode = accept");
    EXPECT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_NE(listTable(), before);
}

TEST_F(FirewallTest, OtherTablesStay) {
    ASSERT_EQ(runProcess({"nft", "add", "table", "ip", "other"}).exitCode, 0);
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_NE(runProcess({"nft", "list", "tables"}).output.find("table ip other"), std::string::npos);
}

TEST_F(FirewallTest, AListedEffectChangesNothing) {
    std::string listed;
    setEffectHook([&listed](Effect effect, std::string_view subject) {
        listed = std::string(effectName(effect)) + " " + std::string(subject);
        return EffectDecision(Result<>());
    });
    EXPECT_EQ(VELTFwRuleHup(), 0);
    setEffectHook({});
    EXPECT_EQ(listed, "firewall firewall rules");
    EXPECT_EQ(listTable(), "");
}

TEST_F(FirewallTest, RulesThatAreInForceAreNotLoadedAgain) {
    ASSERT_GT(generation(), 0U);
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    const std::uint32_t loaded = generation();
    EXPECT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_EQ(generation(), loaded);
    storeFtp(2122, VELT_FTP_SERVICE_PLAIN);
    EXPECT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_EQ(generation(), loaded + 1);
    setMode("mode = drop");
    EXPECT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_EQ(generation(), loaded + 2);
}

TEST_F(FirewallTest, WhatSomebodyElseRemovedOrChangedComesBack) {
    setMode("mode = drop");
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    const std::string rules = listTable();
    ASSERT_EQ(runProcess({"nft", "delete", "table", "inet", "velt_fileserv"}).exitCode, 0);
    ASSERT_EQ(listTable(), "");
    EXPECT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_EQ(listTable(), rules);
    ASSERT_EQ(runProcess({"nft", "flush", "chain", "inet", "velt_fileserv", "input"}).exitCode, 0);
    ASSERT_NE(listTable(), rules);
    EXPECT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_EQ(listTable(), rules);
}

TEST_F(FirewallTest, RulesOfAnotherNetworkDoNotCount) {
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    const std::uint32_t loaded = generation();
    const auto loadElsewhere = [loaded] {
        if (::unshare(CLONE_NEWNET) != 0) {
            return 2;
        }
        // As many changes as were made there.
        while (generation() < loaded) {
            runProcess({"nft", "add", "table", "ip", "t" + std::to_string(generation())});
        }
        return VELTFwRuleHup() == 0 && listTable().find("2121") != std::string::npos ? 7 : 1;
    };
    const pid_t child = ::fork();
    if (child == 0) {
        ::_exit(loadElsewhere());
    }
    int status = -1;
    ::waitpid(child, &status, 0);
    EXPECT_EQ(WEXITSTATUS(status), 7);
}

TEST_F(FirewallTest, AStartLoadsTheRulesOnce) {
    planDouble() = {};
    const std::uint32_t before = generation();
    for (const char* name : {"ftpd-pure", "ftpd-ssl", "ftpd"}) {
        ASSERT_EQ(VLIBServicectlStart(name, 0), 0) << lastErrorSentence();
    }
    EXPECT_EQ(generation(), before + 1);
    EXPECT_EQ(VLIBServiceStop("ftpd", 0), 0) << lastErrorSentence();
}

TEST_F(FirewallTest, AMarkFromBeforeABootIsNoSignOfRules) {
    ASSERT_TRUE(replaceFile(statePath("/run/velt/firewall.loaded"), "another boot", 0644));
    ASSERT_EQ(runProcess({"nft", "add", "table", "inet", "velt_fileserv"}).exitCode, 0);
    setMode("mode = off");
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_NE(listTable(), "") << "the table is somebody else's";
}

/// While it lives, loading rules is followed by these lines of a shell script, in which "nft" is the real
/// one.
class LoadingFollowedBy {
public:
    explicit LoadingFollowedBy(const std::string& lines) {
        const auto real = folder_.path() / "nft";
        std::filesystem::copy_file(program_, real);
        const auto script = folder_.write("script", "#!/bin/sh\nPATH=" + folder_.path().string() +
                                                        ":$PATH\nnft \"$@\" || exit\n" +
                                                        "[ \"$1\" = -f ] || exit 0\n" + lines + "\n");
        std::filesystem::permissions(script, std::filesystem::perms::owner_all);
        EXPECT_EQ(unshare(CLONE_NEWNS), 0);
        EXPECT_EQ(mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr), 0);
        EXPECT_EQ(mount(script.c_str(), program_, nullptr, MS_BIND, nullptr), 0);
    }
    ~LoadingFollowedBy() { umount2(program_, MNT_DETACH); }
    LoadingFollowedBy(const LoadingFollowedBy&) = delete;
    LoadingFollowedBy& operator=(const LoadingFollowedBy&) = delete;

private:
    static constexpr const char* program_ = "/usr/sbin/nft";
    TemporaryFolder folder_;
};

TEST_F(FirewallTest, RulesOfALoadingThatWasCutShortAreKnown) {
    {
        const LoadingFollowedBy loading("exit 1");
        EXPECT_LT(VELTFwRuleHup(), 0);
    }
    ASSERT_NE(listTable(), "");
    setMode("mode = off");
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_EQ(listTable(), "");
}

TEST_F(FirewallTest, WhatSomebodyElseChangesDuringTheLoadingIsMended) {
    {
        const LoadingFollowedBy loading("nft delete table inet velt_fileserv");
        ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    }
    ASSERT_EQ(listTable(), "");
    ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
    EXPECT_NE(listTable(), "");
}

/// Runs in a child without the right to administer the network: its exit status is what `test` returns.
template<class Test> int withoutRights(const Test& test) {
    const pid_t child = ::fork();
    if (child == 0) {
        const bool dropped = ::setgid(65534) == 0 && ::setuid(65534) == 0;
        ::_exit(dropped ? test() : 99);
    }
    int status = -1;
    ::waitpid(child, &status, 0);
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

TEST_F(FirewallTest, WithoutTheRightsTheErrorSaysSo) {
    std::filesystem::permissions(root_, std::filesystem::perms::all);
    std::filesystem::create_directories(statePath("/run/velt"));
    for (const char* place : {"/run/velt", "/var/lib/velt/lock"}) {
        std::filesystem::permissions(statePath(place), std::filesystem::perms::all);
    }
    EXPECT_EQ(withoutRights([] {
                  const bool refused = VELTFwRuleHup() < 0;
                  return refused && lastErrorSentence() ==
                                        "Cannot load the firewall rules: this process is not "
                                        "allowed to change the firewall."
                             ? 7
                             : 1;
              }),
              7);
    std::filesystem::remove(statePath("/run/velt/firewall.loaded"));
    setMode("mode = off");
    EXPECT_EQ(withoutRights([] { return VELTFwRuleHup() == 0 ? 7 : 1; }), 7) << "off needs no rights";
}

} // namespace
} // namespace velt::test
