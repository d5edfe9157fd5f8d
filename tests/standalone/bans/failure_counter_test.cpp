#include "standalone/bans/failure_counter.h"

#include <gtest/gtest.h>

#include <string>

namespace velt {
namespace {

using std::chrono::seconds;

IpNetwork address(const std::string& text) {
    return parseIpNetwork(text).value();
}

class FailureCounterTest : public testing::Test {
protected:
    FailureCounterTest() {
        settings_.failures = 3;
        settings_.window = seconds(60);
    }

    /// A failure of this address so many seconds after the beginning.
    bool fails(const std::string& from, int at) {
        return counter_.count(sourceOf(address(from)), settings_, start_ + seconds(at));
    }

    BanSettings settings_;
    FailureCounter counter_;
    const FailureCounter::Clock::time_point start_ = FailureCounter::Clock::now();
};

TEST_F(FailureCounterTest, TheNumberWithinTheTimeIsReached) {
    EXPECT_FALSE(fails("192.0.2.1", 0));
    EXPECT_FALSE(fails("192.0.2.1", 1));
    EXPECT_TRUE(fails("192.0.2.1", 59));
    EXPECT_FALSE(fails("192.0.2.1", 59)) << "it begins at nothing";
    EXPECT_FALSE(fails("192.0.2.1", 59));
    EXPECT_TRUE(fails("192.0.2.1", 59));
}

TEST_F(FailureCounterTest, WhatIsOlderThanTheTimeDoesNotCount) {
    EXPECT_FALSE(fails("192.0.2.1", 0));
    EXPECT_FALSE(fails("192.0.2.1", 1));
    EXPECT_FALSE(fails("192.0.2.1", 60)) << "the first is 60 seconds old";
    EXPECT_TRUE(fails("192.0.2.1", 60));
}

TEST_F(FailureCounterTest, EachSourceCountsForItself) {
    for (const char* from : {"192.0.2.1", "192.0.2.2", "2001:db8::1", "2001:db8:0:1::1"}) {
        EXPECT_FALSE(fails(from, 0));
        EXPECT_FALSE(fails(from, 0));
    }
    EXPECT_TRUE(fails("192.0.2.2", 0));
    EXPECT_TRUE(fails("2001:db8::ffff:2", 0)) << "of the same 64 bits";
    EXPECT_TRUE(fails("::ffff:192.0.2.1", 0)) << "the same address in the other form";
}

TEST_F(FailureCounterTest, OneFailureMayBeTooMany) {
    settings_.failures = 1;
    EXPECT_TRUE(fails("192.0.2.1", 0));
    EXPECT_TRUE(fails("192.0.2.1", 0));
}

TEST_F(FailureCounterTest, AFloodForgetsWhoWasQuietForLongest) {
    EXPECT_FALSE(fails("192.0.2.1", 1));
    EXPECT_FALSE(fails("192.0.2.2", 0));
    EXPECT_FALSE(fails("192.0.2.2", 0));
    for (std::size_t i = 0; i < FailureCounter::mostSources; ++i) {
        fails("10.1." + std::to_string(i / 256) + "." + std::to_string(i % 256), 2);
        fails("192.0.2.1", 2);
        settings_.failures = static_cast<int>(i) + 5;
    }
    EXPECT_EQ(counter_.size(), FailureCounter::mostSources);
    settings_.failures = 3;
    EXPECT_FALSE(fails("192.0.2.2", 2)) << "its former failures are forgotten";
    EXPECT_TRUE(fails("192.0.2.1", 2)) << "this one was never quiet";
}

TEST(Source, IsAnAddressOrAWholeCustomer) {
    const auto source = [](const char* text) { return toText(sourceOf(address(text))); };
    EXPECT_EQ(source("192.0.2.1"), "192.0.2.1");
    EXPECT_EQ(source("2001:db8:1:2:3:4:5:6"), "2001:db8:1:2::/64");
    EXPECT_EQ(source("fe80::1:2%eth0"), "fe80::1:2");
    EXPECT_EQ(source("::1"), "::1");
}

TEST(Source, OfTheMachineItselfOrOfTheSettingsIsSpared) {
    BanSettings settings;
    settings.never = {address("192.0.2.0/24"), address("2001:db8:1::/48"), address("2001:db8:2::7")};
    const auto spared = [&settings](const char* text) { return isSpared(sourceOf(address(text)), settings); };
    for (const char* each : {"127.0.0.1", "127.255.255.254", "::1", "::ffff:127.0.0.1", "192.0.2.77",
                             "2001:db8:1:ffff::1", "2001:db8:2::8"}) {
        EXPECT_TRUE(spared(each)) << each;
    }
    for (const char* each : {"126.255.255.255", "128.0.0.1", "192.0.3.1", "2001:db8:2:1::7", "::2"}) {
        EXPECT_FALSE(spared(each)) << each;
    }
}

} // namespace
} // namespace velt
