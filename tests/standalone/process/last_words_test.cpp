#include "standalone/process/last_words.h"

#include <gtest/gtest.h>

namespace velt {
namespace {

TEST(ReasonOfEnd, IsTheLastWordsOrTheStatusOrWhatKeptItFromStarting) {
    EXPECT_EQ(reasonOfEnd(runProcess({"sh", "-c", "echo 'error: not today.' >&2; exit 3"})),
              "error: not today");
    EXPECT_EQ(reasonOfEnd(runProcess({"sh", "-c", "exit 3"})), "it ended with status 3");
    EXPECT_EQ(reasonOfEnd(runProcess({"sh", "-c", "exit 3"}), "sh"), "sh ended with status 3");
    EXPECT_EQ(reasonOfEnd(runProcess({"/no/such"})), "Cannot start /no/such: No such file or directory");
}

} // namespace
} // namespace velt
