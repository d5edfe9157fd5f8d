// Programs that go on after their files were replaced.
#include "standalone/process/replaced_programs.h"
#include "tests/support/temporary_folder.h"
#include "tests/support/waiting.h"

#include <gtest/gtest.h>

#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>
#include <string>

namespace velt::test {
namespace {

TEST(ReplacedPrograms, AreKnownByTheirFile) {
    const TemporaryFolder folder;
    const std::string program = (folder.path() / "program").string();
    std::filesystem::copy_file("/usr/bin/sleep", program);
    const pid_t child = ::fork();
    if (child == 0) {
        ::execl(program.c_str(), "program", "60", nullptr);
        ::_exit(1);
    }
    const std::string link = "/proc/" + std::to_string(child) + "/exe";
    std::error_code error;
    ASSERT_TRUE(waitUntil([&] { return std::filesystem::read_symlink(link, error) == program; }, patience));
    EXPECT_EQ(replacedFileOf(child), std::nullopt);
    std::filesystem::copy_file("/usr/bin/sleep", program + ".new");
    std::filesystem::rename(program + ".new", program);
    EXPECT_EQ(replacedFileOf(child), program);
    ::kill(child, SIGKILL);
    ::waitpid(child, nullptr, 0);
    EXPECT_EQ(replacedFileOf(child), std::nullopt);
    EXPECT_EQ(replacedFileOf(::getpid()), std::nullopt);
}

TEST(ReplacedPrograms, RunReplacedLibrariesToo) {
    const std::string good = "7f00-7f01 r-xp 00000000 08:01 42                 /usr/lib/libssl.so.3\n";
    const std::string data =
        "7f00-7f01 r--p 00000000 08:01 42                 /usr/lib/libc.so.6 (deleted)\n";
    const std::string memory = "7f00-7f01 r-xp 00000000 00:01 42                 /memfd:jit (deleted)\n"
                               "7f00-7f01 rwxs 00000000 00:01 42                 /dev/zero (deleted)\n"
                               "7f00-7f01 r-xp 00000000 00:00 0\n";
    EXPECT_EQ(replacedLibraryIn(""), std::nullopt);
    EXPECT_EQ(replacedLibraryIn(good + data + memory), std::nullopt);
    EXPECT_EQ(
        replacedLibraryIn(good + data + memory +
                          "7f00-7f01 r-xp 00000000 08:01 42       /usr/lib/my libs/libz.so.1 (deleted)\n"),
        "/usr/lib/my libs/libz.so.1");
}

} // namespace
} // namespace velt::test
