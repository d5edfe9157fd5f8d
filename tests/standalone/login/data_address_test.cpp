// Which addresses a client may name for its data.
#include <gtest/gtest.h>

#include <arpa/inet.h>

extern "C" {
#include "standalone/login/data_address.h"
}

#include <string>

namespace velt::test {
namespace {

std::string textOf(const in6_addr& address) {
    char text[INET6_ADDRSTRLEN] = "";
    inet_ntop(AF_INET6, &address, text, sizeof text);
    return text;
}

std::string port(const std::string& argument) {
    in6_addr address{};
    return velt_read_port(argument.c_str(), &address) != 0 ? textOf(address) : "";
}

std::string eprt(const std::string& argument) {
    in6_addr address{};
    return velt_read_eprt(argument.c_str(), &address) != 0 ? textOf(address) : "";
}

bool isInside(const std::string& text) {
    in6_addr address{};
    EXPECT_EQ(inet_pton(AF_INET6, text.c_str(), &address), 1) << text;
    return velt_is_inside(&address, nullptr) != 0;
}

TEST(DataAddress, isReadFromThePortCommand) {
    EXPECT_EQ(port("198,51,100,9,4,1"), "::ffff:198.51.100.9");
    EXPECT_EQ(port("0,0,0,0,0,0"), "::ffff:0.0.0.0");
    EXPECT_EQ(port("255,255,255,255,255,255"), "::ffff:255.255.255.255");
    for (const char* wrong :
         {"", "1", "1,2,3,4,5", "1,2,3,4,5,", "1,2,3,4,5,6,", "1,2,3,4,5,6 ", "256,2,3,4,5,6",
          "1,2,3,4,5,256", "-1,2,3,4,5,6", "+1,2,3,4,5,6", " 1,2,3,4,5,6", "0x1,2,3,4,5,6",
          "4294967423,0,0,1,5,6", "0127,0,0,1,5,6", "1,,3,4,5,6", "1.2.3.4.5.6", "a,b,c,d,e,f"}) {
        EXPECT_EQ(port(wrong), "") << wrong;
    }
}

TEST(DataAddress, isReadFromTheExtendedCommand) {
    EXPECT_EQ(eprt("|1|198.51.100.9|1025|"), "::ffff:198.51.100.9");
    EXPECT_EQ(eprt("|2|2001:db8::9|1025|"), "2001:db8::9");
    EXPECT_EQ(eprt("!2!::ffff:127.0.0.1!1025!"), "::ffff:127.0.0.1");
    for (const char* wrong :
         {"", "|", "|1", "|1|", "|1|198.51.100.9", "|3|198.51.100.9|1|", "|01|198.51.100.9|1|",
          "| 1|198.51.100.9|1|", "|1|2001:db8::9|1|", "|2|198.51.100.9|1|", "|2|fe80::1%eth0|1|",
          "|1|localhost|1|", "|1|127.1|1|", "|1|198.51.100.9 |1|", "1112.0.0.111", "|2|:|1|",
          "|2|1111:1111:1111:1111:1111:1111:1111:1111:1111:1111|1|"}) {
        EXPECT_EQ(eprt(wrong), "") << wrong;
    }
}

TEST(DataAddress, isInsideWhereItLeadsToThisServerOrToNobody) {
    for (const char* inside : {"::1",
                               "::",
                               "fe80::1",
                               "febf::1",
                               "ff02::1",
                               "ff0e::1",
                               "::ffff:127.0.0.1",
                               "::ffff:127.255.0.1",
                               "::ffff:0.0.0.0",
                               "::ffff:0.1.2.3",
                               "::ffff:169.254.0.1",
                               "::ffff:224.0.0.1",
                               "::ffff:240.0.0.1",
                               "::ffff:255.255.255.255",
                               "::127.0.0.1",
                               "64:ff9b::7f00:1",
                               "2002:7f00:1::1",
                               "2002:a9fe:1::",
                               "64:ff9b:1::7f00:1",
                               "64:ff9b:1:2:3:4:7f00:1",
                               "64:ff9b:1:7f00:0:100::",
                               "64:ff9b:1:27f:0:1::",
                               "64:ff9b:1:2:7f:0:100:0",
                               "2600::5efe:7f00:1",
                               "2600::200:5efe:7f00:1",
                               "::ffff:0:7f00:1",
                               "2001:0:c633:6409:0:0:80ff:fffe",
                               "2001:0:7f00:1:0:0:39cc:9bf6"}) {
        EXPECT_TRUE(isInside(inside)) << inside;
    }
    for (const char* outside :
         {"::ffff:198.51.100.9", "::ffff:169.253.0.1", "::ffff:169.255.0.1", "::ffff:126.255.255.255",
          "::ffff:128.0.0.1", "::ffff:223.255.255.255", "2001:db8::9", "fec0::1", "64:ff9b::c633:6409",
          "2002:c633:6409::1", "::ffff:0:c633:6409", "2001:0:c633:6409:0:0:39cc:9bf6"}) {
        EXPECT_FALSE(isInside(outside)) << outside;
    }
}

TEST(DataAddress, isInsideWhereItIsTheOneOutsideInAnyForm) {
    in6_addr external{};
    ASSERT_EQ(inet_pton(AF_INET6, "::ffff:203.0.113.9", &external), 1);
    for (const char* const text : {"::ffff:203.0.113.9", "64:ff9b::cb00:7109", "2002:cb00:7109::"}) {
        in6_addr address{};
        ASSERT_EQ(inet_pton(AF_INET6, text, &address), 1);
        EXPECT_NE(velt_is_inside(&address, &external), 0) << text;
        EXPECT_EQ(velt_is_inside(&address, nullptr), 0) << text;
    }
}

} // namespace
} // namespace velt::test
