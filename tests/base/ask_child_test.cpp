#include "base/ask_child.h"

#include <gtest/gtest.h>

#include <unistd.h>

#include <climits>
#include <csignal>

namespace velt {
namespace {

TEST(AskChild, AnswersWhatTheChildAnswers) {
    for (const int answer : {0, 1, -1, INT_MIN, 4711}) {
        const auto told = askChild([answer] { return answer; });
        ASSERT_TRUE(told);
        EXPECT_EQ(*told, answer);
    }
    const auto process = askChild([] { return static_cast<int>(getpid()); });
    ASSERT_TRUE(process);
    EXPECT_NE(*process, getpid());
}

TEST(AskChild, TakesNoSilenceForAnAnswer) {
    EXPECT_FALSE(askChild([]() -> int { _exit(0); }));
    EXPECT_FALSE(askChild([] { return raise(SIGKILL); }));
}

} // namespace
} // namespace velt
