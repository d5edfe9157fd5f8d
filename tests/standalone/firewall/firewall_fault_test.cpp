// Our table while one system call after another fails, in the process that loads it and in nft: the former
// rules stay or the new ones are there, whole, who is banned stays so, and the result says what is so.
#include "base/text.h"
#include "platform/firewall.h"
#include "standalone/bans/ban_list.h"
#include "standalone/contract/last_error.h"
#include "standalone/core/state_lock.h"
#include "standalone/firewall/banned_sources.h"
#include "tests/standalone/firewall/firewall_test.h"
#include "tests/support/fault_sweep.h"
#include "tests/support/run_program.h"
#include "tests/support/text.h"

#include "ftp/ftp_library.h"

#include <regex>

namespace velt::test {
namespace {

class FirewallFaults : public FirewallTest {
protected:
    static constexpr const char* formerMode = "mode = accept";
    static constexpr const char* banned = "192.0.2.9";

    /// The table, without the times of those who are banned.
    static std::string table() {
        static const std::regex times(" timeout [0-9a-z]+| expires [0-9a-z]+");
        return std::regex_replace(listTable(), times, "");
    }

    static void storeBan() {
        const auto now = Ban::Clock::now();
        const auto lock = StateLock::take();
        ASSERT_TRUE(
            velt::storeBan({parseIpNetwork(banned).value(), now + std::chrono::hours(1), "ftp", 10}, now));
    }

    /// Loads the former rules, and writes the settings for others.
    static void bringBack(const char* mode) {
        storeFtp(2121, VELT_FTP_SERVICE_PLAIN);
        setMode(formerMode);
        ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
        ASSERT_TRUE(contains(listTable(), banned)) << listTable();
        storeFtp(2122, VELT_FTP_SERVICE_PLAIN);
        setMode(mode);
    }

    static std::string load() { return VELTFwRuleHup() == 0 ? "done" : "failed: " + lastErrorSentence(); }

    template<class Value> static std::string told(const Result<Value>& result) {
        return !result ? "failed: " + result.error().message : *result ? "done" : "no rules";
    }

    static bool isRefusal(const std::string& text) {
        return text.starts_with("failed: Cannot ") && text.ends_with(".");
    }

    /// Not those of programs beside nft.
    static bool counts(const SeenCall& call) {
        return (call.ofChild || call.program == "nft") && !isLoading(call);
    }

    /// Loads rules by these settings, while calls fail.
    void sweepLoading(const char* mode) {
        storeBan();
        bringBack(mode);
        const std::string former = table();
        std::string next;
        FaultSweep sweep;
        sweep.prepare = [mode] { bringBack(mode); };
        sweep.act = load;
        sweep.counts = counts;
        sweep.share = Share::first;
        sweep.check = [&](const SweptRun& run) {
            if (run.call.name.empty()) {
                EXPECT_EQ(run.end.told, "done");
                next = table();
            }
            const std::string now = table();
            const bool done = run.end.told == "done";
            EXPECT_TRUE(done || isRefusal(run.end.told)) << run.end.told;
            EXPECT_TRUE(now == next || (!done && now == former)) << now;
            EXPECT_EQ(load(), "done") << "the next time";
            EXPECT_EQ(table(), next);
        };
        EXPECT_GE(sweepFaults(sweep), 30);
        EXPECT_NE(former, next);
    }

    /// Adds or removes the ban of an address, while calls fail.
    void sweepBan(std::string (*act)(), bool startsBanned, bool endsBanned) {
        bringBackBan(startsBanned);
        const std::string former = table();
        std::string next;
        FaultSweep sweep;
        sweep.prepare = [startsBanned] { bringBackBan(startsBanned); };
        sweep.act = act;
        sweep.counts = counts;
        sweep.share = Share::first;
        sweep.check = [&](const SweptRun& run) {
            next = run.call.name.empty() ? table() : next;
            const std::string now = table();
            const bool done = run.end.told == "done";
            EXPECT_TRUE(done || isRefusal(run.end.told)) << run.end.told;
            EXPECT_TRUE(now == next || (!done && now == former)) << now;
            EXPECT_EQ(contains(next, banned), endsBanned);
        };
        EXPECT_GE(sweepFaults(sweep), 20);
    }

    static void bringBackBan(bool isBanned) {
        setMode(formerMode);
        ASSERT_EQ(VELTFwRuleHup(), 0) << lastErrorSentence();
        ASSERT_EQ(isBanned ? ban() : admit(), "done");
    }

    static std::string ban() {
        return told(banSource({parseIpNetwork(banned).value(), std::chrono::hours(1)}));
    }
    static std::string admit() { return told(admitSource(parseIpNetwork(banned).value())); }
};

TEST_F(FirewallFaults, LeaveTheFormerRulesOrLoadNewOnes) {
    sweepLoading("mode = drop\nports = 8022");
}

TEST_F(FirewallFaults, LeaveTheFormerRulesOrRemoveThem) {
    sweepLoading("mode = off");
}

TEST_F(FirewallFaults, BanOrSayThatTheyDoNot) {
    sweepBan(ban, false, true);
}

TEST_F(FirewallFaults, AdmitOrSayThatTheyDoNot) {
    sweepBan(admit, true, false);
}

} // namespace
} // namespace velt::test
