#include "standalone/shares/share_file.h"

#include "standalone/core/error_number.h"
#include "tests/standalone/support/store_shares.h"
#include "tests/support/result.h"

#include <gtest/gtest.h>

namespace velt {
namespace {

using namespace std::string_literals;
using test::messageOf;

constexpr const char* twoShares = R"({
  "version": 1,
  "shares": [
    {"name": "public", "comment": "For all", "path": "/srv/public", "ftp": true,
     "users": {"ftp": "read", "anna": "write", "bob": "none"}, "groups": {"staff": "write"}},
    {"name": "Bücher", "path": "/srv/books"}
  ]
})";

/// What is wrong with a text that cannot be read, without the name of the file.
std::string flawIn(std::string_view text) {
    const auto shares = parseShares(text);
    EXPECT_FALSE(shares) << text;
    const std::string message = messageOf(shares);
    const std::string start = "/etc/velt/shares.json: ";
    const auto at = message.find(start);
    EXPECT_NE(at, std::string::npos) << message;
    EXPECT_TRUE(message.ends_with(".")) << message;
    return at != std::string::npos ? message.substr(at + start.size(), message.size() - at - start.size() - 1)
                                   : "";
}

std::string withShare(const std::string& share) {
    return R"({"version":1,"shares":[)" + share + "]}";
}

TEST(ShareFile, ReadsEveryField) {
    const auto shares = parseShares(twoShares);
    ASSERT_TRUE(shares) << messageOf(shares);
    ASSERT_EQ(shares->size(), 2U);
    const ShareEntry& first = (*shares)[0];
    EXPECT_EQ(first.name, "public");
    EXPECT_EQ(first.comment, "For all");
    EXPECT_EQ(first.path, "/srv/public");
    EXPECT_TRUE(first.offeredToFtp);
    EXPECT_EQ(first.users, (std::map<std::string, Access>{
                               {"ftp", Access::read}, {"anna", Access::write}, {"bob", Access::none}}));
    EXPECT_EQ(first.groups, (std::map<std::string, Access>{{"staff", Access::write}}));
    const ShareEntry& second = (*shares)[1];
    EXPECT_EQ(second.name, "Bücher");
    EXPECT_EQ(second.comment, "");
    EXPECT_FALSE(second.offeredToFtp);
    EXPECT_TRUE(second.users.empty());
}

TEST(ShareFile, WritesWhatItReads) {
    const auto shares = parseShares(twoShares);
    ASSERT_TRUE(shares);
    const std::string text = test::renderShares(*shares);
    const auto again = parseShares(text);
    ASSERT_TRUE(again) << messageOf(again);
    EXPECT_EQ(test::renderShares(*again), text);
    EXPECT_NE(text.find("Bücher"), std::string::npos) << "a person reads this file";
    EXPECT_EQ((*again)[0].users, (*shares)[0].users);
}

TEST(ShareFile, KeepsOddButAllowedTextAsItIs) {
    for (const std::string& name : {"-rf"s, "a\"b"s, "a\\b"s, "%u"s, "%{env:HOME}"s, "a b"s, ".hidden"s,
                                    "'; --"s, std::string(255, 'x')}) {
        ShareEntry share;
        share.name = name;
        share.comment = "c \"" + name;
        share.path = "/srv/" + name;
        share.users["u" + name.substr(0, 200)] = Access::read;
        ASSERT_TRUE(checkShares({share})) << name;
        const auto read = parseShares(test::renderShares({share}));
        ASSERT_TRUE(read) << messageOf(read);
        EXPECT_EQ((*read)[0].name, share.name);
        EXPECT_EQ((*read)[0].comment, share.comment);
        EXPECT_EQ((*read)[0].path, share.path);
        EXPECT_EQ((*read)[0].users, share.users);
    }
}

TEST(ShareFile, NamesTheFlawOfADamagedText) {
    EXPECT_EQ(flawIn("").substr(0, 32), "invalid JSON: line 1, column 1: ");
    EXPECT_EQ(flawIn("{\"version\":1,\n\"shares\":[}").substr(0, 29), "invalid JSON: line 2, column ");
    EXPECT_EQ(flawIn("[]"), "expected an object");
    EXPECT_EQ(flawIn(R"({"shares":[]})"), "\"version\": expected 1");
    EXPECT_EQ(flawIn(R"({"version":2,"shares":[]})"), "\"version\": expected 1");
    EXPECT_EQ(flawIn(R"({"version":1,"shares":{}})"), "\"shares\": expected a list");
    EXPECT_EQ(flawIn(R"({"version":1})"), "\"shares\": expected a list");
    EXPECT_EQ(flawIn(R"({"version":1,"shares":[],"more":1})"), "unknown key \"more\"");
}

