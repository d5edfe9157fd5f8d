// The manual pages are well formed and name what there is.
#include "tests/cli/cli_test.h"

namespace {

const std::string manual = std::string(MANUAL_FOLDER) + "/veltctl.1";

// As a reader sees it, on one line with single spaces.
std::string rendered() {
    const RunResult result = runProcess({"/usr/bin/mandoc", "-Tutf8", "-Owidth=1000", manual}, {});
    std::string text;
    for (std::size_t i = 0; i < result.out.size(); ++i) {
        const char c = result.out[i] == '\n' ? ' ' : result.out[i];
        if (c == '\b') {
            text.pop_back(); // overstruck for bold
        } else if (c != ' ' || text.empty() || text.back() != ' ') {
            text += c;
        }
    }
    return text;
}

} // namespace

TEST(ManualTest, ThePagesHaveNoErrors) {
    for (const char* page : {"/veltctl.1", "/veltd.8"}) {
        const RunResult result =
            runProcess({"/usr/bin/mandoc", "-Tlint", "-Wwarning", std::string(MANUAL_FOLDER) + page}, {});
        EXPECT_EQ(result.code, 0) << result.out << result.err;
    }
}

TEST(ManualTest, ThePageNamesEveryCommandAndOption) {
    const std::string page = rendered();
    const std::vector<CommandDescription> commands = describeCommands();
    ASSERT_GT(commands.size(), 25U);
    for (const CommandDescription& command : commands) {
        EXPECT_NE(page.find(command.words), std::string::npos) << command.words;
        for (const std::string& option : command.options) {
            EXPECT_NE(page.find(option), std::string::npos) << command.words << " " << option;
        }
    }
}

TEST(ManualTest, ThePageNamesEveryExitCode) {
    const std::string page = rendered();
    for (const char* code :
         {" 0 Done", " 1 A file", " 2 The command line", " 3 The input was refused", " 4 The input conflicts",
          " 5 The server failed", " 6 The server cannot", " 7 A dry run", " 8 Done"}) {
        EXPECT_NE(page.find(code), std::string::npos) << code;
    }
}
