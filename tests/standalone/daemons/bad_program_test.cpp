// The real programs replaced by ones that do not do as they should, over starts, changes and stops: it ends
// in time and says what is so, the old or the new settings stand, nothing is orphaned, and with the right
// program in its place again the next change works.
#include "base/file.h"
#include "ftp/ftp_library.h"
#include "platform/service.h"
#include "platform/sftp.h"
#include "standalone/contract/last_error.h"
#include "standalone/control/service_firewall.h"
#include "standalone/core/state_root.h"
#include "standalone/standalone.h"
#include "tests/standalone/supervise/daemon_test.h"
#include "tests/standalone/support/daemon_states.h"
#include "tests/support/ports.h"
#include "tests/support/result.h"
#include "tests/support/run_program.h"
#include "tests/support/text.h"
#include "tests/support/waiting.h"

#include <sched.h>
#include <sys/mount.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <span>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

/// A daemon, as this test sees it: one service of the contract.
struct Service {
    const char* name = "";
    const char* program = "";
    const char* service = ""; ///< in the contract
    const char* label = "";
};

constexpr Service services[] = {
    {"Ftp", "/usr/sbin/proftpd", "ftpd", "FTP"},
    {"Sftp", "/usr/sbin/sshd", "sftp", "SFTP"},
};

enum class Cost {
    small,
    large, ///< tried with one daemon
    huge,  ///< tried by hand, with VELT_ALL_FAULTS in the environment
};

/// What a program does in the place of what it should, in the words of the shell. "$serve" begins what does
/// what it should.
struct Misdeed {
    const char* name = "";
    const char* script = "";
    const char* words = ""; ///< what is said of it; "" when it serves nevertheless
    Cost cost = Cost::small;
    bool atTheLast = false; ///< it is noticed only when the time for a start has passed
};

void PrintTo(const Service& service, std::ostream* out) {
    *out << service.name;
}

void PrintTo(const Misdeed& misdeed, std::ostream* out) {
    *out << misdeed.name;
}

constexpr Misdeed misdeedsOfDaemons[] = {
    {"EndsAtOnce", "exit 1", "it ended with status 1."},
    {"SaysWhyItEnds", "echo 'fatal: no luck' >&2; exit 1", "no luck."},
    {"IsKilled", "kill -KILL $$", "it was ended by signal 9."},
    {"WritesBytes", "head -c 3000 /dev/urandom >&2; exit 1", "."},
    {"WritesMegabytes", "head -c 3000000 /dev/zero | tr '\\0' x >&2; exit 1", "xxx"},
    {"LeavesAChildBehind", "$serve & exit 1", "it ended with status 1."},
    {"StartsLate", "sleep 1; exec $serve", "", Cost::large},
    {"IgnoresTerm", "exec $serve --stubborn", "", Cost::large},
    {"WritesWithoutEndAndServes", "yes >&2 & exec $serve", ""},
    {"NeverListens", "exec sleep 1000", " in time", Cost::huge, true},
    {"NeverListensAndIgnoresTerm", "trap '' TERM; exec sleep 1000", " in time", Cost::huge, true},
    {"WritesWithoutEnd", "exec yes >&2", " in time", Cost::large, true},
};

constexpr Misdeed misdeedsOfTests[] = {
    {"EndsAtOnce", "exit 1", "it ended with status 1."},
    {"SaysWhyItEnds", "echo 'fatal: no luck' >&2; exit 1", "no luck."},
    {"IsKilled", "kill -KILL $$", "it ended with status 137."},
    {"WritesBytes", "head -c 3000 /dev/urandom >&2; exit 1", "."},
    {"WritesMegabytes", "head -c 3000000 /dev/zero | tr '\\0' x >&2; exit 1", "xxx"},
    {"Hangs", "exec sleep 1000", "ran for more than", Cost::large, true},
    {"HangsAndIgnoresTerm", "trap '' TERM; exec sleep 1000", "ran for more than", Cost::huge, true},
    {"WritesWithoutEnd", "exec yes >&2", "ran for more than", Cost::huge, true},
};

