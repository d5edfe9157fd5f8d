#include "base/ip_network.h"

#include <gtest/gtest.h>

#include <string>

namespace velt {
namespace {

/// The network as text again; "" for none.
std::string read(std::string_view text) {
    const auto network = parseIpNetwork(text);
    return network ? toText(*network) : "";
}

TEST(IpNetwork, IsReadAndWritten) {
    EXPECT_EQ(read("192.0.2.1"), "192.0.2.1");
    EXPECT_EQ(read("192.0.2.1/32"), "192.0.2.1");
    EXPECT_EQ(read("192.0.2.0/24"), "192.0.2.0/24");
    EXPECT_EQ(read("0.0.0.0/0"), "0.0.0.0/0");
    EXPECT_EQ(read("2001:DB8::1"), "2001:db8::1");
    EXPECT_EQ(read("2001:db8::/32"), "2001:db8::/32");
    EXPECT_EQ(read("::/0"), "::/0");
    EXPECT_EQ(read("::ffff:192.0.2.1"), "192.0.2.1");
    EXPECT_EQ(read("fe80::1%eth0"), "fe80::1");
}

TEST(IpNetwork, IsNothingElse) {
    for (const char* text :
         {"", " ", "192.0.2", "192.0.2.1 ", " 192.0.2.1", "192.0.2.256", "192.0.2.1/33", "192.0.2.1/24",
          "192.0.2.0/", "192.0.2.0/-1", "192.0.2.0/24/1", "2001:db8::/129", "2001:db8::1/32", "host",
          "2001:db8::1%eth0", "fe80::1%eth0 x/64", "1.2.3.4%eth0"}) {
        EXPECT_EQ(read(text), "") << text;
    }
    EXPECT_FALSE(parseIpAddress(std::string_view("192.0.2.1\0x", 11)));
    EXPECT_FALSE(parseIpAddress("192.0.2.0/24"));
}

TEST(IpNetwork, ContainsWhatBeginsWithItsBits) {
    const auto contains = [](const char* outer, const char* inner) {
        return parseIpNetwork(outer)->contains(*parseIpNetwork(inner));
    };
    EXPECT_TRUE(contains("192.0.2.0/24", "192.0.2.255"));
    EXPECT_TRUE(contains("192.0.2.0/25", "192.0.2.0/26"));
    EXPECT_FALSE(contains("192.0.2.0/25", "192.0.2.128"));
    EXPECT_FALSE(contains("192.0.2.0/25", "192.0.2.0/24"));
    EXPECT_TRUE(contains("192.0.2.1", "192.0.2.1"));
    EXPECT_FALSE(contains("192.0.2.1", "192.0.2.0"));
    EXPECT_TRUE(contains("0.0.0.0/0", "203.0.113.9"));
    EXPECT_TRUE(contains("2001:db8::/33", "2001:db8:7fff::1"));
    EXPECT_FALSE(contains("2001:db8::/33", "2001:db8:8000::1"));
    EXPECT_FALSE(contains("::/0", "192.0.2.1")) << "of the other family";
}

TEST(IpNetwork, IsWidenedToItsFirstBits) {
    EXPECT_EQ(toText(widened(*parseIpAddress("2001:db8:1:2:3:4:5:6"), 64)), "2001:db8:1:2::/64");
    EXPECT_EQ(toText(widened(*parseIpAddress("2001:db8::ffff"), 113)), "2001:db8::8000/113");
    EXPECT_EQ(toText(widened(*parseIpNetwork("2001:db8::/32"), 64)), "2001:db8::/32");
}

} // namespace
} // namespace velt
