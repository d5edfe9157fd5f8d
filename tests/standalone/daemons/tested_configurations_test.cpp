// A configuration is put to its daemon's test once.
#include "standalone/daemons/tested_configurations.h"

#include "tests/support/result.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <string>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

class TestedConfigurations : public testing::Test {
protected:
    /// Whether the test ran.
    static bool runs(const std::string& hash) {
        bool ran = false;
        EXPECT_EQ(messageOf(testOnce(hash,
                                     [&] {
                                         ran = true;
                                         return Result<>();
                                     })),
                  "");
        return ran;
    }
};

TEST_F(TestedConfigurations, passOnce) {
    EXPECT_TRUE(runs("once"));
    EXPECT_FALSE(runs("once"));
    EXPECT_TRUE(runs("another"));
    EXPECT_FALSE(runs("once"));
}

TEST_F(TestedConfigurations, thatWereRefusedAreTestedAgain) {
    const auto refuse = [] { return Result<>(Error("refused")); };
    EXPECT_EQ(messageOf(testOnce("refused", refuse)), "refused");
    EXPECT_EQ(messageOf(testOnce("refused", refuse)), "refused");
    EXPECT_TRUE(runs("refused"));
}

TEST_F(TestedConfigurations, areForgottenAfterManyOthers) {
    EXPECT_TRUE(runs("early"));
    for (int i = 0; i < 100; ++i) {
        EXPECT_TRUE(runs("one of many " + std::to_string(i)));
    }
    EXPECT_TRUE(runs("early"));
}

TEST_F(TestedConfigurations, knowAProgramFromItsSuccessor) {
    const TemporaryFolder folder;
    const fs::path program = folder.path() / "program";
    const auto identity = [&] { return identityOf({program}); };
    const auto none = identity();
    std::ofstream(program) << "one";
    const auto first = identity();
    EXPECT_NE(first, none);
    EXPECT_EQ(first, identity());
    // As packages are upgraded: another file in its place, of the same size and time.
    std::ofstream(folder.path() / "fresh") << "two";
    fs::last_write_time(folder.path() / "fresh", fs::last_write_time(program));
    fs::rename(folder.path() / "fresh", program);
    const auto second = identity();
    EXPECT_NE(second, first);
    fs::permissions(program, fs::perms::owner_read);
    EXPECT_NE(identity(), second);
}

} // namespace
} // namespace velt::test
