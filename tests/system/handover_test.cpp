// Changes of settings while clients work.
#include "platform/service.h"
#include "standalone/contract/last_error.h"
#include "standalone/core/state_root.h"
#include "standalone/standalone.h"
#include "tests/standalone/support/daemon_states.h"
#include "tests/support/files.h"
#include "tests/support/result.h"
#include "tests/support/waiting.h"
#include "tests/system/support/clients.h"
#include "tests/system/support/connect_loop.h"
#include "tests/system/support/ftp_service.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <iterator>
#include <set>
#include <string>
#include <thread>
#include <vector>

namespace velt::test {
namespace {
namespace fs = std::filesystem;
using std::chrono::milliseconds;
using std::chrono::seconds;

/// How many sessions the daemon's list has.
int sessionsOfFtp() {
    const auto list = statePath("/run/velt/ftp/daemon/proftpd.scoreboard");
    const std::string shown = runProcess({"ftpwho", "-f", list, "-o", "json"}).output;
    const std::string sign = "\"pid\":";
    int count = 0;
    const auto connections = shown.find("\"connections\"");
    for (auto at = shown.find(sign, connections); at != std::string::npos; at = shown.find(sign, at + 1)) {
        ++count;
    }
    return count;
}

std::vector<pid_t> processesNamed(const std::string& name) {
    std::vector<pid_t> pids = allPids();
    std::erase_if(pids, [&](pid_t pid) {
        return !identifyProcess(pid) || contentsOf("/proc/" + std::to_string(pid) + "/comm") != name + "\n";
    });
    return pids;
}

std::size_t filesBelow(const fs::path& folder) {
    const auto files = fs::recursive_directory_iterator(folder);
    return static_cast<std::size_t>(std::distance(begin(files), end(files)));
}

class HandOver : public FtpService {
protected:
    void SetUp() override {
        FtpService::SetUp();
        if (!IsSkipped() && !HasFatalFailure()) {
            change();
        }
    }

    void TearDown() override {
        if (whyNoWorld().empty()) {
            EXPECT_EQ(VLIBServiceStop("ftpd", 0), 0) << lastErrorSentence();
        }
        FtpService::TearDown();
    }

    /// Stores the record and restarts, as the module does.
    int changeOnce() {
        if (VELTFTPConfSet(record) < 0) {
            return -1;
        }
        for (const char* name : {"ftpd-pure", "ftpd-ssl", "ftpd"}) {
            if (VLIBServicectlStop(name, 0) < 0) {
                return -1;
            }
        }
        return VLIBServicectlStart("ftpd", 0);
    }

    std::vector<ServiceSessions> change(SessionPolicy policy = SessionPolicy::byChange) {
        ServiceRequest request(policy);
        EXPECT_EQ(changeOnce(), 0) << lastErrorSentence();
        const auto sessions = request.finish();
        EXPECT_EQ(messageOf(sessions), "");
        return sessions.valueOr({});
    }

    /// No right of anybody's.
    void changeAnything() {
        record.max_conn_per_ip = 1000 + ++changes_;
        change();
    }