TEST(ShareFile, NamesTheFlawOfADamagedShare) {
    const std::pair<const char*, const char*> cases[] = {
        {"7", "share 1: expected an object"},
        {R"({"path":"/a"})", "share 1, \"name\": expected a string"},
        {R"({"name":"a","path":7})", "share 1, \"path\": expected a string"},
        {R"({"name":"a","path":"/a","pth":"/b"})", "share 1: unknown key \"pth\""},
        {R"({"name":"a","path":"/a","ftp":"yes"})", "share 1, \"ftp\": expected true or false"},
        {R"({"name":"a","path":"/a","users":["ftp"]})", "share 1, \"users\": expected an object"},
        {R"({"name":"a","path":"/a","users":{"ftp":"all"}})",
         "share 1, \"users\": expected \"none\", \"read\" or \"write\" for \"ftp\""},
        {R"({"name":"a","path":"/a"},{"name":"a","path":"/b"})", "share 2: duplicate name \"a\""},
        {R"({"name":"a","path":"/a"},{"name":"b","path":"b"})",
         "share 2, \"path\": expected an absolute path without \"..\", at most 4095 bytes of UTF-8 in one "
         "line"},
        {R"({"name":"a","path":"/a","groups":{"":"read"}})",
         "share 1, \"groups\": \"\" cannot be the name of an account"},
    };
    for (const auto& [share, flaw] : cases) {
        EXPECT_EQ(flawIn(withShare(share)), flaw);
    }
}

TEST(ShareFile, NamesTheShareThatCannotBe) {
    const auto shares =
        checkShares({{"good", "", "/srv/good", false, {}, {}}, {"a/b", "", "/srv/b", false, {}, {}}});
    ASSERT_FALSE(shares);
    EXPECT_EQ(shares.error().number, ErrorNumber::invalid);
    EXPECT_TRUE(messageOf(shares).starts_with("share 2, \"name\": expected 1 to 255 bytes"))
        << messageOf(shares);
    EXPECT_FALSE(checkShares({{"a", "", "/a", false, {}, {}}, {"a", "", "/b", false, {}, {}}}));
}

TEST(ShareFile, IsStrictJson) {
    for (const char* text : {R"({"version":1,"shares":[]} x)", R"(// c
{"version":1,"shares":[]})",
                             R"({"version":1,"version":1,"shares":[]})", R"({"version":1,"shares":[],})",
                             "{'version':1,'shares':[]}"}) {
        EXPECT_NE(flawIn(text).find("invalid JSON: "), std::string::npos) << text;
    }
    EXPECT_FALSE(flawIn(std::string(100'000, '[')).empty());
}

TEST(ShareFile, RefusesNamesThatCannotBeAFolder) {
    for (const std::string& name : {""s, "."s, ".."s, "a/b"s, "/"s, "../x"s, "a\nb"s, "a\0b"s, "\xff"s,
                                    "\x1b[0m"s, std::string(256, 'x')}) {
        ShareEntry share;
        share.name = name;
        share.path = "/srv/x";
        EXPECT_FALSE(checkShares({share})) << name;
    }
}

TEST(ShareFile, RefusesPathsThatAreNotOneAbsoluteFolder) {
    for (const std::string& path : {""s, "srv"s, "./srv"s, "/srv/../etc"s, "/srv/.."s, "/.."s, "/srv\nx"s,
                                    "/srv\0x"s, "/srv/\xff"s, "/" + std::string(4095, 'x')}) {
        ShareEntry share;
        share.name = "a";
        share.path = path;
        EXPECT_FALSE(checkShares({share})) << path;
    }
    ShareEntry allowed;
    allowed.name = "a";
    for (const std::string& path : {"/srv/..x"s, "/srv/a..b/"s, "/"s, "/" + std::string(4094, 'x')}) {
        allowed.path = path;
        EXPECT_TRUE(checkShares({allowed})) << path;
    }
}

TEST(ShareFile, RefusesCommentsAndAccountsThatAreNotOneLine) {
    ShareEntry share;
    share.name = "a";
    share.path = "/a";
    for (const std::string& comment : {"a\nb"s, "\xC3"s, std::string(1025, 'x')}) {
        share.comment = comment;
        EXPECT_FALSE(checkShares({share})) << comment;
    }
    share.comment.clear();
    for (const std::string& account : {""s, "a\nb"s, "\xff"s, std::string(256, 'x')}) {
        ShareEntry other = share;
        other.users[account] = Access::read;
        EXPECT_FALSE(checkShares({other})) << account;
        other = share;
        other.groups[account] = Access::read;
        EXPECT_FALSE(checkShares({other})) << account;
    }
}

} // namespace
} // namespace velt
