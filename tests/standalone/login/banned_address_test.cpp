// Who is banned, as a session of the FTP daemon reads it from the list that others write.
#include "standalone/bans/ban_list.h"
#include "standalone/core/paths.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <arpa/inet.h>

extern "C" {
#include "standalone/login/banned_address.h"
}

#include <string>

namespace velt::test {
namespace {

class BannedAddress : public testing::Test {
protected:
    void ban(const std::vector<std::string>& sources) {
        const Ban::Clock::time_point until{std::chrono::seconds(1000)};
        std::vector<Ban> bans;
        for (const std::string& source : sources) {
            bans.push_back({parseIpNetwork(source).value(), until, "ftp", 10});
        }
        root_.write(paths::bans.substr(1), renderBans(bans));
    }
    bool isBanned(const std::string& text, time_t now = 999) const {
        in6_addr address{};
        EXPECT_EQ(inet_pton(AF_INET6, text.c_str(), &address), 1) << text;
        return velt_is_banned(root_.path().c_str(), &address, now) != 0;
    }

    TemporaryFolder root_;
};

TEST_F(BannedAddress, isOneOfTheList) {
    EXPECT_FALSE(isBanned("::ffff:192.0.2.1")) << "there is no list";
    ban({"192.0.2.1", "198.51.100.0/28", "2001:db8:1:2::/64", "2001:db8::7"});
    for (const char* const banned : {"::ffff:192.0.2.1", "::ffff:198.51.100.0", "::ffff:198.51.100.15",
                                     "2001:db8:1:2:3::4", "2001:db8::7"}) {
        EXPECT_TRUE(isBanned(banned)) << banned;
    }
    for (const char* const free :
         {"::ffff:192.0.2.2", "::ffff:198.51.100.16", "2001:db8:1:3::", "2001:db8::8", "::192.0.2.1"}) {
        EXPECT_FALSE(isBanned(free)) << free;
    }
}

TEST_F(BannedAddress, isFreeWhenTheTimeHasPassed) {
    ban({"192.0.2.1"});
    EXPECT_TRUE(isBanned("::ffff:192.0.2.1", 999));
    EXPECT_FALSE(isBanned("::ffff:192.0.2.1", 1000));
}

TEST_F(BannedAddress, isNotReadFromLinesOfAnotherForm) {
    root_.write(paths::bans.substr(1),
                "192.0.2.1\nx 2000 ftp 3\n192.0.2.1/x/ 2000\n2001:db8::/129 2000 ftp 3\n\n" +
                    std::string(1000, '1') + "\n192.0.2.9 2000 ftp 3\n");
    EXPECT_FALSE(isBanned("2001:db8::"));
    EXPECT_TRUE(isBanned("::ffff:192.0.2.9"));
}

} // namespace
} // namespace velt::test