    /// Alice's file "large", for a second or two; the output is its size.
    static ProcessResult fetchSlowly(bool encrypted) {
        std::vector<std::string> arguments{"--limit-rate",
                                           "12M",
                                           "--output",
                                           "/dev/null",
                                           "--write-out",
                                           "%{size_download}",
                                           "--user",
                                           "alice:alice-secret",
                                           "ftp://127.0.0.1:2121/large"};
        if (encrypted) {
            arguments.insert(arguments.end(), {"--ssl-reqd", "--insecure"});
        }
        return curl(arguments);
    }

private:
    int changes_ = 0;
};

TEST_F(HandOver, downloadsGoOnThroughManyChangesAndNobodyIsRefused) {
    constexpr std::size_t size = 40UL * 1000 * 1000;
    writeFile("/mnt/home/alice/large", std::string(size, 'x'), aliceId);
    for (const bool encrypted : {false, true}) {
        offerTls(true);
        change();
        ProcessResult download;
        std::thread client([&] { download = fetchSlowly(encrypted); });
        EXPECT_TRUE(waitUntil([] { return sessionsOfFtp() > 0; }, patience));
        std::this_thread::sleep_for(milliseconds(300));
        ConnectLoop loop(port);
        for (int i = 0; i < 20; ++i) {
            changeAnything();
        }
        loop.stop();
        EXPECT_GT(loop.greeted, 20);
        EXPECT_EQ(loop.refused, 0);
        EXPECT_EQ(loop.dropped, 0);
        client.join();
        EXPECT_EQ(download.exitCode, 0) << download.errors;
        EXPECT_EQ(download.output, std::to_string(size));
    }
}

TEST_F(HandOver, aStopEndsTheSessionsOfAllDaemons) {
    std::vector<FtpSession> sessions;
    for (int i = 0; i < 3; ++i) {
        sessions.push_back(aliceAt(port));
        changeAnything();
    }
    for (FtpSession& session : sessions) {
        EXPECT_EQ(session.command("NOOP").code, 200);
    }
    EXPECT_EQ(VLIBServiceStop("ftpd", 0), 0) << lastErrorSentence();
    for (FtpSession& session : sessions) {
        EXPECT_EQ(session.command("NOOP").code, 0);
    }
    EXPECT_TRUE(processesNamed("proftpd").empty());
}

TEST_F(HandOver, endsSessionsWhoseRightsAreTakenAway) {
    FtpSession session = aliceAt(port);
    record.user_chroot = record.user_chroot == 0 ? 1 : 0;
    EXPECT_EQ(change(), (std::vector<ServiceSessions>{{"ftp", 1, 0}}));
    EXPECT_EQ(session.command("NOOP").code, 0);
    FtpSession kept = aliceAt(port);
    record.user_chroot = record.user_chroot == 0 ? 1 : 0;
    EXPECT_EQ(change(SessionPolicy::keep), (std::vector<ServiceSessions>{{"ftp", 0, 1}}));
    EXPECT_EQ(kept.command("NOOP").code, 200);
}

TEST_F(HandOver, aSessionThatWasKeptHasNothingOfTheNewSettings) {
    FtpSession session = aliceAt(port);
    record.enable_flow_ctrl = 1;
    record.maxdownloadrate = 1;
    change();
    writeFile("/mnt/home/alice/some", std::string(300000, 'x'), aliceId);
    const auto began = std::chrono::steady_clock::now();
    EXPECT_EQ(session.receive("RETR some").value_or("").size(), 300000U);
    EXPECT_LT(std::chrono::steady_clock::now() - began, seconds(5));
}

TEST_F(HandOver, allSessionsCountForTheLimitOfConnections) {
    const FtpSession first = aliceAt(port);
    record.max_conn_per_ip = 2;
    change();
    const FtpSession second = aliceAt(port);
    EXPECT_EQ(FtpSession(port).greeting().code, 530);
    record.max_conn_per_ip = 3;
    change();
    const FtpSession third = aliceAt(port);
    EXPECT_EQ(FtpSession(port).greeting().code, 530);
    EXPECT_TRUE(waitUntil([] { return sessionsOfFtp() == 3; }, patience));
}

TEST_F(HandOver, twoSessionsNeverHaveOneDataPort) {
    record.passive_port_min = 50000;
    record.passive_port_max = 50003;
    change();
    for (int round = 0; round < 12; ++round) {
        std::vector<FtpSession> sessions;
        std::set<int> ports;
        for (int i = 0; i < 3; ++i) {
            sessions.push_back(aliceAt(port));
            const auto address = sessions.back().passive();
            ASSERT_TRUE(address);
            EXPECT_TRUE(ports.insert(address->port).second) << address->port << " twice";
        }
    }
}

TEST_F(HandOver, loginsDoNotWaitForSessionsThatEnded) {
    double longest = 0;
    for (int i = 0; i < 10; ++i) {
        { FtpSession ended(port); }
        std::this_thread::sleep_for(milliseconds(30));
        const auto began = std::chrono::steady_clock::now();
        const FtpSession next(port);
        EXPECT_EQ(next.greeting().code, 220);
        const std::chrono::duration<double> taken = std::chrono::steady_clock::now() - began;
        longest = std::max(longest, taken.count());
    }
    EXPECT_LT(longest, 0.15) << "the daemon pauses for 0.2 s when a session ends";
}

TEST_F(HandOver, aDaemonThatDoesNotComeUpLeavesTheFormerOneServing) {
    FtpSession session = aliceAt(port);
    const auto daemon = serviceState("ftpd").daemon;
    // What the daemon's own test does not look at.
    const fs::path delays = statePath("/run/velt/ftp/daemon/proftpd.pid");
    fs::remove(delays);
    fs::create_directory(delays);
    record.max_conn_per_ip = 500;
    ServiceRequest request;
    EXPECT_LT(changeOnce(), 0);
    EXPECT_NE(lastErrorSentence().find("The FTP daemon does not start: "), std::string::npos)
        << lastErrorSentence();
    EXPECT_EQ(messageOf(request.finish()), "");
    EXPECT_EQ(serviceState("ftpd").daemon, daemon);
    EXPECT_EQ(session.command("NOOP").code, 200);
    EXPECT_EQ(fetchHome(), "alice");
    const auto down = servicesDown();
    ASSERT_EQ(down.size(), 1U);
    EXPECT_TRUE(down.front().servesFormerSettings);
    fs::remove(delays);
    EXPECT_TRUE(waitUntil([] { return sessionsOfFtp() == 1; }, patience));
}

TEST_F(HandOver, leavesNothingBehind) {
    changeAnything();
    const auto former = filesBelow(statePath("/run/velt/ftp/daemon"));
    for (int i = 0; i < 10; ++i) {
        changeAnything();
    }
    EXPECT_EQ(filesBelow(statePath("/run/velt/ftp/daemon")), former);
    EXPECT_TRUE(waitUntil([] { return processesNamed("proftpd").size() == 1; }, patience));
}

} // namespace
} // namespace velt::test
