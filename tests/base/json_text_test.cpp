#include "base/json_text.h"

#include <gtest/gtest.h>

namespace velt {
namespace {

std::string faultOf(const std::string& text) {
    const auto parsed = parseJson(text);
    return parsed ? "none" : parsed.error().message;
}

TEST(JsonText, IsReadStrictly) {
    EXPECT_EQ(parseJson(" 5 "), Json::Value(5));
    EXPECT_EQ(parseJson("{\"a\": [null, \"\\u00fc\"]}")->get("a", {})[1], Json::Value("\xC3\xBC"));
    for (const char* text :
         {"", " ", "{} x", "{'a': 1}", "{\"a\": 1, \"a\": 2}", "{\"a\": 1,}", "// c\n{}", "NaN", "tru"}) {
        EXPECT_TRUE(faultOf(text).starts_with("line 1, column ")) << text << ": " << faultOf(text);
        EXPECT_EQ(faultOf(text).find('\n'), std::string::npos) << text;
    }
}

TEST(JsonText, HasNoComments) {
    for (const char* text : {"/*c*/ {}", "{} //c", "{/*c*/}", "{\"a\" /*c*/: 1}", "{\"a\": /*c*/ 1}",
                             "{\"a\": 1 //c\n}", "[1 /*c*/, 2]", "[1, 2 /*c*/]", "[/*c*/]", "[//c\n1]"}) {
        EXPECT_NE(faultOf(text), "none") << text;
    }
    EXPECT_EQ(faultOf("{\n  \"a\": 1 /*c*/}"), "line 2, column 10: JSON has no comments");
    EXPECT_EQ(parseJson(R"({"/*a*/": "\"//b"})")->get("/*a*/", {}), Json::Value("\"//b"));
}

TEST(JsonText, IsRefusedWithThePlace) {
    EXPECT_EQ(faultOf("{\n  \"a\" 1}"), "line 2, column 7: Missing ':' after object member name");
    EXPECT_EQ(faultOf("{\"a\": tru}"), "line 1, column 7: Syntax error: value, object or array expected");
}

TEST(JsonText, IsNotNestedWithoutEnd) {
    const auto nested = [](std::size_t levels) {
        return std::string(levels, '[') + std::string(levels, ']');
    };
    EXPECT_EQ(faultOf(nested(60)), "none");
    EXPECT_EQ(faultOf(nested(100000)), "line 1, column 1: values are nested more than 64 levels deep");
}

TEST(JsonText, IsWrittenOnOneLineOrIndented) {
    const auto value = parseJson("{\"b\": \"\xC3\xBC\", \"a\": [true]}");
    EXPECT_EQ(jsonText(*value), "{\"a\":[true],\"b\":\"\xC3\xBC\"}");
    EXPECT_EQ(jsonText(*value, "  "), "{\n  \"a\" : \n  [\n    true\n  ],\n  \"b\" : \"\xC3\xBC\"\n}");
}

} // namespace
} // namespace velt
