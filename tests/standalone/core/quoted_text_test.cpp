#include "standalone/core/quoted_text.h"

#include <gtest/gtest.h>

#include <random>

namespace velt {
namespace {

std::string unquoted(std::string_view quoted) {
    return readQuotedText(quoted).value_or("(refused)");
}

TEST(QuotedText, LeavesReadableTextReadable) {
    EXPECT_EQ(quotedText("My Share, 2nd"), "\"My Share, 2nd\"");
    EXPECT_EQ(quotedText("Öffentlich 共有 😀"), "\"Öffentlich 共有 😀\"");
    EXPECT_EQ(quotedText(""), "\"\"");
    EXPECT_EQ(quotedText("%{env:HOME} ../x -x #x"), "\"%{env:HOME} ../x -x #x\"");
}

TEST(QuotedText, EscapesWhatWouldEndTheTextOrTheLine) {
    EXPECT_EQ(quotedText("a\"b\\c"), R"("a\"b\\c")");
    EXPECT_EQ(quotedText("a\nport = 1\r\t"), R"("a\x0aport = 1\x0d\x09")");
    EXPECT_EQ(quotedText(std::string_view("a\0b\x7f", 4)), R"("a\x00b\x7f")");
}

TEST(QuotedText, EscapesWhatIsNoPrintableUtf8) {
    EXPECT_EQ(quotedText("\xff"), R"("\xff")");
    EXPECT_EQ(quotedText("\xc3"), R"("\xc3")") << "cut off";
    EXPECT_EQ(quotedText("\xc3x"), R"("\xc3x")");
    EXPECT_EQ(quotedText("\xc0\x8a"), R"("\xc0\x8a")") << "an over-long line end";
    EXPECT_EQ(quotedText("\xe0\x80\x8a"), R"("\xe0\x80\x8a")");
    EXPECT_EQ(quotedText("\xed\xa0\x80"), R"("\xed\xa0\x80")") << "a surrogate";
    EXPECT_EQ(quotedText("\xf4\x90\x80\x80"), R"("\xf4\x90\x80\x80")") << "above U+10FFFF";
    EXPECT_EQ(quotedText("\xc2\x9b"), R"("\xc2\x9b")") << "a terminal's control sequence";
    EXPECT_EQ(quotedText("\xc2\xa0"), "\"\xc2\xa0\"");
}

TEST(QuotedText, ComesBackWhateverItWas) {
    std::mt19937 random(20261121);
    std::uniform_int_distribution<int> byte(0, 255);
    for (int i = 0; i < 2000; ++i) {
        std::string text(static_cast<std::size_t>(i % 60), '\0');
        for (char& c : text)
            c = static_cast<char>(byte(random));
        const std::string quoted = quotedText(text);
        EXPECT_EQ(quoted.find_first_of(std::string_view("\n\r\0", 3)), std::string::npos);
        ASSERT_EQ(unquoted(quoted), text);
    }
}

TEST(QuotedText, RefusesAnyOtherForm) {
    for (const char* text : {"", "\"", "plain", "\"open", "open\"", "\"a\"b\"", R"("a\")", R"("\n")",
                             R"("\x1")", R"("\xG0")", R"("\x0G")", R"("\xAB")"})
        EXPECT_EQ(unquoted(text), "(refused)") << text;
}

} // namespace
} // namespace velt
