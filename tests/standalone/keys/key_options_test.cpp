// From where and until when a key may be used.
#include "standalone/keys/key_options.h"

#include "base/utc_text.h"
#include "tests/support/result.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <ctime>

namespace velt::test {
namespace {

std::string read(const std::string& text) {
    const auto options = parseKeyOptions(text);
    return options ? toText(*options) : "refused";
}

TEST(KeyOptions, AreReadAndWritten) {
    EXPECT_EQ(read(""), "");
    EXPECT_EQ(read("FROM=\"192.0.2.1\""), "from=\"192.0.2.1\"");
    EXPECT_EQ(read("expiry-time=\"20271231Z\",from=\"192.0.2.0/24,!192.0.2.7\""),
              "from=\"192.0.2.0/24,!192.0.2.7\",expiry-time=\"20271231000000Z\"");
    EXPECT_EQ(read("from=\"2001:DB8::/32,192.0.2.*,10.?.0.1,::ffff:192.0.2.9,2001:db8:*\""),
              "from=\"2001:db8::/32,192.0.2.*,10.?.0.1,192.0.2.9,2001:db8:*\"");
}

TEST(KeyOptions, NameAddressesThatTheDaemonKnows) {
    for (const char* const sources :
         {"", ",", "192.0.2.1,,192.0.2.2", "host.example", "*.example", "192.0.2.0/33", "192.0.2.1/24",
          "192.0.2.*/24", "!192.0.2.1", "!192.0.2.1,!10.0.0.0/8", "192.0.2.1 192.0.2.2", "192.0.2",
          "fe80::1%eth0", "192.0.2.1\\\"", "localhost", "!!192.0.2.1"}) {
        EXPECT_EQ(read("from=\"" + std::string(sources) + "\""), "refused") << sources;
    }
}

TEST(KeyOptions, NameMomentsOfTheCalendar) {
    EXPECT_EQ(read("expiry-time=\"202802291530Z\""), "expiry-time=\"20280229153000Z\"");
    EXPECT_EQ(read("expiry-time=\"20280229153045Z\""), "expiry-time=\"20280229153045Z\"");
    for (const char* const time : {"",
                                   "Z",
                                   "2027",
                                   "2027123",
                                   "202712310",
                                   "2027-12-31",
                                   "20271301Z",
                                   "20270001Z",
                                   "20270229Z",
                                   "20271232Z",
                                   "202712312400Z",
                                   "202712312360Z",
                                   "20271231235960Z",
                                   "20271231ZZ",
                                   "20271231z",
                                   "always",
                                   "+0271231Z",
                                   " 20271231",
                                   "19000101Z",
                                   "30000101Z"}) {
        EXPECT_EQ(read("expiry-time=\"" + std::string(time) + "\""), "refused") << time;
    }
}

TEST(KeyOptions, MeanThisServersTimeWithoutAZ) {
    const char* const former = std::getenv("TZ");
    const std::string zone = former == nullptr ? "" : former;
    setenv("TZ", "XST-3", 1);
    tzset();
    EXPECT_EQ(read("expiry-time=\"202712312359\""), "expiry-time=\"20271231205900Z\"");
    EXPECT_EQ(read(read("expiry-time=\"19710101\"")), "expiry-time=\"19701231210000Z\"") << "in any year";
    if (former == nullptr) {
        unsetenv("TZ");
    } else {
        setenv("TZ", zone.c_str(), 1);
    }
    tzset();
}

TEST(KeyOptions, HaveTheirForm) {
    for (const char* const text :
         {"from", "from=", "from=192.0.2.1", "from=\"192.0.2.1", "from=\"192.0.2.1\",", ",from=\"192.0.2.1\"",
          "from=\"192.0.2.1\"x", "from=\"192.0.2.1\",from=\"192.0.2.2\"",
          "expiry-time=\"20271231Z\",expiry-time=\"20281231Z\"", "=\"x\"", "from =\"192.0.2.1\"",
          "fr\nom=\"192.0.2.1\"", "\"from\"=\"192.0.2.1\""}) {
        EXPECT_EQ(read(text), "refused") << text;
    }
}

TEST(KeyOptions, EndAtABlankThatIsNotQuoted) {
    EXPECT_EQ(lengthOfOptions("a=\"b c\\\" d\",e f"), 13U);
    EXPECT_EQ(lengthOfOptions("ssh-rsa\tA"), 7U);
    EXPECT_EQ(lengthOfOptions("a=\"b c"), std::nullopt);
    EXPECT_EQ(lengthOfOptions(""), 0U);
}

} // namespace
} // namespace velt::test
