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
              "\\xc2A\\xc2");
    EXPECT_EQ(printable("\xC2\x1b["), "\\xc2\\x1b[");
    EXPECT_EQ(printable("a\x9b"
                        "31m"),
              "a\\x9b31m")
        << "which a terminal without UTF-8 would obey";
}

TEST(Printable, NothingTurnsOrBreaksTheLine) {
    // In pieces: they would turn this line, too.
    const std::string begin = "\xE2\x80";
    const std::string turn = begin + '\xAE';
    const std::string isolate = std::string("\xE2\x81") + '\xA6';
    EXPECT_EQ(printable("a" + turn + "b" + isolate + "c" + begin + '\xA8'), "a\\u202eb\\u2066c\\u2028");
    EXPECT_EQ(printable("\xE2\x80\x94 \xE2\x80\xA6"), "\xE2\x80\x94 \xE2\x80\xA6");
    EXPECT_EQ(printableJson("\"" + turn + "\""), "\"\\u202e\"");
}

TEST(Printable, JsonStaysJson) {
    EXPECT_EQ(printableJson("\"a\\n\x7f\xC2\x9B\xC2\xA0\"\n"), "\"a\\n\\u007f\\u009b\xC2\xA0\"\n");
}

} // namespace
} // namespace velt
