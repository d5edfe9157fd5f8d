#include "base/json_text.h"
#include "cli/http_client.h"
#include "cli/json_io.h"
#include "cli/size_text.h"
#include "cli/text_table.h"
#include "cli/time_text.h"

#include <gtest/gtest.h>

#include <sstream>

using namespace velt::cli;
using velt::parseJson;

TEST(TextTest, ControlCharactersAreEscapedInJson) {
    const std::string text = "a\x1b\x7f\xC2\x9B\xC2\xA0";
    EXPECT_EQ(compactJson(text), "\"a\\u001b\\u007f\\u009b\xC2\xA0\"");
    EXPECT_EQ(parseJson(compactJson(text)), Json::Value(text));
    std::ostringstream out;
    writeJson(out, text);
    EXPECT_EQ(out.str(), compactJson(text) + "\n");
}

TEST(TextTest, ColumnsAreAlignedByCharacters) {
    Table table({"A", "B"});
    table.add({"\xC3\xBC\xC3\xBC\xC3\xBC", "1"});
    table.add({"x", ""});
    std::ostringstream out;
    table.write(out);
    EXPECT_EQ(out.str(), "A    B\n\xC3\xBC\xC3\xBC\xC3\xBC  1\nx\n");
}

TEST(TextTest, PathsAreEncoded) {
    EXPECT_EQ(percentEncode("A.b-c_d~9"), "A.b-c_d~9");
    EXPECT_EQ(percentEncode("/ ?&=%+\xC3\xBC"), "%2F%20%3F%26%3D%25%2B%C3%BC");
}

TEST(TextTest, AgesAreTakenFromNow) {
    EXPECT_EQ(parseSince("30s", 100), "1970-01-01T00:01:10Z");
    EXPECT_EQ(parseSince("1m", 100), "1970-01-01T00:00:40Z");
    EXPECT_EQ(parseSince("2h", 7200), "1970-01-01T00:00:00Z");
    EXPECT_EQ(parseSince("1d", 86401), "1970-01-01T00:00:01Z");
    EXPECT_EQ(parseSince("2026-11-21", 0), "2026-11-21");
    EXPECT_EQ(parseSince("", 0), std::nullopt);
    EXPECT_EQ(parseSince("1.5h", 0), std::nullopt);
    EXPECT_EQ(parseSince("99999999999d", 0), std::nullopt);
}

TEST(TextTest, DurationsHaveTwoUnits) {
    EXPECT_EQ(durationText(8), "8 s");
    EXPECT_EQ(durationText(63), "1 min 3 s");
    EXPECT_EQ(durationText(3600 * 5 + 60 * 10 + 1), "5 h 10 min");
    EXPECT_EQ(durationText(259200), "3 d 0 h");
}

TEST(TextTest, SizesHaveTwoDigits) {
    EXPECT_EQ(sizeText(0), "0 B");
    EXPECT_EQ(sizeText(999), "999 B");
    EXPECT_EQ(sizeText(1000), "1.0 KB");
    EXPECT_EQ(sizeText(1999), "1.9 KB");
    EXPECT_EQ(sizeText(9'999'999), "9.9 MB");
    EXPECT_EQ(sizeText(25'700'000), "25 MB");
    EXPECT_EQ(sizeText(999'999'999), "999 MB");
    EXPECT_EQ(sizeText(1'500'000'000'000), "1.5 TB");
    EXPECT_EQ(sizeText(UINT64_MAX), "18 EB");
}

TEST(TextTest, ValuesAreShownForPeople) {
    EXPECT_EQ(displayValue(true), "on");
    EXPECT_EQ(displayValue(-3), "-3");
    EXPECT_EQ(displayValue("\xC3\xBC"), "\xC3\xBC");
    EXPECT_EQ(displayValue(Json::Value()), "");
    Json::Value array(Json::arrayValue);
    array.append("\xC3\xBC");
    EXPECT_EQ(displayValue(array), "[\"\xC3\xBC\"]");
}

TEST(TextTest, JsonIsReadStrictly) {
    EXPECT_TRUE(parseJson("5"));
    for (const char* text :
         {"", "{} x", "{'a': 1}", "{\"a\": 1, \"a\": 2}", "{\"a\": 1,}", "// c\n{}", "NaN"}) {
        const auto parsed = parseJson(text);
        ASSERT_FALSE(parsed) << text;
        const std::string& reason = parsed.error().message;
        EXPECT_EQ(reason.rfind("line ", 0), 0U) << reason;
        EXPECT_EQ(reason.find('\n'), std::string::npos) << reason;
    }
    const auto parsed = parseJson("{\n  \"a\" 1}");
    ASSERT_FALSE(parsed);
    EXPECT_EQ(parsed.error().message, "line 2, column 7: Missing ':' after object member name");
}
