#include "standalone/core/state_root.h"

#include <gtest/gtest.h>

#include <cstdlib>

namespace velt {
namespace {

TEST(StateRoot, EveryPathLiesBelowIt) {
    setStateRoot("/tmp/some-root");
    EXPECT_EQ(statePath("/etc/velt/ftp.conf"), "/tmp/some-root/etc/velt/ftp.conf");
    EXPECT_EQ(statePath("etc/velt/ftp.conf"), "/tmp/some-root/etc/velt/ftp.conf");
}

TEST(StateRoot, DotsDoNotLeadOutOfIt) {
    setStateRoot("/tmp/some-root");
    EXPECT_EQ(statePath("/../../etc/passwd"), "/tmp/some-root/etc/passwd");
    EXPECT_EQ(statePath("/etc/../../../x"), "/tmp/some-root/x");
}

TEST(StateRoot, IsTheFileSystemRootInProduction) {
    setStateRoot("/");
    EXPECT_EQ(statePath("/etc/velt/ftp.conf"), "/etc/velt/ftp.conf");
}

// The threadsafe style starts the program anew, so that the root is chosen in a fresh process.
TEST(StateRootDeathTest, ComesFromTheEnvironmentWhereNobodyChoseIt) {
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    ::setenv("VELT_STATE_ROOT", "/tmp/root-of-environment", 1);
    EXPECT_EXIT(std::exit(statePath("/x") == "/tmp/root-of-environment/x" ? 7 : 1),
                ::testing::ExitedWithCode(7), "");
    ::unsetenv("VELT_STATE_ROOT");
}

} // namespace
} // namespace velt
