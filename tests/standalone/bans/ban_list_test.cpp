#include "standalone/bans/ban_list.h"

#include "standalone/core/state_lock.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/result.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <string>

namespace velt {
namespace {

using std::chrono::seconds;

constexpr Ban::Clock::time_point start{seconds(1800000000)};

Ban ban(const std::string& source, int lasts, const std::string& service = "ftp") {
    return {parseIpNetwork(source).value(), start + seconds(lasts), service, 10};
}

std::string describe(const std::vector<Ban>& bans) {
    std::string text;
    for (const Ban& each : bans) {
        text += toText(each.source) + " ";
    }
    return text;
}

class BanList : public testing::Test {
protected:
    static void add(const Ban& each, int now = 0) {
        const auto lock = StateLock::take();
        EXPECT_EQ(test::messageOf(storeBan(each, start + seconds(now))), "");
    }

    static std::string listed(int now = 0) {
        const auto bans = bansAt(start + seconds(now));
        return bans ? describe(*bans) : bans.error().message;
    }

    test::StateFolder root_;
};

TEST_F(BanList, HoldsWhatIsInForce) {
    EXPECT_EQ(listed(), "") << "without a file";
    add(ban("192.0.2.1", 60));
    add(ban("2001:db8::/64", 30, "sftp"));
    EXPECT_EQ(listed(), "2001:db8::/64 192.0.2.1 ") << "what ends first comes first";
    EXPECT_EQ(listed(29), "2001:db8::/64 192.0.2.1 ");
    EXPECT_EQ(listed(30), "192.0.2.1 ");
    EXPECT_EQ(listed(60), "");
    EXPECT_EQ((*bansAt(start)).back(), ban("192.0.2.1", 60));
}

TEST_F(BanList, ABanTakesThePlaceOfAFormerOne) {
    add(ban("192.0.2.1", 60));
    add(ban("192.0.2.1", 90, "sftp"));
    ASSERT_EQ(listed(), "192.0.2.1 ");
    EXPECT_EQ((*bansAt(start)).front(), ban("192.0.2.1", 90, "sftp"));
}

TEST_F(BanList, WhatHasEndedLeavesTheFile) {
    add(ban("192.0.2.1", 60));
    add(ban("192.0.2.2", 120), 60);
    EXPECT_EQ(root_.read("run/velt/bans"), "192.0.2.2 1800000120 ftp 10\n");
}

TEST_F(BanList, IsNobodyElsesBusiness) {
    add(ban("192.0.2.1", 60));
    EXPECT_EQ(std::filesystem::status(root_.path() / "run/velt/bans").permissions(),
              std::filesystem::perms(0600));
}

TEST_F(BanList, ABanIsTakenOut) {
    add(ban("192.0.2.1", 60));
    const auto lock = StateLock::take();
    EXPECT_TRUE(removeBan(ban("192.0.2.1", 0).source, start) == true);
    EXPECT_TRUE(removeBan(ban("192.0.2.1", 0).source, start) == false);
    EXPECT_EQ(listed(), "");
}

TEST_F(BanList, OfVeryManyTheOneThatEndsFirstGivesWay) {
    std::vector<Ban> many;
    for (int i = 0; i < 4096; ++i) {
        many.push_back(ban("10.0." + std::to_string(i / 256) + "." + std::to_string(i % 256), 100 + i));
    }
    root_.write("run/velt/bans", renderBans(many));
    add(ban("192.0.2.1", 5000));
    const auto bans = bansAt(start);
    ASSERT_EQ(bans->size(), 4096U);
    EXPECT_EQ(toText(bans->front().source), "10.0.0.1");
    EXPECT_EQ(toText(bans->back().source), "192.0.2.1");
}

TEST(BanFile, LeavesOutWhatIsNoBan) {
    EXPECT_EQ(describe(parseBans("192.0.2.1 1800000000 ftp 10\nnonsense\n\n192.0.2.2 x ftp 10\n"
                                 "192.0.2.3 1800000000 smtp 10\n192.0.2.4 1800000000 sftp 0\n"
                                 "192.0.2.5 9999999999 sftp 1\n192.0.2.6 -1 sftp 1\n"
                                 "192.0.2.7 1800000000 veltd 10 x\n192.0.2.8 1800000000 veltd 10")),
              "192.0.2.1 192.0.2.8 ");
}

TEST(BanOf, AnAddressIsTheOneOfItsSource) {
    const std::vector<Ban> bans{ban("192.0.2.1", 60), ban("2001:db8::/64", 60)};
    const auto held = [&bans](const char* address) {
        const auto found = banOf(parseIpAddress(address).value(), bans);
        return found ? toText(found->source) : "";
    };
    EXPECT_EQ(held("192.0.2.1"), "192.0.2.1");
    EXPECT_EQ(held("::ffff:192.0.2.1"), "192.0.2.1");
    EXPECT_EQ(held("192.0.2.2"), "");
    EXPECT_EQ(held("2001:db8::77"), "2001:db8::/64");
    EXPECT_EQ(held("2001:db8:0:1::77"), "");
}

} // namespace
} // namespace velt
