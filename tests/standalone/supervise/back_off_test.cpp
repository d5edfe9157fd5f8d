#include "standalone/supervise/back_off.h"

#include <gtest/gtest.h>

namespace velt {
namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;

TEST(BackOff, DoublesUpToItsLongest) {
    BackOff backOff;
    for (const int wait : {100, 200, 400, 800, 1600, 3200, 6400, 12800, 25600, 30000, 30000}) {
        EXPECT_EQ(backOff.after(seconds(1)), milliseconds(wait));
    }
    for (int i = 0; i < 100; ++i) {
        EXPECT_EQ(backOff.after(seconds(0)), milliseconds(30000));
    }
}

TEST(BackOff, BeginsAnewAfterASteadyRun) {
    BackOff backOff;
    backOff.after(seconds(1));
    EXPECT_EQ(backOff.after(milliseconds(9999)), milliseconds(200));
    EXPECT_EQ(backOff.after(milliseconds(10000)), milliseconds(100));
    EXPECT_EQ(backOff.after(seconds(0)), milliseconds(200));
}

TEST(BackOff, BeginsAnewAfterAStartThatWasAskedFor) {
    BackOff backOff;
    backOff.after(seconds(1));
    backOff.forget();
    EXPECT_EQ(backOff.after(seconds(1)), milliseconds(100));
}

} // namespace
} // namespace velt
