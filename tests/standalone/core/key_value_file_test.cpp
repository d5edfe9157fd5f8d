#include "standalone/core/key_value_file.h"

#include "platform/core.h"
#include "standalone/contract/last_error.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/result.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <array>

namespace velt {
namespace {

class KeyValueFile : public ::testing::Test {
protected:
    test::StateFolder root_;
    std::filesystem::path file_ = root_.path() / "etc" / "info.conf";

    std::string read(const char* key, int size = 64) const {
        std::array<char, 64> buffer{};
        buffer.fill('?');
        const int result = VLIBCFileGetKeyValue("/etc/info.conf", key, buffer.data(), size, 0);
        if (result <= 0)
            return result == 0 ? "(absent)" : "(failed)";
        return buffer.data();
    }
    std::string contents() const { return root_.read("etc/info.conf"); }
};

TEST_F(KeyValueFile, AMissingFileHasNoKeys) {
    EXPECT_EQ(read("ftp_ext_ip"), "(absent)");
}

TEST_F(KeyValueFile, ReadsTheFormsThatPeopleWrite) {
    root_.write("etc/info.conf",
                "# key=comment\n\nplain=one\n  spaced  =  two words \nquoted=\" three \"\r\nempty=\n"
                "equals=a=b#c\nno line of ours\ntwice=1\ntwice=2\nlast=end");
    EXPECT_EQ(read("plain"), "one");
    EXPECT_EQ(read("spaced"), "two words");
    EXPECT_EQ(read("quoted"), " three ");
    EXPECT_EQ(read("empty"), "");
    EXPECT_EQ(read("equals"), "a=b#c");
    EXPECT_EQ(read("twice"), "2");
    EXPECT_EQ(read("last"), "end");
    EXPECT_EQ(read("key"), "(absent)");
    EXPECT_EQ(read("Plain"), "(absent)");
}

TEST_F(KeyValueFile, CutsAValueToTheBuffer) {
    root_.write("etc/info.conf", "key=0123456789abcdef\n");
    EXPECT_EQ(read("key", 16), "0123456789abcde");
    EXPECT_EQ(read("key", 17), "0123456789abcdef");
    EXPECT_EQ(read("key", 1), "");
}

TEST_F(KeyValueFile, RefusesACallWithoutRoom) {
    std::array<char, 4> buffer{};
    EXPECT_LT(VLIBCFileGetKeyValue("/etc/info.conf", "key", buffer.data(), 0, 0), 0);
    EXPECT_LT(VLIBCFileGetKeyValue("/etc/info.conf", "key", nullptr, 4, 0), 0);
    EXPECT_LT(VLIBCFileGetKeyValue(nullptr, "key", buffer.data(), 4, 0), 0);
    EXPECT_LT(VLIBCFileGetKeyValue("/etc/info.conf", nullptr, buffer.data(), 4, 0), 0);
}

TEST_F(KeyValueFile, AnUnreadableFileIsAFailure) {
    std::filesystem::create_directories(file_);
    EXPECT_EQ(read("key"), "(failed)");
    EXPECT_EQ(lastErrorSentence(), "Cannot read " + file_.string() + ": Is a directory.");
}

TEST_F(KeyValueFile, DoesNotLeaveTheStateRoot) {
    std::array<char, 8> buffer{};
    root_.write("etc/info.conf", "key=inside\n");
    EXPECT_GT(VLIBCFileGetKeyValue("/../../../etc/info.conf", "key", buffer.data(), 8, 0), 0);
    EXPECT_STREQ(buffer.data(), "inside");
}

TEST_F(KeyValueFile, AWriteLeavesAllElseAsItStands) {
    const std::string before = "# Comment with key=old\n\n unknown = 1\nkey = old\n[section]\r\ntail=x";
    root_.write("etc/info.conf", before);
    ASSERT_TRUE(writeKeyValue(file_, "key", "new"));
    EXPECT_EQ(contents(), "# Comment with key=old\n\n unknown = 1\nkey=new\n[section]\r\ntail=x");
    ASSERT_TRUE(writeKeyValue(file_, "added", "y"));
    EXPECT_EQ(contents(), "# Comment with key=old\n\n unknown = 1\nkey=new\n[section]\r\ntail=x\nadded=y\n");
}

TEST_F(KeyValueFile, AWriteKeepsTheMode) {
    root_.write("etc/info.conf", "key=old\n");
    ASSERT_EQ(::chmod(file_.c_str(), 0600), 0);
    ASSERT_TRUE(writeKeyValue(file_, "key", "new"));
    struct stat status {};
    ASSERT_EQ(::stat(file_.c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 0777, 0600U);
}

TEST_F(KeyValueFile, WhatIsWrittenIsRead) {
    for (const char* value : {"", "plain", " blanks around ", "\"quoted\"", "\"", "\"\"", "#hash", "a=b",
                              "-x", "../x", "%{env:HOME}", "$(id)", "\\", "\xc3\xa9", "\xff\xfe"}) {
        ASSERT_TRUE(writeKeyValue(file_, "key", value)) << value;
        EXPECT_EQ(read("key"), value);
    }
}

TEST_F(KeyValueFile, RefusesAValueThatWouldNotStayInItsLine) {
    ASSERT_TRUE(writeKeyValue(file_, "key", "old"));
    for (const std::string value : {"a\nother=1", "a\rb", "a\tb", "\x01", "\x7f"}) {
        EXPECT_EQ(test::messageOf(writeKeyValue(file_, "key", value)),
                  "The value of key contains a line break or control character.");
    }
    EXPECT_FALSE(writeKeyValue(file_, "key", std::string_view("a\0b", 3)));
    EXPECT_EQ(test::messageOf(writeKeyValue(file_, "key", std::string(4097, 'x'))),
              "The value of key is longer than 4096 bytes.");
    EXPECT_EQ(contents(), "key=old\n");
}

TEST_F(KeyValueFile, RefusesAKeyThatIsNone) {
    for (const char* key : {"", "a b", "a=b", "#a", "a\n", "\"a\"", "[a]", "\xc3\xa9"}) {
        EXPECT_EQ(test::messageOf(writeKeyValue(file_, key, "x")),
                  "Expected a key of letters, digits, \"_\", \"-\" and \".\".")
            << key;
    }
    EXPECT_FALSE(std::filesystem::exists(file_));
}

} // namespace
} // namespace velt
