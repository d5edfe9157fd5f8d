#include "standalone/core/file_store.h"

#include "standalone/core/last_error.h"
#include "tests/standalone/support/temporary_folder.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cerrno>
#include <thread>
#include <vector>

namespace velt {
namespace {

class FileStore : public ::testing::Test {
protected:
    test::TemporaryFolder folder_;

    std::vector<std::string> names() const {
        std::vector<std::string> found;
        for (const auto& entry : std::filesystem::directory_iterator(folder_.path()))
            found.push_back(entry.path().filename());
        return found;
    }
};

TEST_F(FileStore, WritesAndReadsAnyBytes) {
    const std::string contents("a\0b\n\xff", 5);
    ASSERT_EQ(replaceFile(folder_.path() / "file", contents, 0640), 0);

    EXPECT_EQ(readFile(folder_.path() / "file"), contents);
    struct stat status {};
    ASSERT_EQ(::stat((folder_.path() / "file").c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777, 0640U);
    EXPECT_EQ(names(), std::vector<std::string>{"file"});
}

TEST_F(FileStore, ReplacesAndShortens) {
    ASSERT_EQ(replaceFile(folder_.path() / "file", "something long", 0644), 0);
    ASSERT_EQ(replaceFile(folder_.path() / "file", "short", 0644), 0);
    EXPECT_EQ(readFile(folder_.path() / "file"), "short");
}

TEST_F(FileStore, MakesTheFolders) {
    ASSERT_EQ(replaceFile(folder_.path() / "a" / "b" / "file", "x", 0644), 0);
    EXPECT_EQ(readFile(folder_.path() / "a" / "b" / "file"), "x");
}

TEST_F(FileStore, TakesUpWhatACrashLeftBehind) {
    folder_.write(".file.new", "half of a longer contents");
    ASSERT_EQ(replaceFile(folder_.path() / "file", "whole", 0644), 0);

    EXPECT_EQ(readFile(folder_.path() / "file"), "whole");
    EXPECT_EQ(names(), std::vector<std::string>{"file"});
}

TEST_F(FileStore, DoesNotFollowALinkInThePlaceOfTheTemporaryFile) {
    folder_.write("victim", "precious");
    std::filesystem::create_symlink(folder_.path() / "victim", folder_.path() / ".file.new");

    EXPECT_LT(replaceFile(folder_.path() / "file", "x", 0644), 0);
    EXPECT_EQ(readFile(folder_.path() / "victim"), "precious");
}

TEST_F(FileStore, SaysWhyAFolderCannotBeMade) {
    folder_.write("plain", "");
    EXPECT_LT(replaceFile(folder_.path() / "plain" / "folder" / "file", "x", 0644), 0);
    EXPECT_EQ(lastErrorSentence(),
              "Cannot make the folder " + (folder_.path() / "plain/folder").string() + ": Not a directory.");
}

TEST_F(FileStore, SaysWhyAFileCannotBeReplaced) {
    std::filesystem::create_directories(folder_.path() / "file" / "below");
    EXPECT_LT(replaceFile(folder_.path() / "file", "x", 0644), 0);
    EXPECT_EQ(lastErrorSentence(),
              "Cannot replace " + (folder_.path() / "file").string() + ": Is a directory.");
    EXPECT_EQ(names(), std::vector<std::string>{"file"});
}

TEST_F(FileStore, TellsAMissingFileFromAnUnreadableOne) {
    EXPECT_EQ(readFile(folder_.path() / "none"), std::nullopt);
    EXPECT_EQ(errno, ENOENT);
    EXPECT_EQ(readFile(folder_.path()), std::nullopt);
    EXPECT_EQ(errno, EISDIR);
}

TEST_F(FileStore, WritersAtOnceLeaveOneOfTheirContentsWhole) {
    const auto path = folder_.path() / "file";
    std::vector<std::thread> writers;
    for (const char letter : {'a', 'b', 'c', 'd'})
        writers.emplace_back([&path, letter] {
            for (int i = 0; i < 25; ++i)
                EXPECT_EQ(replaceFile(path, std::string(100'000, letter), 0644), 0) << lastErrorSentence();
        });
    for (auto& writer : writers)
        writer.join();

    const auto contents = readFile(path);
    ASSERT_TRUE(contents.has_value());
    ASSERT_EQ(contents->size(), 100'000U);
    EXPECT_EQ(contents->find_first_not_of(contents->front()), std::string::npos);
    EXPECT_EQ(names(), std::vector<std::string>{"file"});
}

} // namespace
} // namespace velt
