#include "standalone/daemons/sshd/uncovered_functions.h"
#include "tests/support/result.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <filesystem>

namespace velt::test {
namespace {

const std::filesystem::path library = VELT_BUILT_FOLDER "/velt-sftp-session.so";

std::string join(const Result<std::vector<std::string>>& names) {
    std::string all = messageOf(names);
    for (const auto& name : names.valueOr({})) {
        all += name + " ";
    }
    return all;
}

TEST(UncoveredFunctions, areNoneOfThisServersOpenSsh) {
    if (!std::filesystem::exists("/usr/sbin/sshd")) {
        GTEST_SKIP() << "the OpenSSH server is not installed";
    }
    std::vector<std::filesystem::path> programs{"/usr/sbin/sshd"};
    if (std::filesystem::exists("/usr/lib/openssh/sshd-session")) {
        programs.emplace_back("/usr/lib/openssh/sshd-session");
    }
    EXPECT_EQ(join(uncoveredFunctions(programs, library)), "");
}

TEST(UncoveredFunctions, areFoundInTheOrderOfTheirNames) {
    EXPECT_EQ(join(uncoveredFunctions({VELT_CHANGING_PROGRAM}, library)), "openat renameat2 ");
}

TEST(UncoveredFunctions, areNotGuessed) {
    const TemporaryFolder folder;
    const std::string elf("\x7f"
                          "ELF\x02\x01\x01",
                          7);
    for (const std::string& text :
         {std::string(), std::string("no program"), elf, elf + std::string(57, '\xff')}) {
        const auto file = folder.write("program", text);
        EXPECT_EQ(messageOf(uncoveredFunctions({file}, library)),
                  "Cannot tell which functions " + file.string() + " calls.");
    }
    EXPECT_NE(messageOf(uncoveredFunctions({folder.path() / "missing"}, library)), "");
}

} // namespace
} // namespace velt::test
