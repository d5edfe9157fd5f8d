
#include "base/file.h"
#include "tests/support/result.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <thread>
#include <vector>

namespace velt {
namespace {

using test::messageOf;

class File : public ::testing::Test {
protected:
    test::TemporaryFolder folder_;

    std::vector<std::string> names() const {
        std::vector<std::string> found;
        for (const auto& entry : std::filesystem::directory_iterator(folder_.path()))
            found.push_back(entry.path().filename());
        return found;
    }
};

TEST_F(File, WritesAndReadsAnyBytes) {
    const std::string contents("a\0b\n\xff", 5);
    ASSERT_TRUE(replaceFile(folder_.path() / "file", contents, 0640));

    EXPECT_EQ(readFile(folder_.path() / "file"), contents);
    struct stat status {};
    ASSERT_EQ(::stat((folder_.path() / "file").c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777, 0640U);
    EXPECT_EQ(names(), std::vector<std::string>{"file"});
}

TEST_F(File, ReplacesAndShortens) {
    ASSERT_TRUE(replaceFile(folder_.path() / "file", "something long", 0644));
    ASSERT_TRUE(replaceFile(folder_.path() / "file", "short", 0644));
    EXPECT_EQ(readFile(folder_.path() / "file"), "short");
}

TEST_F(File, MakesTheFolders) {
    ASSERT_TRUE(replaceFile(folder_.path() / "a" / "b" / "file", "x", 0644));
    EXPECT_EQ(readFile(folder_.path() / "a" / "b" / "file"), "x");
}

TEST_F(File, TakesUpWhatACrashLeftBehind) {
    folder_.write(".file.new", "half of a longer contents");
    ASSERT_TRUE(replaceFile(folder_.path() / "file", "whole", 0644));

    EXPECT_EQ(readFile(folder_.path() / "file"), "whole");
    EXPECT_EQ(names(), std::vector<std::string>{"file"});
}

TEST_F(File, DoesNotFollowALinkInThePlaceOfTheTemporaryFile) {
    folder_.write("victim", "precious");
    std::filesystem::create_symlink(folder_.path() / "victim", folder_.path() / ".file.new");

    EXPECT_FALSE(replaceFile(folder_.path() / "file", "x", 0644));
    EXPECT_EQ(readFile(folder_.path() / "victim"), "precious");
}

TEST_F(File, SaysWhyAFolderCannotBeMade) {
    folder_.write("plain", "");
    EXPECT_EQ(messageOf(replaceFile(folder_.path() / "plain" / "folder" / "file", "x", 0644)),
              "Cannot make the folder " + (folder_.path() / "plain/folder").string() + ": Not a directory.");
}

TEST_F(File, SaysWhyAFileCannotBeReplaced) {
    std::filesystem::create_directories(folder_.path() / "file" / "below");
    EXPECT_EQ(messageOf(replaceFile(folder_.path() / "file", "x", 0644)),
              "Cannot replace " + (folder_.path() / "file").string() + ": Is a directory.");
    EXPECT_EQ(names(), std::vector<std::string>{"file"});
}

TEST_F(File, TellsAMissingFileFromAnUnreadableOne) {
    const auto absent = readOptionalFile(folder_.path() / "none");
    ASSERT_TRUE(absent);
    EXPECT_EQ(*absent, std::nullopt);
    EXPECT_EQ(messageOf(readFile(folder_.path() / "none")),
              "Cannot read " + (folder_.path() / "none").string() + ": No such file or directory.");
    const std::string isFolder = "Cannot read " + folder_.path().string() + ": Is a directory.";
    EXPECT_EQ(messageOf(readOptionalFile(folder_.path())), isFolder);
    EXPECT_EQ(messageOf(readFile(folder_.path())), isFolder);
}

TEST_F(File, WritersAtOnceLeaveOneOfTheirContentsWhole) {
    const auto path = folder_.path() / "file";
    std::vector<std::thread> writers;
    for (const char letter : {'a', 'b', 'c', 'd'})
        writers.emplace_back([&path, letter] {
            for (int i = 0; i < 25; ++i)
                EXPECT_TRUE(replaceFile(path, std::string(100'000, letter), 0644));
        });
    for (auto& writer : writers)
        writer.join();

    const auto contents = readFile(path);
    ASSERT_TRUE(contents);
    ASSERT_EQ(contents->size(), 100'000U);
    EXPECT_EQ(contents->find_first_not_of(contents->front()), std::string::npos);
    EXPECT_EQ(names(), std::vector<std::string>{"file"});
}

} // namespace
} // namespace velt
