// Operations that are refused fill no store, and none of them is hidden.
#include "standalone/activity/session_activity.h"
#include "standalone/activity/session_pages.h"
#include "standalone/activity/spool_text.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/result.h"

#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <functional>
#include <string>
#include <vector>

namespace velt {
namespace {

constexpr velt_session anna{velt_ftp, "", "anna", "anna", "192.0.2.1", ""};
constexpr int many = 2000;

void refuse(const std::string& path, int times) {
    const velt_record refused{"delete", "refused", "denied", path.c_str(), nullptr, nullptr, -1, -1};
    for (int i = 0; i < times; ++i) {
        velt_record_operation(&refused);
    }
}

class RefusedRecords : public testing::Test {
protected:
    /// A process that does this as a session, and ends.
    void runSession(const std::function<void()>& act) {
        const pid_t child = fork();
        if (child == 0) {
            velt_begin_activity(root_.path().c_str());
            velt_expect_session();
            velt_session_opened(&anna);
            act();
            _exit(0);
        }
        EXPECT_EQ(waitpid(child, nullptr, 0), child);
        all_ = parseSpool(root_.read("var/lib/velt/transfers/spool")).records;
    }

    std::uint64_t recorded() const {
        return static_cast<std::uint64_t>(
            std::ranges::count(all_, OperationResult::refused, &OperationRecord::result));
    }

    std::uint64_t leftOut() const {
        std::uint64_t count = 0;
        for (const OperationRecord& each : all_) {
            count += each.leftOut;
        }
        return count;
    }

    test::StateFolder root_;
    std::vector<OperationRecord> all_;
};

TEST_F(RefusedRecords, AreFewAndTheRestIsCounted) {
    runSession([] {
        refuse("/a", many);
        velt_session_closed("logged out");
    });
    EXPECT_GE(recorded(), 10U);
    EXPECT_LT(recorded(), 100U) << "ten, and five for each second that it took";
    EXPECT_EQ(recorded() + leftOut(), static_cast<std::uint64_t>(many));
}

TEST_F(RefusedRecords, AreCountedInTheNextRecord) {
    runSession([] {
        refuse("/a", many);
        const velt_record done{"delete", "done", nullptr, "/b", nullptr, nullptr, -1, -1};
        velt_record_operation(&done);
        velt_session_closed("logged out");
    });
    ASSERT_GT(all_.size(), 2U);
    const OperationRecord& done = all_[all_.size() - 2];
    EXPECT_EQ(done.place.path, "/b");
    EXPECT_GT(done.leftOut, 0U);
    EXPECT_EQ(all_.back().leftOut, 0U);
}

TEST_F(RefusedRecords, AreCountedOfASessionThatWasKilled) {
    runSession([] { refuse("/a", many); });
    EXPECT_EQ(test::messageOf(visitSessionPages([](const SessionName&, const velt_session_page&) {})), "");
    all_ = parseSpool(root_.read("var/lib/velt/transfers/spool")).records;
    ASSERT_FALSE(all_.empty());
    EXPECT_EQ(all_.back().operation, Operation::sessionClosed);
    EXPECT_EQ(recorded() + leftOut(), static_cast<std::uint64_t>(many));
}

TEST_F(RefusedRecords, ComeAgainAfterARest) {
    runSession([] {
        refuse("/a", many);
        usleep(1'000'000);
        refuse("/after", 1);
    });
    EXPECT_EQ(all_.back().place.path, "/after");
    EXPECT_GT(all_.back().leftOut, 0U);
}

TEST_F(RefusedRecords, OfAllProcessesOfASessionAreLimitedTogether) {
    runSession([] {
        for (int i = 0; i < 8; ++i) {
            if (fork() == 0) {
                refuse("/a", many / 8);
                _exit(0);
            }
        }
        while (wait(nullptr) > 0) {
        }
        velt_session_closed("logged out");
    });
    EXPECT_LT(recorded(), 100U);
    EXPECT_EQ(recorded() + leftOut(), static_cast<std::uint64_t>(many));
}

TEST_F(RefusedRecords, HaveShortPaths) {
    const std::string path = "/" + std::string(4000, 'x');
    runSession([&path] {
        refuse(path, 1);
        const velt_record done{"delete", "done", nullptr, path.c_str(), nullptr, nullptr, -1, -1};
        velt_record_operation(&done);
    });
    ASSERT_EQ(all_.size(), 3U);
    EXPECT_EQ(all_[1].place.path, path.substr(0, 1024));
    EXPECT_TRUE(all_[1].cut);
    EXPECT_EQ(all_[2].place.path, path);
    EXPECT_FALSE(all_[2].cut);
}

TEST_F(RefusedRecords, DoNotLimitWhatIsDone) {
    runSession([] {
        const velt_record done{"delete", "done", nullptr, "/b", nullptr, nullptr, -1, -1};
        for (int i = 0; i < many; ++i) {
            velt_record_operation(&done);
        }
        velt_session_closed("logged out");
    });
    EXPECT_EQ(all_.size(), static_cast<std::size_t>(many) + 2);
    EXPECT_EQ(leftOut(), 0U);
}

} // namespace
} // namespace velt
