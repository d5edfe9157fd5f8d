#include "standalone/core/strict_file.h"

#include "standalone/core/error_number.h"
#include "tests/standalone/support/state_folder.h"

#include <gtest/gtest.h>

namespace velt {
namespace {

struct Seen {
    std::int64_t number = -1;
    bool on = false;
    std::string text;
    std::string problem;
};

// A file of version 1 has the keys number and on; version 2 brought text. The key free may be left out of
// any.
Seen read(const std::string& contents, FileVersions versions = {2, true}) {
    Result<StrictFile> file = StrictFile::parse("x.conf", contents, versions);
    Seen seen;
    if (!file) {
        seen.problem = file.error().message;
        return seen;
    }
    seen.number = file->number("number", 1, 10, 5);
    seen.on = file->boolean("on", true);
    seen.text = file->text("text", 6, "none", 2);
    file->value("free", optionalKey);
    if (const Result<> done = file->finish(); !done)
        seen.problem = done.error().message;
    return seen;
}

TEST(StrictFile, IsReadAsWritten) {
    const Seen seen =
        read("# mine\n\nversion = 2\n number=7\t# seven\r\non =0\ntext = \"a # b\" # \"c\"\nfree = x y");
    EXPECT_EQ(seen.problem, "");
    EXPECT_EQ(seen.number, 7);
    EXPECT_FALSE(seen.on);
    EXPECT_EQ(seen.text, "a # b");
}

TEST(StrictFile, AKeyThatCameLaterHasItsDefaultInAnOlderFile) {
    const Seen seen = read("version = 1\nnumber = 7\non = 1\n");
    EXPECT_EQ(seen.problem, "");
    EXPECT_EQ(seen.text, "none");
    EXPECT_EQ(read("version = 1\nnumber = 7\non = 1\ntext = \"some\"\n").text, "some") << "added by hand";
    EXPECT_EQ(read("version = 2\nnumber = 7\non = 1\n").problem, "Cannot read x.conf: missing key \"text\".");
}

TEST(StrictFile, SaysWhatIsWrongAndWhere) {
    const std::pair<const char*, const char*> cases[] = {
        {"number 7", ", line 2: expected \"key = value\""},
        {"= 7", ", line 2: expected \"key = value\""},
        {"on = 1", ": missing key \"number\""},
        {"number = 7\nnumber = 7\non = 1", ", line 3: duplicate key \"number\""},
        {"number = 7\non = 1\ncolour = red", ", line 4: unknown key \"colour\""},
        {"number = 7\non = 1\n\x1b[m = red", ", line 4: unknown key \"\\x1b[m\""},
        {"number = 0\non = 1", ", line 2: number: expected a number from 1 to 10"},
        {"number = 11\non = 1", ", line 2: number: expected a number from 1 to 10"},
        {"number = 7x\non = 1", ", line 2: number: expected a number from 1 to 10"},
        {"number =\non = 1", ", line 2: number: expected a number from 1 to 10"},
        {"number = +7\non = 1", ", line 2: number: expected a number from 1 to 10"},
        {"number = 99999999999999999999\non = 1", ", line 2: number: expected a number from 1 to 10"},
        {"number = 7\non = yes", ", line 3: on: expected 0 or 1"},
        {"number = 7\non = 2", ", line 3: on: expected 0 or 1"},
        {"number = 7\non = 1\ntext = some", ", line 4: text: expected a text in double quotes"},
        {"number = 7\non = 1\ntext = \"1234567\"", ", line 4: text: expected at most 6 bytes"},
        {"number = x\non = x", ", line 2: number: expected a number from 1 to 10"},
    };
    for (const auto& [lines, problem] : cases)
        EXPECT_EQ(read(std::string("version = 1\n") + lines).problem,
                  std::string("Cannot read x.conf") + problem + ".");
}

TEST(StrictFile, HasAVersionThatTheReaderKnows) {
    const std::string rest = "number = 7\non = 1\ntext = \"\"\n";
    EXPECT_EQ(read(rest).problem, "Cannot read x.conf: missing key \"version\".");
    EXPECT_EQ(read(rest, {2, false}).problem, "");
    EXPECT_EQ(read(rest, {2, false}).text, "");
    for (const char* version : {"0", "-1", "", "one", "1.0"})
        EXPECT_EQ(read("version = " + std::string(version) + "\n" + rest).problem,
                  "Cannot read x.conf, line 1: version: expected a number from 1 to 2.");
    EXPECT_EQ(read("version = 0\n" + rest, {1, false}).problem,
              "Cannot read x.conf, line 1: version: expected 1.");
    EXPECT_EQ(read("a line of that version\nversion = 3\n").problem,
              "Cannot read x.conf, line 2: version 3 is newer than this program, which knows files up to "
              "version 2.");
}

TEST(StrictFile, AReaderMayRefuseAValueItself) {
    Result<StrictFile> file = StrictFile::parse("x.conf", "version = 1\nmode = maybe\n");
    ASSERT_TRUE(file);
    EXPECT_EQ(file->value("mode"), "maybe");
    file->refuse("mode", "off, accept or drop");
    const Result<> done = file->finish();
    ASSERT_FALSE(done);
    EXPECT_EQ(done.error().number, ErrorNumber::damaged);
    EXPECT_EQ(done.error().message, "Cannot read x.conf, line 2: mode: expected off, accept or drop.");
}

TEST(StrictFile, OneThatDoesNotExistHasTheDefaults) {
    const test::StateFolder folder;
    Result<StrictFile> file = StrictFile::load(folder.path() / "none.conf");
    ASSERT_TRUE(file) << file.error().message;
    EXPECT_EQ(file->number("number", 1, 10, 5), 5);
    EXPECT_TRUE(file->boolean("on", true));
    EXPECT_EQ(file->text("text", 6, "none"), "none");
    EXPECT_FALSE(file->value("free"));
    EXPECT_TRUE(file->finish());
}

TEST(StrictFile, IsLoadedFromItsPath) {
    test::StateFolder folder;
    folder.write("some.conf", "version = 1\nnumber = 7\n");
    Result<StrictFile> file = StrictFile::load(folder.path() / "some.conf");
    ASSERT_TRUE(file) << file.error().message;
    EXPECT_EQ(file->number("number", 1, 10, 5), 7);

    std::filesystem::create_directories(folder.path() / "folder.conf");
    const Result<StrictFile> unreadable = StrictFile::load(folder.path() / "folder.conf");
    ASSERT_FALSE(unreadable);
    EXPECT_EQ(unreadable.error().message,
              "Cannot read " + (folder.path() / "folder.conf").string() + ": Is a directory.");
}

} // namespace
} // namespace velt