class BadProgramTest : public DaemonTest {
protected:
    void SetUp() override {
        DaemonTest::SetUp();
        if (::geteuid() != 0 || ::unshare(CLONE_NEWNS) != 0 ||
            ::mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) != 0) {
            GTEST_SKIP() << "no mount namespace: " << std::strerror(errno);
        }
        ASSERT_TRUE(replaceFile(statePath("/etc/velt/firewall.conf"), "version = 1\nmode = off\n", 0644));
        ASSERT_TRUE(
            replaceFile(statePath("/etc/velt/network.conf"), "version = 1\nloopback_only = 1\n", 0644));
        for (const char* key : {"host_ed25519_key", "host_rsa_key"}) {
            ASSERT_TRUE(replaceFile(statePath("/var/lib/velt/ssh") / key, "a key\n", 0600));
        }
        for (const Service& service : services) {
            behave(service.program, "exit 0", "exec $serve");
        }
    }

    void TearDown() override {
        EXPECT_EQ(messageOf(stopServices()), "");
        for (const std::string& program : replaced_) {
            ::umount2(program.c_str(), MNT_DETACH);
        }
        DaemonTest::TearDown();
    }

    /// From now on the program does this when it is to test a configuration ("-t"), and that otherwise.
    void behave(const std::string& program, const std::string& test, const std::string& run) {
        const fs::path standIn = root_ / fs::path(program).filename();
        std::ofstream(standIn) << "#!/bin/sh\n"
                                  "configuration=$(eval echo \\$$#)\n"
                                  "serve=\"" VELT_TEST_DAEMON
                                  " --port $(sed -n 's/^Port //p' $configuration)\"\n"
                                  "case \" $* \" in *' -t '*)\n"
                               << test << "\n;; esac\n"
                               << run << '\n';
        fs::permissions(standIn, fs::perms::owner_all);
        if (std::ranges::find(replaced_, program) == replaced_.end()) {
            ASSERT_EQ(::mount(standIn.c_str(), program.c_str(), nullptr, MS_BIND, nullptr), 0)
                << program << ": " << std::strerror(errno);
            replaced_.push_back(program);
        }
    }

    /// Stores the settings that have the service serve on this port.
    static int store(const Service& service, int port) {
        if (std::string_view(service.service) == "sftp") {
            return VELTSFTPConfigSet(1, port);
        }
        _tag_VELT_FTP_CONF_ record{};
        if (VELTFTPConfGet(&record) < 0) {
            return -1;
        }
        std::snprintf(record.portnum, sizeof record.portnum, "%d", port);
        record.service_flags = VELT_FTP_SERVICE_PLAIN;
        return VELTFTPConfSet(record);
    }

    /// The port in the stored settings.
    static int storedPort(const Service& service) {
        for (const StoredService& stored : storedServices()) {
            if (stored.daemon == (std::string_view(service.service) == "sftp" ? "sftp" : "ftp")) {
                return stored.port.value_or(0);
            }
        }
        return 0;
    }

    /// A change as the module makes it; "" or why it failed.
    static std::string change(const Service& service, int port) {
        const bool changed = store(service, port) == 0 && VLIBServicectlStop(service.service, 0) == 0 &&
                             VLIBServicectlStart(service.service, 0) == 0;
        return changed ? "" : lastErrorSentence();
    }

    static bool isSentence(const std::string& text) {
        return text.ends_with(".") && std::ranges::none_of(text, [](char c) { return c >= 0 && c < ' '; });
    }

    /// With the right program in its place again.
    void expectNextChangeWorks(const Service& service) {
        behave(service.program, "exit 0", "exec $serve");
        const int port = freePort();
        EXPECT_EQ(change(service, port), "");
        EXPECT_TRUE(accepts(port));
        EXPECT_TRUE(isServing(serviceState(service.service)));
        EXPECT_EQ(VLIBServiceStop(service.service, 0), 0) << lastErrorSentence();
        EXPECT_FALSE(accepts(port));
        EXPECT_TRUE(waitUntil([] { return leftProcesses().empty(); }, patience));
    }

    std::vector<std::string> replaced_;
};

