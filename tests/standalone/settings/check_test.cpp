#include "standalone/settings/settings.h"

#include <gtest/gtest.h>

#include <climits>
#include <cstring>
#include <functional>

namespace velt {
namespace {

using Change = std::function<void(FtpSettings&)>;

std::string problemAfter(const Change& change) {
    FtpSettings settings = defaultFtpSettings();
    change(settings);
    const Result<> checked = checkFtpSettings(settings);
    return checked ? "" : checked.error().message;
}

Change port(const char* text) {
    return [text](FtpSettings& settings) {
        std::memset(settings.record.portnum, 0, sizeof(settings.record.portnum));
        std::memcpy(settings.record.portnum, text, std::strlen(text));
    };
}

Change range(int first, int last) {
    return [first, last](FtpSettings& settings) {
        settings.record.passive_port_min = first;
        settings.record.passive_port_max = last;
    };
}

Change address(const std::string& text) {
    return [text](FtpSettings& settings) { settings.externalAddress = text; };
}

TEST(CheckFtp, TakesTheDefaults) {
    EXPECT_EQ(problemAfter([](FtpSettings&) {}), "");
}

TEST(CheckFtp, ThePortIsADecimalNumberFrom1To65535) {
    for (const char* text : {"1", "21", "2121", "65535"})
        EXPECT_EQ(problemAfter(port(text)), "") << text;
    for (const char* text :
         {"", "0", "65536", "-1", "+21", " 21", "21 ", "021", "2121abc", "0x15", "9999999", "21\n", "2.1"}) {
        const std::string problem = problemAfter(port(text));
        EXPECT_EQ(problem.substr(0, 27), "The FTP setting portnum is ") << text;
    }
    EXPECT_EQ(problemAfter(port("70000")),
              "The FTP setting portnum is \"70000\"; expected a number from 1 to 65535.");
    EXPECT_EQ(problemAfter(port("21\nX")),
              "The FTP setting portnum is \"21\\x0aX\"; expected a number from 1 to 65535.");
}

TEST(ControlPort, IsNoneWhereTheTextIsNotTheOneFormOfAPort) {
    const auto portIn = [](const char* text) {
        FtpSettings settings = defaultFtpSettings();
        port(text)(settings);
        return controlPort(settings.record);
    };
    EXPECT_EQ(portIn("21"), 21);
    EXPECT_EQ(portIn("65535"), 65535);
    for (const char* text : {"", "0", "021", "0021", "65536", "-1", "21 ", "21x"}) {
        EXPECT_EQ(portIn(text), 0) << text;
    }
}

TEST(CheckFtp, TextsEndWithinTheirFields) {
    EXPECT_EQ(problemAfter(port("00000021")), "The FTP setting portnum is longer than 7 bytes.");
    EXPECT_EQ(problemAfter([](FtpSettings& settings) {
                  std::memset(settings.record.anonymous_chroot_share, 'x', 492);
              }),
              "The FTP setting anonymous_chroot_share is longer than 491 bytes.");
    EXPECT_EQ(problemAfter([](FtpSettings& settings) {
                  std::memset(settings.record.anonymous_chroot_share, 'x', 491);
              }),
              "");
}

TEST(CheckFtp, ThePassiveRangeGoesUpwardsFrom1024To65535) {
    EXPECT_EQ(problemAfter(range(1024, 65535)), "");
    EXPECT_EQ(problemAfter(range(50000, 50001)), "");
    EXPECT_EQ(problemAfter(range(1023, 2000)),
              "The passive port range is 1023 to 2000; expected ports from 1024 to 65535.");
    EXPECT_EQ(problemAfter(range(60000, 65536)),
              "The passive port range is 60000 to 65536; expected ports from 1024 to 65535.");
    EXPECT_EQ(problemAfter(range(-5, INT_MAX)),
              "The passive port range is -5 to 2147483647; expected ports from 1024 to 65535.");
    EXPECT_EQ(problemAfter(range(50001, 50000)),
              "The passive port range is 50001 to 50000; its first port has to be lower than its last.");
    EXPECT_EQ(problemAfter(range(50000, 50000)), "The passive port range has only the port 50000; the FTP "
                                                 "daemon needs two ports or more.");
}

TEST(CheckFtp, ARangeWithAnEndOfZeroIsNone) {
    EXPECT_EQ(problemAfter(range(0, 99999)), "");
    EXPECT_EQ(problemAfter(range(-1, 0)), "");
    FtpSettings settings = defaultFtpSettings();
    range(0, 99999)(settings);
    EXPECT_EQ(passiveRange(settings.record).first, 55536);
    EXPECT_EQ(passiveRange(settings.record).last, 55899);
}

TEST(CheckFtp, TheRangeInForceIsApartFromThePort) {
    for (const char* text : {"2000", "2050", "2100"})
        EXPECT_EQ(problemAfter([&](FtpSettings& settings) {
                      port(text)(settings);
                      range(2000, 2100)(settings);
                  }),
                  std::string("The passive port range 2000 to 2100 contains the FTP port ") + text +
                      "; choose a range without it.");
    EXPECT_EQ(problemAfter(port("55600")),
              "The passive port range 55536 to 55899 contains the FTP port 55600; "
              "choose a range without it.");
    EXPECT_EQ(problemAfter([](FtpSettings& settings) {
                  port("55600")(settings);
                  range(2000, 2100)(settings);
              }),
              "");
}

TEST(CheckFtp, TheTimeOutIsNotNegative) {
    for (const int seconds : {0, 1, 86400, 86401, INT_MAX})
        EXPECT_EQ(problemAfter([&](FtpSettings& settings) { settings.timeout = seconds; }), "");
    EXPECT_EQ(problemAfter([](FtpSettings& settings) { settings.timeout = -5; }),
              "The FTP setting timeout is -5; expected a number from 0 to 86400.");
}

TEST(CheckFtp, LimitsBelowOneMeanNoLimit) {
    for (const int limit : {INT_MIN, -1, 0, INT_MAX})
        EXPECT_EQ(problemAfter([&](FtpSettings& settings) {
                      settings.record.enable_flow_ctrl = 1;
                      settings.record.maxuploadrate = limit;
                      settings.record.maxdownloadrate = limit;
                      settings.record.max_conn_per_ip = limit;
                  }),
                  "");
}

TEST(CheckExternalAddress, RefusesWhatNoClientCanReach) {
    for (const char* text : {"0.0.0.0", "0.1.2.3", "127.0.0.1", "127.255.0.1", "169.254.1.1", "224.0.0.1",
                             "239.255.255.255", "240.0.0.1", "255.255.255.255"}) {
        const Result<> checked = checkExternalAddress(text);
        ASSERT_FALSE(checked) << text;
        EXPECT_EQ(checked.error().message.find("The external address (ext_ip) is " + std::string(text)), 0U)
            << checked.error().message;
    }
    EXPECT_EQ(checkExternalAddress("127.0.0.1").error().message,
              "The external address (ext_ip) is 127.0.0.1, a loopback address; expected the address at which "
              "clients reach this server.");
}

TEST(CheckExternalAddress, TakesNoneAndAnyOther) {
    for (const char* text : {"", "1.0.0.1", "10.0.0.1", "126.255.255.255", "128.0.0.1", "169.253.255.255",
                             "169.255.0.1", "192.168.1.1", "203.0.113.7", "223.255.255.255"}) {
        EXPECT_TRUE(checkExternalAddress(text)) << text;
    }
}

TEST(CheckFtp, TheExternalAddressIsIPv4OrEmpty) {
    EXPECT_EQ(problemAfter(address("")), "");
    EXPECT_EQ(problemAfter(address("203.0.113.7")), "");
    for (const char* text : {"eth0", "999.1.1.1", "1.2.3", "1.2.3.4.5", "1.2.3.4 ", " 1.2.3.4", "::1",
                             "example.org", "1.2.3.4\nPort 1", "%{env:HOME}", "0x7f.1.1.1"})
        EXPECT_EQ(problemAfter(address(text)).substr(0, 24), "The external address is ") << text;
    EXPECT_EQ(problemAfter(address("eth0")),
              "The external address is \"eth0\"; expected an IPv4 address such as 192.0.2.1, or nothing.");
    EXPECT_NE(problemAfter(address(std::string("1.2.3.4\0x", 9))), "");
}

TEST(CheckSftp, ThePortIsFrom1To65535) {
    for (const int number : {1, 22, 65535})
        EXPECT_TRUE(checkSftpSettings({true, number}));
    for (const int number : {INT_MIN, -1, 0, 65536, INT_MAX}) {
        const Result<> checked = checkSftpSettings({true, number});
        ASSERT_FALSE(checked);
        EXPECT_EQ(checked.error().message, "The SFTP setting portnum is " + std::to_string(number) +
                                               "; expected a number from 1 to 65535.");
    }
}

} // namespace
} // namespace velt
