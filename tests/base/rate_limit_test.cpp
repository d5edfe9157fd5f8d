#include "base/rate_limit.h"

#include <gtest/gtest.h>

namespace velt::test {
namespace {

using std::chrono::seconds;

TEST(RateLimit, AdmitsSoManyWithinEachPeriod) {
    RateLimit limit(2, seconds(10));
    const RateLimit::Clock::time_point start{seconds(100)};
    EXPECT_TRUE(limit.admit(start));
    EXPECT_TRUE(limit.admit(start + seconds(9)));
    EXPECT_FALSE(limit.admit(start + seconds(9)));
    EXPECT_TRUE(limit.admit(start + seconds(10)));
    EXPECT_TRUE(limit.admit(start + seconds(19)));
    EXPECT_FALSE(limit.admit(start + seconds(19)));
}

TEST(RateLimit, TellsHowManyItRefused) {
    RateLimit limit(1, seconds(1));
    const RateLimit::Clock::time_point start{};
    EXPECT_EQ(limit.admit(start), 0U);
    for (int i = 0; i < 5; ++i) {
        EXPECT_EQ(limit.admit(start), std::nullopt);
    }
    EXPECT_EQ(limit.admit(start + seconds(1)), 5U);
    EXPECT_EQ(limit.admit(start + seconds(2)), 0U);
}

} // namespace
} // namespace velt::test
