#include "base/number_text.h"

#include <gtest/gtest.h>

#include <limits>

namespace velt {
namespace {

TEST(NumberText, IsReadWhole) {
    EXPECT_EQ(parseNumber("0"), 0);
    EXPECT_EQ(parseNumber("-5"), -5);
    EXPECT_EQ(parseNumber("9223372036854775807"), std::numeric_limits<std::int64_t>::max());
    for (const char* text : {"", "-", "+5", " 5", "5 ", "5x", "0x5", "5.0", "9223372036854775808"})
        EXPECT_EQ(parseNumber(text), std::nullopt) << text;
}

TEST(NumberText, SaysWhatIsExpected) {
    EXPECT_EQ(numberText(1, 65535), "a number from 1 to 65535");
    EXPECT_EQ(numberText(1, 1), "1");
}

} // namespace
} // namespace velt
