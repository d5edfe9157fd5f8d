// Callers who ask much delay and lock out nobody but themselves.

#include "host/module/request_order.h"

#include <gtest/gtest.h>

#include <future>
#include <string>

namespace {

using velt::host::RequestOrder;
using Kind = RequestOrder::Kind;

/// An order with one thread, which is busy until finish(), so that all else that is submitted waits.
class CallerTurns : public testing::Test {
protected:
    CallerTurns() {
        order.submit(Kind::write, "first", [this] { release_.get_future().wait(); });
    }

    void TearDown() override { finish(); }

    bool submit(Kind kind, const std::string& caller, const std::string& name, std::size_t bytes = 0) {
        return order.submit(
            kind, caller, [this, name] { sequence_ += name + " "; }, bytes);
    }

    /// The names of all that waited, in the order in which they were done.
    std::string finish() {
        if (!finished_) {
            finished_ = true;
            release_.set_value();
            order.stop();
        }
        return sequence_;
    }

    RequestOrder order{1, 3, 1000};

private:
    std::promise<void> release_;
    std::string sequence_;
    bool finished_ = false;
};

TEST_F(CallerTurns, ComeRoundWhateverSomebodyHasAsked) {
    for (const char* name : {"a1", "a2", "a3"}) {
        ASSERT_TRUE(submit(Kind::read, "a", name));
    }
    ASSERT_TRUE(submit(Kind::read, "b", "b1"));
    ASSERT_TRUE(submit(Kind::read, "", "root1"));
    ASSERT_TRUE(submit(Kind::read, "b", "b2"));
    EXPECT_EQ(finish(), "a1 b1 root1 a2 b2 a3 ");
}

TEST_F(CallerTurns, BringAWriteForwardThatComesAfterManyReads) {
    for (const char* name : {"a1", "a2", "a3"}) {
        ASSERT_TRUE(submit(Kind::read, "a", name));
    }
    ASSERT_TRUE(submit(Kind::write, "b", "WRITE"));
    EXPECT_EQ(finish(), "a1 WRITE a2 a3 ");
}

TEST_F(CallerTurns, KeepTheOrderOfWhatOneAsks) {
    ASSERT_TRUE(submit(Kind::read, "a", "read"));
    ASSERT_TRUE(submit(Kind::write, "a", "WRITE"));
    ASSERT_TRUE(submit(Kind::read, "b", "other"));
    ASSERT_TRUE(submit(Kind::read, "a", "again"));
    EXPECT_EQ(finish(), "read other WRITE again ");
}

TEST_F(CallerTurns, LeaveRoomForOthersWhenOneHasTooMuchWaiting) {
    for (const char* name : {"a1", "a2", "a3"}) {
        ASSERT_TRUE(submit(Kind::read, "a", name));
    }
    EXPECT_FALSE(submit(Kind::read, "a", "a4"));
    EXPECT_TRUE(submit(Kind::read, "b", "b1", 1000));
    EXPECT_FALSE(submit(Kind::read, "b", "b2", 1));
    EXPECT_TRUE(submit(Kind::read, "", "root1", 600));
    EXPECT_TRUE(submit(Kind::read, "", "root2", 400));
    EXPECT_EQ(finish(), "a1 b1 root1 a2 root2 a3 ");
}

TEST_F(CallerTurns, AreHadByARequestThatIsLargerThanAllThatMayWait) {
    EXPECT_TRUE(submit(Kind::write, "a", "large", 5000));
    EXPECT_FALSE(submit(Kind::write, "a", "beside", 1));
    EXPECT_EQ(finish(), "large ");
}

} // namespace
