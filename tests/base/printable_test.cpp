#include "base/printable.h"

#include <gtest/gtest.h>

namespace velt {
namespace {

TEST(Printable, ControlCharactersCannotReachATerminal) {
    EXPECT_EQ(printable("plain \xC3\xBC"), "plain \xC3\xBC");
    EXPECT_EQ(printable(std::string("a\x1b]0;x\x07\0b\x7f", 10)), "a\\x1b]0;x\\x07\\x00b\\x7f");
    EXPECT_EQ(printable("\xC2\x9B"
                        "31m"),
              "\\x9b31m");
    EXPECT_EQ(printable("\xC2\xA0"), "\xC2\xA0");
}

TEST(Printable, HalfACharacterTakesNoOtherAlong) {
    EXPECT_EQ(printable("\xC2"
                        "A\xC2"),
              "\xC2"
              "A\xC2");
    EXPECT_EQ(printable("\xC2\x1b["), "\xC2\\x1b[");
}

TEST(Printable, JsonStaysJson) {
    EXPECT_EQ(printableJson("\"a\\n\x7f\xC2\x9B\xC2\xA0\"\n"), "\"a\\n\\u007f\\u009b\xC2\xA0\"\n");
}

} // namespace
} // namespace velt
