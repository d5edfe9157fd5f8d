// Everything that the platform reads, while one system call after another fails: what is told is what is
// there, or that it cannot be told.
#include "standalone/bans/ban_list.h"
#include "standalone/bans/ban_settings.h"
#include "standalone/control/port_conflict.h"
#include "standalone/firewall/firewall_settings.h"
#include "standalone/journal/admin_log.h"
#include "standalone/journal/log_retention.h"
#include "standalone/keys/key_store.h"
#include "standalone/ports/known_services.h"
#include "standalone/rules/chroot_users.h"
#include "standalone/rules/rule_store.h"
#include "standalone/settings/settings_store.h"
#include "standalone/shares/share_store.h"
#include "standalone/standalone.h"
#include "tests/standalone/crash/killed_process.h"
#include "tests/standalone/crash/stores.h"
#include "tests/standalone/supervise/daemon_test.h"
#include "tests/standalone/support/example_keys.h"
#include "tests/standalone/support/store_shares.h"
#include "tests/support/fault_sweep.h"
#include "tests/support/ports.h"

#include <gtest/gtest.h>

namespace velt::test {
namespace {

/// What is read, as a text; "cannot: " and the reason when it cannot be told.
template<class Value, class Tell> std::string told(const Result<Value>& read, Tell tell) {
    return read ? "read: " + std::string(tell(*read)) : "cannot: " + read.error().message;
}

std::string joined(const std::vector<std::string>& texts) {
    std::string all;
    for (const std::string& text : texts) {
        all += text + " ";
    }
    return all;
}

int heldPort() {
    static const int port = freePort();
    return port;
}

struct Reading {
    const char* name;
    std::string (*read)();
    const char* expected; ///< without a fault
};

void PrintTo(const Reading& reading, std::ostream* out) {
    *out << reading.name;
}

const Reading readings[] = {
    {"TheFtpSettings",
     [] { return told(loadFtpSettings(), [](const auto& ftp) { return std::to_string(ftp.timeout); }); },
     "read: 77"},
    {"TheExternalAddress",
     [] { return told(loadFtpSettings(), [](const auto& ftp) { return ftp.externalAddress; }); },
     "read: 192.0.2.1"},
    {"TheSftpSettings",
     [] { return told(loadSftpSettings(), [](const auto& sftp) { return std::to_string(sftp.port); }); },
     "read: 2222"},
    {"ChrootRules", [] { return told(loadRules(), [](const auto& rules) { return rules.at(0).path; }); },
     "read: /home"},
    {"ChrootUsers", [] { return told(chrootUsers({}), joined); }, "read: ann "},
    {"OtherUsers", [] { return told(otherUsers({}), joined); }, "read: ben "},
    {"TheShares", [] { return told(loadShares(), [](const auto& shares) { return shares.at(0).name; }); },
     "read: music"},
    {"TheLog",
     [] { return told(queryLog({}), [](const auto& entries) { return std::to_string(entries.size()); }); },
     "read: 1"},
    {"TheLogsRetention",
     [] { return told(loadRetention(), [](const auto& log) { return std::to_string(log.maxAgeDays); }); },
     "read: 7"},
    {"Bans",
     [] { return told(bansAt(Ban::Clock::now()), [](const auto& bans) { return bans.at(0).service; }); },
     "read: sftp"},
    {"KeysOfAUser",
     [] {
         return told(loadKeyFile("ann"),
                     [](const auto& file) { return file ? file->keys.at(0).by : "none"; });
     },
     "read: root"},
    {"UsersWithKeys", [] { return told(usersWithKeys(), joined); }, "read: ann "},
    {"BanSettings",
     [] { return told(loadBanSettings(), [](const auto& bans) { return std::to_string(bans.failures); }); },
     "read: 3"},
    {"FirewallSettings",
     [] {
         return told(loadFirewallSettings(), [](const auto& firewall) {
             return firewall.mode == FirewallMode::drop ? "drop" : "another";
         });
     },
     "read: drop"},
    {"KnownServices",
     [] { return told(loadKnownServices(), [](const auto& all) { return all.at(0).name; }); }, "read: mine"},
    {"AFreePort",
     [] {
         return told(findPortConflict("ftp", heldPort() + 1, heldPort() + 1),
                     [](const auto& conflict) { return conflict ? "taken" : "free"; });
     },
     "read: free"},
    {"ATakenPort",
     [] {
         return told(findPortConflict("ftp", heldPort(), heldPort()),
                     [](const auto& conflict) { return conflict ? "taken" : "free"; });
     },
     "read: taken"},
};

class ReadFaults : public StoreTestBase, public testing::WithParamInterface<Reading> {
protected:
    void SetUp() override {
        StoreTestBase::SetUp();
        auto ftp = defaultFtpSettings();
        ftp.timeout = 77;
        auto sftp = defaultSftpSettings();
        sftp.port = 2222;
        ASSERT_TRUE(storeFtpSettings(ftp) && storeSftpSettings(sftp));
        ASSERT_TRUE(storeRules({{true, 1000, "/home"}}));
        ASSERT_TRUE(storeShares({{"music", "", root_.path() / "music", true, {}, {}}}));
        const auto tomorrow =
            std::chrono::ceil<std::chrono::hours>(Ban::Clock::now()) + std::chrono::hours(24);
        ASSERT_TRUE(storeBan({*parseIpNetwork("192.0.2.7"), tomorrow, "sftp", 4}, Ban::Clock::now()));
        ASSERT_TRUE(storeKeyFile({"ann", 1000, {{keyOf(aKey), "then", "root"}}}));
        root_.write("/etc/veltinfo.conf", "ftp_ext_ip=192.0.2.1\n");
        root_.write("/etc/velt/log.conf", "version = 1\nmax_age_days = 7\n");
        root_.write("/etc/velt/bans.conf", "version = 1\nfailures = 3\n");
        root_.write("/etc/velt/firewall.conf", "version = 1\nmode = drop\n");
        root_.write("/etc/velt/known_services.conf", "4711 mine\n");
        ASSERT_EQ(tellInChild(logOne), "logged");
    }

    static std::string logOne() { return logEvent(1, 1, 0x11B00024, {}) ? "logged" : "not logged"; }

    Listener listener_{heldPort()};
};

TEST_P(ReadFaults, TellTheTruthOrThatTheyCannot) {
    const Reading& reading = GetParam();
    FaultSweep sweep;
    sweep.prepare = [] {};
    sweep.act = reading.read;
    sweep.check = [&](const SweptRun& run) {
        const bool refused = run.end.told.starts_with("cannot: ") && run.end.told.ends_with(".");
        EXPECT_TRUE(run.end.told == reading.expected || (refused && run.call.error != 0)) << run.end.told;
    };
    EXPECT_GE(sweepFaults(sweep), 2);
}

INSTANTIATE_TEST_SUITE_P(All, ReadFaults, testing::ValuesIn(readings),
                         [](const auto& reading) { return reading.param.name; });

} // namespace
} // namespace velt::test
