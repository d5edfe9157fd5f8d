#include "base/plain_text.h"

#include <gtest/gtest.h>

namespace velt {
namespace {

using namespace std::string_literals;

TEST(PlainText, AcceptsTextInAnyScript) {
    for (const char* text : {"", "plain", "Ünïcode", "資料", "\xF0\x9F\x93\x81", "\xED\x9F\xBF",
                             "\xEE\x80\x80", "\xF4\x8F\xBF\xBF", "a b\"c'd\\e;f`g$h%i"}) {
        EXPECT_TRUE(isPlainText(text)) << text;
    }
}

TEST(PlainText, RefusesControlCharactersAndLineEnds) {
    for (const std::string& text : {"a\nb"s, "a\rb"s, "\t"s, "a\0b"s, "\x1b[31m"s, "\x7f"s, "\xC2\x85"s,
                                    "\xE2\x80\xA8"s, "\xE2\x80\xA9"s}) {
        EXPECT_FALSE(isPlainText(text));
    }
}

TEST(PlainText, RefusesWhatIsNoUtf8) {
    for (const std::string& text :
         {"\xff"s, "\x80"s, "\xC3"s, "\xC3("s, "\xE2\x82"s, "\xC0\xAF"s, "\xE0\x80\xAF"s, "\xED\xA0\x80"s,
          "\xED\xBF\xBF"s, "\xF4\x90\x80\x80"s, "\xF8\x88\x80\x80\x80"s}) {
        EXPECT_FALSE(isPlainText(text));
    }
}

TEST(PlainText, ReplacesWhatIsNotPlain) {
    EXPECT_EQ(plainText("a\nb", 100), "a\xEF\xBF\xBD"
                                      "b");
    EXPECT_EQ(plainText("\xff\xC3", 100), "\xEF\xBF\xBD\xEF\xBF\xBD");
    EXPECT_EQ(plainText("Ünï", 100), "Ünï");
}

TEST(PlainText, CutsAfterAWholeCharacterWithinTheLimit) {
    EXPECT_EQ(plainText("abcdef", 6), "abcdef");
    EXPECT_EQ(plainText("abcdefg", 6), "abc…");
    EXPECT_EQ(plainText("äöüß", 6), "ä…");
    EXPECT_EQ(plainText("abcdefg", 3), "…");
    for (std::size_t limit = 3; limit < 40; ++limit) {
        const std::string cut = plainText(std::string(20, '\xff') + "Ü資\xF0\x9F\x93\x81", limit);
        EXPECT_LE(cut.size(), limit);
        EXPECT_TRUE(isPlainText(cut));
    }
}

} // namespace
} // namespace velt
