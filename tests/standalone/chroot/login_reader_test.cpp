// How the FTP daemon's module reads what the platform writes.
#include "standalone/chroot/rule_store.h"
#include "tests/standalone/support/temporary_folder.h"

#include <gtest/gtest.h>

extern "C" {
#include "standalone/mod_velt_chroot/rules.h"
}

#include <sys/stat.h>

#include <vector>

namespace velt::test {
namespace {

TEST(LoginReader, agreesWithTheStoreOnEveryRule) {
    for (const ChrootRule& rule :
         {ChrootRule{true, 1000, "/home"}, ChrootRule{false, 100, "/a b/c:d"},
          ChrootRule{true, 4294967294U, "/x/..."}, ChrootRule{false, 0, "/\xc3\xa4/\xff"}}) {
        const std::string line = formatRule(rule);
        velt_rule parsed{};
        ASSERT_EQ(velt_rule_parse(line.c_str(), &parsed), 0) << line;
        EXPECT_EQ(parsed.is_user != 0, rule.isUser);
        EXPECT_EQ(parsed.id, rule.id);
        EXPECT_EQ(parsed.path, rule.path);
    }
    for (const char* line : {"", "u", "u:", "u:1", "u:1:", "u:1:/", "u:1:home", "x:1:/home", "u:-1:/home",
                             "u: 1:/home", "u:4294967295:/home", "u:99999999999999999999:/home",
                             "u:1:/a/../b", "u:1:/a//b", "u:1:/./b", "u:1:/a/", "u:1x:/home"}) {
        velt_rule parsed{};
        EXPECT_LT(velt_rule_parse(line, &parsed), 0) << line;
    }
}

class LoginReaderFile : public testing::Test {
protected:
    // The lines after the header; the last one is "(damaged)" where reading fails, the only one where opening
    // does.
    std::vector<std::string> read(const std::string& contents) {
        const auto file = folder_.write("file", contents);
        chmod(file.c_str(), 0600);
        return readAsItIs(file);
    }
    static std::vector<std::string> readAsItIs(const std::filesystem::path& file) {
        std::vector<std::string> found;
        velt_lines lines{};
        if (velt_lines_open(&lines, file.c_str(), "header 1") < 0) {
            return {"(damaged)"};
        }
        int status = 0;
        while ((status = velt_lines_next(&lines)) > 0) {
            found.emplace_back(lines.text);
        }
        velt_lines_close(&lines);
        if (status < 0) {
            found.emplace_back("(damaged)");
        }
        return found;
    }

    using Lines = std::vector<std::string>;
    const Lines damaged_ = {"(damaged)"};
    TemporaryFolder folder_;
};

TEST_F(LoginReaderFile, givesTheLinesAfterTheHeader) {
    EXPECT_EQ(read("header 1\n"), Lines());
    EXPECT_EQ(read("header 1\na\nb c\n"), (Lines{"a", "b c"}));
}

TEST_F(LoginReaderFile, tellsAFileThatIsNotWhole) {
    EXPECT_EQ(read(""), damaged_);
    EXPECT_EQ(read("header 2\n"), damaged_);
    EXPECT_EQ(read("header 1"), damaged_);
    EXPECT_EQ(read("header 1\na"), damaged_);
    EXPECT_EQ(read(std::string("header 1\na\0b\n", 13)), damaged_);
    EXPECT_EQ(read("header 1\n" + std::string(8192, 'a') + "\n"), damaged_);
    EXPECT_EQ(read("header 1\n" + std::string(8191, 'a') + "\n"), Lines{std::string(8191, 'a')});
    EXPECT_EQ(readAsItIs(folder_.path() / "absent"), damaged_);
    EXPECT_EQ(readAsItIs(folder_.path()), damaged_);
}

TEST_F(LoginReaderFile, trustsNoFileThatOthersMayWriteAndNoLink) {
    const auto file = folder_.write("file", "header 1\n");
    chmod(file.c_str(), 0620);
    EXPECT_EQ(readAsItIs(file), damaged_);
    chmod(file.c_str(), 0602);
    EXPECT_EQ(readAsItIs(file), damaged_);
    chmod(file.c_str(), 0644);
    EXPECT_EQ(readAsItIs(file), Lines());
    std::filesystem::create_symlink(file, folder_.path() / "link");
    EXPECT_EQ(readAsItIs(folder_.path() / "link"), damaged_);
}

} // namespace
} // namespace velt::test
