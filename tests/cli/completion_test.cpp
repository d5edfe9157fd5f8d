// The completion, sourced in a real bash and asked as bash asks it.
#include "cli/setting.h"
#include "tests/cli/cli_test.h"

#include <algorithm>
#include <iterator>
#include <sstream>

namespace {

using Words = std::vector<std::string>;

// What is offered for the last word. The words are split as bash splits them: "=" is a word.
Words offered(const Words& words) {
    std::string line = "veltctl";
    for (const std::string& word : words) {
        line += " '" + word + "'";
    }
    const std::string script = "source \"$0\"; COMP_WORDS=(" + line +
                               "); COMP_CWORD=$((${#COMP_WORDS[@]} - 1)); "
                               "_veltctl; printf '%s\\n' \"${COMPREPLY[@]}\"";
    const RunResult result =
        runProcess({"/bin/bash", "--norc", "-uc", script, COMPLETION}, {"PATH=/usr/bin:/bin"});
    EXPECT_EQ(result.code, 0) << result.err;
    EXPECT_EQ(result.err, "");
    std::istringstream lines(result.out);
    Words replies;
    for (std::string reply; std::getline(lines, reply);) {
        if (!reply.empty()) {
            replies.push_back(reply);
        }
    }
    std::sort(replies.begin(), replies.end());
    return replies;
}

Words split(const std::string& text) {
    std::istringstream stream(text);
    return {std::istream_iterator<std::string>(stream), std::istream_iterator<std::string>()};
}

Words with(Words words, const Words& more) {
    words.insert(words.end(), more.begin(), more.end());
    return words;
}

Words keysOf(const velt::cli::SettingGroup& group) {
    Words keys;
    for (const velt::cli::Setting& setting : group.settings) {
        keys.push_back(std::string(setting.key) + "=");
    }
    return keys;
}

} // namespace

TEST(CompletionTest, EveryCommandOffersTheCommandsBelowIt) {
    const std::vector<CommandDescription> commands = describeCommands();
    for (const CommandDescription& command : commands) {
        Words below;
        const std::string start = command.words.empty() ? "" : command.words + " ";
        for (const CommandDescription& other : commands) {
            const bool isBelow = other.words.size() > start.size() && other.words.rfind(start, 0) == 0;
            if (isBelow && other.words.find(' ', start.size()) == std::string::npos) {
                below.push_back(other.words.substr(start.size()));
            }
        }
        std::sort(below.begin(), below.end());
        if (!below.empty()) {
            EXPECT_EQ(offered(with(split(command.words), {""})), below) << command.words;
        }
    }
}

TEST(CompletionTest, EveryCommandOffersItsOptions) {
    const std::vector<CommandDescription> commands = describeCommands();
    const Words everywhere = commands.front().options; // the program's own
    for (const CommandDescription& command : commands) {
        Words expected = with(command.options, everywhere);
        if (!command.words.empty()) {
            std::erase(expected, "--version");
        }
        std::sort(expected.begin(), expected.end());
        expected.erase(std::unique(expected.begin(), expected.end()), expected.end());
        EXPECT_EQ(offered(with(split(command.words), {"--"})), expected) << command.words;
    }
}

TEST(CompletionTest, EverySettingIsOffered) {
    Words ftp = keysOf(velt::cli::newestGroupOf(velt::schema::ftp));
    std::sort(ftp.begin(), ftp.end());
    EXPECT_EQ(offered({"ftp", "set", ""}), ftp);
    Words security = keysOf(velt::cli::newestGroupOf(velt::schema::security));
    std::sort(security.begin(), security.end());
    EXPECT_EQ(offered({"security", "set", ""}), security);
    EXPECT_EQ(offered({"sftp", "set", ""}), keysOf(velt::cli::newestGroupOf(velt::schema::sftp)));
    EXPECT_EQ(offered({"confinement", "set", ""}),
              keysOf(velt::cli::newestGroupOf(velt::schema::confinement)));
    EXPECT_EQ(offered({"--json", "--url", "x", "ftp", "set", "portnum", "=", "5", "enable_f"}),
              (Words{"enable_fips=", "enable_flow_ctrl=", "enable_ftp=", "enable_ftps=", "enable_fxp="}));
}

TEST(CompletionTest, SwitchesOfferTheirValues) {
    for (const velt::cli::SettingGroup& group :
         {velt::cli::newestGroupOf(velt::schema::ftp), velt::cli::newestGroupOf(velt::schema::security),
          velt::cli::newestGroupOf(velt::schema::sftp),
          velt::cli::newestGroupOf(velt::schema::confinement)}) {
        for (const velt::cli::Setting& setting : group.settings) {
            const Words replies = offered({group.command, "set", setting.key, "="});
            const bool isSwitch = setting.type == velt::cli::SettingType::boolean;
            EXPECT_EQ(replies == (Words{"off", "on"}), isSwitch) << setting.key;
        }
    }
    EXPECT_EQ(offered({"sftp", "set", "enable", "=", "of"}), Words{"off"});
    EXPECT_EQ(offered({"ftp", "set", "utf8_mode", "="}), (Words{"0", "1", "2"}));
}

TEST(CompletionTest, ValuesOfOptionsAreOffered) {
    EXPECT_EQ(offered({"tokens", "create", "--role", ""}), (Words{"admin", "viewer"}));
    EXPECT_EQ(offered({"tokens", "create", "x", "--role", "=", "a"}), Words{"admin"});
    EXPECT_EQ(offered({"chroot", "users", "list", "--type", "l"}), (Words{"ldap", "local"}));
    EXPECT_EQ(offered({"sessions", "--protocol", "f"}), (Words{"ftp", "ftps"}));
    EXPECT_EQ(offered({"transfers", "--operation", "re"}), (Words{"remove-folder", "rename"}));
    EXPECT_EQ(offered({"transfers", "--result", "=", "d"}), Words{"done"});
    EXPECT_EQ(offered({"events", "--kind", "t"}), Words{"transfer"});
    EXPECT_EQ(offered({"kick", "--user", ""}), Words{});
    EXPECT_EQ(offered({"log", "--actor", ""}), Words{});
    EXPECT_EQ(offered({"chroot", "rules", "add", ""}), (Words{"group", "user"}));
}

TEST(CompletionTest, FilesAreOfferedWhereOneIsRead) {
    const TemporaryFolder folder;
    const std::string file = folder.write("set tings.json", "");
    for (const Words& words : {Words{"import"}, Words{"diff"}, Words{"chroot", "rules", "save"},
                               Words{"export", "--output"}, Words{"--token-file"}}) {
        EXPECT_EQ(offered(with(words, {folder.path("set")})), Words{file});
    }
}