using Case = std::tuple<Service, Misdeed>;

/// With each daemon, as far as the cost allows.
std::vector<Case> cases(std::span<const Misdeed> misdeeds) {
    const bool all = std::getenv("VELT_ALL_FAULTS") != nullptr;
    std::vector<Case> chosen;
    for (const Service& service : services) {
        for (const Misdeed& misdeed : misdeeds) {
            const bool isFirst = &service == &services[0];
            if (all || misdeed.cost == Cost::small || (misdeed.cost == Cost::large && isFirst)) {
                chosen.emplace_back(service, misdeed);
            }
        }
    }
    return chosen;
}

std::string nameOf(const testing::TestParamInfo<Case>& info) {
    return std::string(std::get<0>(info.param).name) + std::get<1>(info.param).name;
}

class BadDaemon : public BadProgramTest, public testing::WithParamInterface<Case> {
protected:
    /// What stands after a change to this port.
    void expectTruth(const std::string& failure, int port) const {
        const auto& [service, misdeed] = GetParam();
        EXPECT_EQ(storedPort(service), port);
        const auto down = servicesDown();
        if (misdeed.words[0] == '\0') {
            EXPECT_EQ(failure, "");
            EXPECT_TRUE(accepts(port));
            EXPECT_TRUE(down.empty());
            return;
        }
        EXPECT_TRUE(failure.starts_with("The " + std::string(service.label) + " daemon does not start: "))
            << failure;
        EXPECT_TRUE(contains(failure, misdeed.words)) << failure;
        EXPECT_TRUE(isSentence(failure)) << failure;
        EXPECT_FALSE(accepts(port));
        ASSERT_EQ(down.size(), 1U);
        EXPECT_EQ(down[0].reason, failure);
    }
};

TEST_P(BadDaemon, IsToldAndLeavesNothing) {
    const auto& [service, misdeed] = GetParam();
    const int former = freePort();
    ASSERT_EQ(change(service, former), "");
    behave(service.program, "exit 0", misdeed.script);
    const int port = freePort();
    const auto begin = Clock::now();
    const std::string failure = change(service, port);
    EXPECT_LT(secondsSince(begin), 8.0);
    expectTruth(failure, port);
    EXPECT_FALSE(accepts(former));
    const auto stop = Clock::now();
    EXPECT_EQ(VLIBServiceStop(service.service, 0), 0) << lastErrorSentence();
    EXPECT_LT(secondsSince(stop), 6.0);
    EXPECT_TRUE(waitUntil([] { return leftProcesses().empty(); }, patience));
    if (!misdeed.atTheLast) {
        expectTruth(messageOf(startEnabledServices()), port);
        EXPECT_EQ(VLIBServiceStop(service.service, 0), 0) << lastErrorSentence();
    }
    expectNextChangeWorks(service);
}

INSTANTIATE_TEST_SUITE_P(All, BadDaemon, testing::ValuesIn(cases(misdeedsOfDaemons)), nameOf);

class BadConfigurationTest : public BadProgramTest, public testing::WithParamInterface<Case> {};

TEST_P(BadConfigurationTest, IsToldAndTheDaemonServesOn) {
    const auto& [service, misdeed] = GetParam();
    const int former = freePort();
    ASSERT_EQ(change(service, former), "");
    const ProcessId daemon = serviceState(service.service).daemon;
    behave(service.program, misdeed.script, "exec $serve");
    const auto begin = Clock::now();
    const std::string failure = change(service, freePort());
    EXPECT_LT(secondsSince(begin), misdeed.atTheLast ? 14.0 : 6.0);
    EXPECT_TRUE(
        failure.starts_with("The " + std::string(service.label) + " daemon refuses its configuration: "))
        << failure;
    EXPECT_TRUE(contains(failure, misdeed.words)) << failure;
    EXPECT_TRUE(isSentence(failure)) << failure;
    EXPECT_LT(failure.size(), 1000U);
    EXPECT_EQ(storedPort(service), former);
    EXPECT_TRUE(accepts(former));
    EXPECT_EQ(serviceState(service.service).daemon, daemon);
    EXPECT_TRUE(servicesDown().empty());
    expectNextChangeWorks(service);
}

