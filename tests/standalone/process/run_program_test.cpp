#include "standalone/process/run_program.h"

#include "tests/support/result.h"

#include <gtest/gtest.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

namespace velt {
namespace {

using namespace std::chrono_literals;

TEST(RunProcess, KeepsOutputErrorsAndExitCodeApart) {
    const auto result = runProcess({"sh", "-c", "echo out; echo err >&2; exit 3"});
    EXPECT_EQ(result->exitCode, 3);
    EXPECT_EQ(result->output, "out\n");
    EXPECT_EQ(result->errors, "err\n");
}

TEST(RunProcess, PassesArgumentsAsTheyAre) {
    const auto result = runProcess({"printf", "%s|", "a b", "$HOME", "`id`", "", "-x", "\n"});
    EXPECT_EQ(result->output, "a b|$HOME|`id`||-x|\n|");
}

TEST(RunProcess, PassesAnyAmountOfInput) {
    EXPECT_EQ(runProcess({"cat"}, "hello")->output, "hello");
    EXPECT_EQ(runProcess({"wc", "-c"}, std::string(5'000'000, 'x'))->output, "5000000\n");
    EXPECT_EQ(runProcess({"cat", "/dev/stdin"}, "by name")->output, "by name");
    EXPECT_EQ(runProcess({"cat"})->output, "");
}

TEST(RunProcess, IsNotHurtByAProgramThatReadsNoInput) {
    EXPECT_EQ(runProcess({"true"}, std::string(5'000'000, 'x'))->exitCode, 0);
}

TEST(RunProcess, KeepsTheFirstMebibyteOfOutput) {
    const auto result = runProcess({"cat"}, std::string(3'000'000, 'x'));
    EXPECT_EQ(result->exitCode, 0);
    EXPECT_EQ(result->output.size(), std::size_t{1} << 20);
}

TEST(RunProcess, NamesTheSignalThatEndedTheProgram) {
    EXPECT_EQ(runProcess({"sh", "-c", "kill -TERM $$"})->exitCode, 128 + SIGTERM);
}

TEST(RunProcess, SaysWhyAProgramCannotBeStarted) {
    EXPECT_EQ(test::messageOf(runProcess({"no-such-program-here"})),
              "Cannot start no-such-program-here: No such file or directory.");
    EXPECT_EQ(test::messageOf(runProcess({"/etc"})), "Cannot start /etc: Permission denied.");
    EXPECT_FALSE(runProcess({}));
}

TEST(RunProcess, EndsAProgramThatRunsTooLong) {
    const auto begin = std::chrono::steady_clock::now();
    const auto result = runProcess({"sleep", "30"}, {}, 100ms);
    EXPECT_LT(std::chrono::steady_clock::now() - begin, 5s);
    EXPECT_TRUE(result->ranTooLong);
    EXPECT_EQ(result->exitCode, 128 + SIGKILL);
    EXPECT_EQ(result->errors, "/usr/bin/sleep ran for more than 100 ms and was ended.");
    EXPECT_EQ(::waitpid(-1, nullptr, WNOHANG), -1) << "no child is left";
}

TEST(RunProcess, EndsAProgramThatNeverStopsWriting) {
    for (const char* const command : {"cat /dev/zero & exec cat /dev/zero", "exec yes >&2"}) {
        const auto begin = std::chrono::steady_clock::now();
        const auto result = runProcess({"sh", "-c", command}, {}, 200ms);
        EXPECT_LT(std::chrono::steady_clock::now() - begin, 5s);
        EXPECT_TRUE(result->ranTooLong);
    }
}

TEST(RunProcess, DoesNotWaitForAGrandchildThatHoldsTheOutput) {
    const auto begin = std::chrono::steady_clock::now();
    const auto result = runProcess({"sh", "-c", "sleep 30 & echo $!"});
    EXPECT_LT(std::chrono::steady_clock::now() - begin, 5s);
    EXPECT_EQ(result->exitCode, 0);
    const pid_t grandchild = std::stoi(result->output);
    EXPECT_EQ(::kill(grandchild, SIGKILL), 0);
}

TEST(RunProcess, GivesACleanEnvironment) {
    ::setenv("VELT_TEST_SECRET", "secret", 1);
    EXPECT_EQ(runProcess({"env"})->output, "PATH=/usr/sbin:/usr/bin:/sbin:/bin\nLANG=C.UTF-8\n");
    ::unsetenv("VELT_TEST_SECRET");
}

TEST(RunProcess, PassesNoOtherDescriptorAndNoSignalChoice) {
    // One that is not closed on exec, as a library in the host may have it.
    const int stray = ::dup(STDERR_FILENO);
    ASSERT_GT(stray, 2);
    const auto old = ::signal(SIGPIPE, SIG_IGN);
    const auto descriptors = runProcess({"ls", "/proc/self/fd"});
    const auto ignored = runProcess({"sed", "-n", "s/SigIgn:.//p", "/proc/self/status"});
    ::signal(SIGPIPE, old);
    ::close(stray);
    EXPECT_EQ(descriptors->output, "0\n1\n2\n3\n") << "3 is the folder that ls reads";
    // Some versions of the C library have two signals of their own (32 and 33) ignored in whatever they
    // spawn.
    ASSERT_EQ(ignored->output.size(), 17U) << ignored->output;
    EXPECT_EQ(std::stoull(ignored->output, nullptr, 16) & ~0x180000000ULL, 0U) << ignored->output;
}

TEST(RunProcess, WorksInAProcessWithoutStandardDescriptors) {
    for (int closed = 0; closed < 8; ++closed) {
        const pid_t child = ::fork();
        if (child == 0) {
            for (int fd = 0; fd < 3; ++fd)
                if ((closed & (1 << fd)) != 0)
                    ::close(fd);
            const auto result = runProcess({"sh", "-c", "cat; echo err >&2"}, "in");
            ::_exit(result->output == "in" && result->errors == "err\n" ? 0 : 1);
        }
        int status = -1;
        ASSERT_EQ(::waitpid(child, &status, 0), child);
        EXPECT_EQ(status, 0) << "without the descriptors of the mask " << closed;
    }
}

} // namespace
} // namespace velt
