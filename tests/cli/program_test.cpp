#include "tests/cli/cli_test.h"

#include <algorithm>
#include <set>

using ProgramTest = CliTest;

TEST_F(ProgramTest, EveryCommandExplainsItself) {
    for (const CommandDescription& command : describeCommands()) {
        Words words;
        std::string word;
        for (const char c : command.words + " ") {
            if (c == ' ') {
                if (!word.empty()) {
                    words.push_back(word);
                }
                word.clear();
            } else {
                word += c;
            }
        }
        words.emplace_back("--help");
        const RunResult result = run(words);
        EXPECT_EQ(result.code, 0) << command.words;
        EXPECT_NE(result.out.find("Usage: "), std::string::npos) << command.words;
        EXPECT_EQ(result.err, "") << command.words;
    }
    EXPECT_TRUE(asked().empty());
}

TEST_F(ProgramTest, TheHelpOfSetNamesTheFormOfItsArguments) {
    for (const char* area : {"ftp", "security", "sftp", "confinement"}) {
        const RunResult result = run({area, "set", "--help"});
        EXPECT_NE(result.out.find("setting key=value ... REQUIRED"), std::string::npos) << result.out;
    }
}

TEST_F(ProgramTest, TheCommandsAreTheDocumentedOnes) {
    std::vector<std::string> words;
    for (const CommandDescription& command : describeCommands()) {
        words.push_back(command.words);
    }
    std::sort(words.begin(), words.end());
    EXPECT_EQ(words, (Words{"",
                            "access",
                            "bans",
                            "bans lift",
                            "bans list",
                            "call",
                            "chroot",
                            "chroot rules",
                            "chroot rules add",
                            "chroot rules load",
                            "chroot rules remove",
                            "chroot rules save",
                            "chroot users",
                            "chroot users add",
                            "chroot users delete",
                            "chroot users list",
                            "confinement",
                            "confinement get",
                            "confinement set",
                            "confirm",
                            "diff",
                            "doctor",
                            "events",
                            "export",
                            "ftp",
                            "ftp get",
                            "ftp set",
                            "history",
                            "import",
                            "keys",
                            "keys add",
                            "keys import",
                            "keys list",
                            "keys remove",
                            "kick",
                            "log",
                            "restart",
                            "security",
                            "security get",
                            "security set",
                            "sessions",
                            "sftp",
                            "sftp get",
                            "sftp set",
                            "shares",
                            "status",
                            "tokens",
                            "tokens create",
                            "tokens delete",
                            "tokens list",
                            "transfers",
                            "undo"}));
}

TEST_F(ProgramTest, WhatChangesSomethingHasADryRun) {
    const std::set<std::string> readers{"",
                                        "bans",
                                        "bans list",
                                        "chroot",
                                        "chroot rules",
                                        "chroot rules load",
                                        "chroot users",
                                        "chroot users list",
                                        "access",
                                        "confinement",
                                        "confinement get",
                                        "diff",
                                        "doctor",
                                        "events",
                                        "export",
                                        "ftp",
                                        "ftp get",
                                        "history",
                                        "keys",
                                        "keys list",
                                        "log",
                                        "security",
                                        "security get",
                                        "sessions",
                                        "sftp",
                                        "sftp get",
                                        "shares",
                                        "status",
                                        "tokens",
                                        "tokens list",
                                        "transfers"};
    for (const CommandDescription& command : describeCommands()) {
        EXPECT_EQ(std::ranges::count(command.options, "--dry-run"), readers.contains(command.words) ? 0 : 1)
            << command.words;
    }
}

TEST_F(ProgramTest, BothTransportsCarryTheSameRequests) {
    EXPECT_EQ(run({"sftp", "set", "enable=on"}).code, 0);
    environment = {{"VELT_URL", server.url()}};
    EXPECT_EQ(run({"sftp", "set", "enable=off"}).code, 0);
    ASSERT_EQ(sent(change).size(), 2U);
    for (const HttpRequest& request : server.requests()) {
        const bool hasType = request.head.find("Content-Type: application/json\r\n") != std::string::npos;
        EXPECT_EQ(hasType, request.method == "PATCH") << request.head;
        EXPECT_EQ(request.head.find("Expect:"), std::string::npos);
    }
}