INSTANTIATE_TEST_SUITE_P(All, BadConfigurationTest, testing::ValuesIn(cases(misdeedsOfTests)), nameOf);

class BadHelper : public BadProgramTest, public testing::WithParamInterface<Misdeed> {
protected:
    static fs::path hostKeys() { return statePath("/var/lib/velt/ssh"); }
};

TEST_P(BadHelper, MakesNoHostKeys) {
    fs::remove_all(hostKeys());
    behave("/usr/bin/ssh-keygen", "", GetParam().script);
    EXPECT_LT(store(services[1], freePort()), 0);
    EXPECT_TRUE(isSentence(lastErrorSentence())) << lastErrorSentence();
    EXPECT_TRUE(contains(lastErrorSentence(), "annot ")) << lastErrorSentence();
    EXPECT_TRUE(!fs::exists(hostKeys()) || fs::is_empty(hostKeys()));
    behave("/usr/bin/ssh-keygen", "", "echo key > $configuration; echo public > $configuration.pub");
    expectNextChangeWorks(services[1]);
}

TEST_P(BadHelper, LoadsNoRulesAndStopsNoService) {
    // The real one is to change no rules but the test's own.
    ASSERT_EQ(::unshare(CLONE_NEWNET), 0);
    ASSERT_EQ(runProcess({"ip", "link", "set", "lo", "up"}).exitCode, 0);
    const fs::path real = root_ / "real-nft";
    fs::copy_file("/usr/sbin/nft", real);
    ASSERT_TRUE(replaceFile(statePath("/etc/velt/firewall.conf"), "version = 1\nmode = accept\n", 0644));
    behave("/usr/sbin/nft", "", GetParam().script);
    const std::string failure = messageOf(openServicePorts());
    EXPECT_TRUE(failure.starts_with("Cannot load the firewall rules: ")) << failure;
    EXPECT_TRUE(isSentence(failure)) << failure;
    const int port = freePort();
    EXPECT_EQ(change(services[0], port), "") << "its rules are another matter";
    EXPECT_TRUE(accepts(port));
    std::ofstream(root_ / "nft") << "#!/bin/sh\nexec " << real.string() << " \"$@\"\n";
    EXPECT_EQ(messageOf(openServicePorts()), "");
    expectNextChangeWorks(services[0]);
}

constexpr Misdeed misdeedsOfHelpers[] = {
    {"EndsAtOnce", "exit 1", ""},
    {"SaysWhyItEnds", "echo 'no luck' >&2; exit 1", ""},
    {"IsKilled", "kill -KILL $$", ""},
    {"WritesBytes", "head -c 3000 /dev/urandom >&2; exit 1", ""},
    {"WritesMegabytes", "head -c 3000000 /dev/zero | tr '\\0' x >&2; exit 1", ""},
};

INSTANTIATE_TEST_SUITE_P(All, BadHelper, testing::ValuesIn(misdeedsOfHelpers),
                         [](const auto& misdeed) { return std::string(misdeed.param.name); });

TEST_F(BadProgramTest, AKeyMakerThatMakesNothingIsNotBelieved) {
    fs::remove_all(statePath("/var/lib/velt/ssh"));
    behave("/usr/bin/ssh-keygen", "", "exit 0");
    EXPECT_LT(store(services[1], freePort()), 0);
    EXPECT_TRUE(lastErrorSentence().starts_with("Cannot ")) << lastErrorSentence();
}

TEST_F(BadProgramTest, AProgramThatMayNotBeRunIsNamed) {
    for (const Service& service : services) {
        ASSERT_EQ(change(service, freePort()), "");
        fs::permissions(root_ / fs::path(service.program).filename(), fs::perms::none);
        const std::string failure = change(service, freePort());
        EXPECT_TRUE(contains(failure, service.program)) << failure;
        expectNextChangeWorks(service);
    }
}

} // namespace
} // namespace velt::test
