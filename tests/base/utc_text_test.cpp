#include "base/utc_text.h"

#include <gtest/gtest.h>

namespace velt {
namespace {

TimePoint after1970(std::int64_t milliseconds) {
    return TimePoint(std::chrono::milliseconds(milliseconds));
}

TEST(UtcText, IsWrittenInTheFormAskedFor) {
    EXPECT_EQ(utcText(after1970(1'795'242'600'999), "%Y-%m-%dT%H:%M:%SZ"), "2026-11-21T06:30:00Z");
    EXPECT_EQ(utcText(after1970(0), "%a, %d %b %Y %H:%M:%S GMT"), "Thu, 01 Jan 1970 00:00:00 GMT");
}

TEST(UtcText, ATimestampHasMilliseconds) {
    EXPECT_EQ(timestamp(after1970(1'250)), "1970-01-01T00:00:01.250Z");
    EXPECT_EQ(timestamp(after1970(7)), "1970-01-01T00:00:00.007Z");
    EXPECT_EQ(timestamp(after1970(-1)), "1969-12-31T23:59:59.999Z");
}

} // namespace
} // namespace velt
