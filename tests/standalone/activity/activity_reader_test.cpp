// From a session to those who listen and search.
#include "standalone/activity/activity_reader.h"

#include "standalone/activity/operation_search.h"
#include "standalone/activity/session_activity.h"
#include "standalone/activity/spool.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/result.h"
#include "tests/support/waiting.h"

#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <functional>
#include <mutex>
#include <stdexcept>
#include <string>
#include <vector>

namespace velt {
namespace {

constexpr velt_session anna{velt_sftp, "", "anna", "anna", "192.0.2.1", ""};

class ActivityReader : public testing::Test {
protected:
    void SetUp() override {
        subscription_ = subscribeActivity([this](const Activity& activity) {
            const std::lock_guard lock(mutex_);
            told_.push_back(activity);
        });
    }
    void TearDown() override {
        stopActivityReader();
        unsubscribeActivity(subscription_);
    }

    /// A session that does this and ends.
    void session(const std::function<void()>& act) {
        const pid_t child = fork();
        if (child == 0) {
            velt_begin_activity(root_.path().c_str());
            velt_expect_session();
            velt_session_opened(&anna);
            act();
            _exit(0);
        }
        waitpid(child, nullptr, 0);
    }

    /// "KIND OPERATION OCTETS;" of all that was told.
    std::string told() {
        const std::lock_guard lock(mutex_);
        std::string all;
        for (const Activity& each : told_) {
            const char* const kinds[] = {"", "started ", "progress "};
            all += kinds[static_cast<int>(each.kind)] + std::string(operationName(each.record.operation)) +
                   (each.record.octets ? " " + std::to_string(*each.record.octets) : "") + "; ";
        }
        return all;
    }

    bool becomes(const std::function<bool()>& condition) {
        return test::waitUntil(condition, test::patience);
    }

    test::StateFolder root_;
    std::mutex mutex_;
    std::vector<Activity> told_;
    ActivitySubscription subscription_ = 0;
};

TEST_F(ActivityReader, TellsAndKeepsWhatSessionsDo) {
    const auto moved = activityTotals().octets[SessionProtocol::sftp];
    const auto accepted = activityTotals().logins[{SessionProtocol::sftp, "accepted"}];
    startActivityReader();
    session([] {
        const velt_record upload{"upload", "done", nullptr, "/a", nullptr, nullptr, 250, 1000};
        velt_record_operation(&upload);
        velt_login_was_refused(&anna, "password");
        velt_session_closed("logged out");
    });
    ASSERT_TRUE(becomes([this] { return told().ends_with("session-closed; "); })) << told();
    EXPECT_EQ(told(), "session-opened; upload 250; login-refused; session-closed; ");
    EXPECT_EQ(searchOperations({}).valueOr({}).records.size(), 4U);
    EXPECT_EQ(told_[1].record.id, 2);
    EXPECT_EQ(activityTotals().octets[SessionProtocol::sftp].in - moved.in, 250U);
    EXPECT_EQ((activityTotals().logins[{SessionProtocol::sftp, "accepted"}]) - accepted, 1U);
    EXPECT_GE((activityTotals().logins[{SessionProtocol::sftp, "password"}]), 1U);
    EXPECT_EQ(activityProblem(), "");
}

TEST_F(ActivityReader, CountsDamagedLines) {
    const auto damaged = activityTotals().damaged;
    startActivityReader();
    const int spool = velt_open_spool(root_.path().c_str());
    EXPECT_EQ(write(spool, "rubbish\n\x1e{}\n", 12), 12);
    close(spool);
    session([] { velt_session_closed("logged out"); });
    ASSERT_TRUE(becomes([this] { return told().ends_with("session-closed; "); })) << told();
    EXPECT_EQ(activityTotals().damaged - damaged, 2U);
}

TEST_F(ActivityReader, TellsOfRunningTransfers) {
    startActivityReader();
    int go[2] = {-1, -1};
    ASSERT_EQ(pipe(go), 0);
    const pid_t child = fork();
    if (child == 0) {
        char octet = 0;
        velt_begin_activity(root_.path().c_str());
        velt_expect_session();
        velt_session_opened(&anna);
        velt_transfer_began(velt_download, "/a");
        velt_transfer_moved(100);
        static_cast<void>(!read(go[0], &octet, 1));
        velt_transfer_moved(300);
        pause();
        _exit(0);
    }
    EXPECT_TRUE(becomes([this] { return told() == "session-opened; started download 100; "; })) << told();
    EXPECT_EQ(activityTotals().sessions[SessionProtocol::sftp], 1U);
    EXPECT_EQ(write(go[1], "", 1), 1);
    EXPECT_TRUE(becomes([this] { return told().ends_with("progress download 300; "); })) << told();
    const auto moved = activityTotals().octets[SessionProtocol::sftp].out;
    kill(child, SIGKILL);
    waitpid(child, nullptr, 0);
    EXPECT_TRUE(becomes([this] { return told().ends_with("download 300; session-closed; "); })) << told();
    EXPECT_TRUE(becomes([] { return activityTotals().sessions[SessionProtocol::sftp] == 0; }));
    EXPECT_EQ(activityTotals().octets[SessionProtocol::sftp].out, moved);
    close(go[0]);
    close(go[1]);
}

TEST_F(ActivityReader, TakesWhatWasWrittenWhileNoneRan) {
    session([] { velt_session_closed("logged out"); });
    startActivityReader();
    startActivityReader();
    ASSERT_TRUE(becomes([this] { return told() == "session-opened; session-closed; "; })) << told();
    stopActivityReader();
    stopActivityReader();
    session([] { velt_session_closed("logged out"); });
    EXPECT_EQ(searchOperations({}).valueOr({}).records.size(), 2U);
    startActivityReader();
    EXPECT_TRUE(becomes([] { return searchOperations({}).valueOr({}).records.size() == 4; }));
}

TEST_F(ActivityReader, GoesOnWhenASubscriberFails) {
    const auto failing = subscribeActivity([](const Activity&) { throw std::runtime_error("no"); });
    startActivityReader();
    session([] { velt_session_closed("logged out"); });
    EXPECT_TRUE(becomes([this] { return told() == "session-opened; session-closed; "; })) << told();
    unsubscribeActivity(failing);
}

} // namespace
} // namespace velt
