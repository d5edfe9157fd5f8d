#include "base/ipv4.h"

#include <gtest/gtest.h>

namespace velt {
namespace {

TEST(IPv4, IsFourDecimalNumbers) {
    EXPECT_EQ(parseIPv4("192.0.2.1"), (IPv4Address{192, 0, 2, 1}));
    EXPECT_EQ(toText({192, 0, 2, 1}), "192.0.2.1");
    for (const std::string text : {"0.0.0.0", "255.255.255.255", "10.0.0.7"})
        EXPECT_EQ(toText(parseIPv4(text).value()), text);
    for (const char* text : {"", "eth0", "999.1.1.1", "1.2.3", "1.2.3.4.5", "1.2.3.4 ", " 1.2.3.4", "::1",
                             "01.2.3.4", "1.2.3.4\n", "0x7f.1.1.1", "-1.2.3.4"})
        EXPECT_FALSE(parseIPv4(text)) << text;
    EXPECT_FALSE(parseIPv4(std::string_view("1.2.3.4\0x", 9)));
}

} // namespace
} // namespace velt
