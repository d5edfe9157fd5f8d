#include "base/text.h"

#include <gtest/gtest.h>

namespace velt {
namespace {

TEST(Text, IsTrimmedAtItsEnds) {
    EXPECT_EQ(trimmed(" \t a b\r "), "a b");
    EXPECT_EQ(trimmed("a"), "a");
    EXPECT_EQ(trimmed(" \t"), "");
    EXPECT_EQ(trimmed(""), "");
    EXPECT_EQ(trimmedEnd(" a.b. .", ". "), " a.b");
    EXPECT_EQ(trimmedEnd("...", "."), "");
    EXPECT_EQ(trimmedEnd("", "."), "");
}

TEST(Text, HasASmallForm) {
    EXPECT_EQ(lowerCase("AbZ @[`{ 09\xC3\x84"), "abz @[`{ 09\xC3\x84");
    EXPECT_EQ(lowerCase(""), "");
}

TEST(Text, ShowsBytesInHexadecimal) {
    EXPECT_EQ(hexadecimal(std::string_view("\0\x0a\xff", 3)), "000aff");
    EXPECT_EQ(hexadecimal(""), "");
}

TEST(Text, IsCutAtASeparator) {
    std::string_view rest = "a,,b";
    EXPECT_EQ(cut(rest, ','), "a");
    EXPECT_EQ(rest, ",b");
    EXPECT_EQ(cut(rest, ','), "");
    EXPECT_EQ(cut(rest, ','), "b");
    EXPECT_EQ(rest, "");
    EXPECT_EQ(cut(rest, ','), "");
}

} // namespace
} // namespace velt
