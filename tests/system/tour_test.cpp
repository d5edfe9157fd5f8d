// The quick start and the README's tour, as somebody does them who reads the page and copies its commands.
#include "tests/support/files.h"
#include "tests/support/run_program.h"
#include "tests/support/text.h"
#include "tests/system/support/files.h"
#include "tests/system/support/leftovers.h"
#include "tests/system/support/private_world.h"
#include "tests/system/support/readme_tour.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <regex>
#include <string>
#include <vector>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

const fs::path sources = VELT_SOURCE_FOLDER;
const std::string startBuilt = std::string("scripts/start --built ") + VELT_BUILT_FOLDER;

class QuickStart : public testing::Test {
protected:
    void SetUp() override {
        if (!whyNoWorld().empty()) {
            GTEST_SKIP() << whyNoWorld();
        }
        furnishTree(tree_);
    }
    void TearDown() override {
        if (!whyNoWorld().empty()) {
            return;
        }
        run(tree_, "scripts/start --stop");
        EXPECT_EQ(lastingProcesses(), "");
        EXPECT_FALSE(somethingListens());
        fs::remove_all(tree_);
    }

    /// What of the source tree the quick start uses: its script, and a file to send.
    static void furnishTree(const fs::path& tree) {
        fs::create_directories(tree / "scripts");
        fs::copy_file(sources / "scripts/start", tree / "scripts/start");
        fs::copy_file(sources / "README.md", tree / "README.md");
    }

    /// Both outputs of the commands, which a shell runs in the folder.
    static std::string run(const fs::path& folder, const std::string& commands,
                           const std::vector<std::string>& before = {}) {
        std::vector<std::string> arguments = before;
        arguments.insert(arguments.end(),
                         {"bash", "-c", "cd " + folder.string() + " && exec 2>&1\n" + commands});
        const ProcessResult result = runProcess(arguments, {}, std::chrono::seconds(100));
        return result.output + result.errors;
    }

    /// The process that a start has told of.
    static std::string processIn(const std::string& output) {
        std::smatch match;
        EXPECT_TRUE(std::regex_search(output, match, std::regex("as process ([0-9]+)"))) << output;
        return match[1];
    }

    void expectNothingRuns(const std::string& when) const {
        EXPECT_EQ(run(tree_, "scripts/start --stop"), stopped) << when;
        EXPECT_EQ(lastingProcesses(), "") << when;
        EXPECT_FALSE(somethingListens()) << when;
    }

    inline static const std::string stopped =
        "veltd and its services are stopped; var/ keeps their settings.\n";
    const fs::path tree_ = "/mnt/tour";
};

std::string replaced(std::string text, const std::string& from, const std::string& to) {
    const auto at = text.find(from);
    return at == std::string::npos ? text : text.replace(at, from.size(), to);
}

// One shell runs all steps, as for somebody who copies them one after the other.
std::vector<std::string> outputsOf(const std::string& all, std::size_t steps) {
    std::vector<std::string> outputs;
    for (std::size_t i = 0; i < steps; i++) {
        const std::string mark = "== step " + std::to_string(i) + "\n";
        const auto begin = all.find(mark);
        if (begin == std::string::npos) {
            ADD_FAILURE() << "step " << i << " was not reached:\n" << all;
            outputs.emplace_back();
            continue;
        }
        const auto end = all.find("== step " + std::to_string(i + 1) + "\n", begin);
        outputs.push_back(all.substr(begin + mark.size(), end - begin - mark.size()));
    }
    return outputs;
}

TEST_F(QuickStart, theTourGoesAsTheReadmeSays) {
    const std::string page = contentsOf(sources / "README.md");
    const std::vector<TourStep> steps = stepsOf(page);
    ASSERT_GE(steps.size(), 6U);
    std::string commands;
    for (std::size_t i = 0; i < steps.size(); i++) {
        commands += "echo '== step " + std::to_string(i) + "'\n" +
                    replaced(steps[i].commands, "scripts/start\n", startBuilt + "\n");
    }
    const std::vector<std::string> outputs = outputsOf(run(tree_, commands), steps.size());
    if (std::getenv("VELT_UPDATE_GOLDEN") != nullptr) {
        writeFile(sources / "README.md", withOutputs(page, outputs));
        FAIL() << "wrote README.md";
    }
    for (std::size_t i = 0; i < steps.size(); i++) {
        EXPECT_EQ(masked(outputs[i]), masked(steps[i].output)) << "after:\n" << steps[i].commands;
    }
}

TEST_F(QuickStart, aSecondStartChangesNothing) {
    const std::string first = run(tree_, startBuilt);
    const std::string settings = run(tree_, ". var/env; veltctl ftp set enable_ftp=on; veltctl export");
    const std::string second = run(tree_, startBuilt);
    EXPECT_TRUE(contains(second, "veltd is already running as process " + processIn(first) + ".")) << second;
    EXPECT_TRUE(contains(second, "127.0.0.1:2121, on and off")) << second;
    EXPECT_EQ("enable_ftp: off -> on\n" + run(tree_, ". var/env; veltctl export"), settings);
    EXPECT_EQ(modeOf(tree_ / "var/token"), 0600U);
    EXPECT_EQ(modeOf(tree_ / "var/env"), 0600U);
}

TEST_F(QuickStart, whatWasOnIsOnAgainAfterAStop) {
    run(tree_,
        startBuilt + "; . var/env; veltctl ftp set enable_ftp=on portnum=2100; veltctl sftp set enable=on");
    expectNothingRuns("after a stop");
    const std::string again = run(tree_, startBuilt);
    EXPECT_TRUE(contains(again, "127.0.0.1:2100, on and off")) << again;
    EXPECT_TRUE(contains(again, "127.0.0.1:2222, on")) << again;
    EXPECT_EQ(run(tree_, "curl -sS ftp://127.0.0.1:2100/"), "");
}

TEST_F(QuickStart, aStartThatIsKilledIsStoppedAndStartedAgain) {
    for (int milliseconds = 3; milliseconds < 500; milliseconds += 11) {
        const std::string limit = "0." + std::to_string(1000 + milliseconds).substr(1);
        // Every other time, what the one before has left is there.
        const std::string before = milliseconds % 2 == 1 ? "rm -rf var; " : "";
        run(tree_, before + "timeout --signal KILL " + limit + " " + startBuilt + " >/dev/null");
        expectNothingRuns("killed after " + limit + " s");
    }
    run(tree_, "timeout --signal KILL 0.150 " + startBuilt);
    const std::string start = run(tree_, startBuilt);
    EXPECT_TRUE(contains(start, "127.0.0.1:2121, off and off")) << start;
    EXPECT_EQ(run(tree_, ". var/env; veltctl ftp set enable_ftp=on"), "enable_ftp: off -> on\n");
}

TEST_F(QuickStart, aVeltdThatIsKilledLeavesServicesThatAreFound) {
    const std::string first = run(tree_, startBuilt + "; . var/env; veltctl ftp set enable_ftp=on");
    run(tree_, "kill -KILL " + processIn(first));
    const std::string second = run(tree_, startBuilt);
    EXPECT_TRUE(contains(second, "veltd is running as process ")) << second;
    EXPECT_TRUE(contains(second, "127.0.0.1:2121, on and off")) << second;
    run(tree_, "kill -KILL " + processIn(second));
    expectNothingRuns("after both were killed");
}

TEST_F(QuickStart, veltdRunsOnceForAFolder) {
    run(tree_, startBuilt);
    const std::string second =
        run(tree_, std::string(VELT_BUILT_FOLDER) + "/veltd --state-root var --socket other --module " +
                       VELT_BUILT_FOLDER + "/VELT.Core.FileServ.FTP.so; echo $?");
    EXPECT_TRUE(contains(second, "veltd: veltd is already running below var as process ")) << second;
    EXPECT_TRUE(second.ends_with("\n1\n")) << second;
}

TEST_F(QuickStart, anotherUserIsToldWhoseItIs) {
    run(tree_, startBuilt);
    fs::permissions(tree_, fs::perms::all);
    const std::vector<std::string> asAlice{"setpriv", "--reuid", "alice",
                                           "--regid", "alice",   "--clear-groups"};
    const std::string start =
        "var/ belongs to the user \"root\". Start as that user, or stop the trial and remove var/.\n1\n";
    EXPECT_EQ(run(tree_, startBuilt + "; echo $?", asAlice), start);
    EXPECT_EQ(run(tree_, "scripts/start; echo $?", asAlice), start) << "before anything is built";
    EXPECT_EQ(run(tree_, "scripts/start --stop; echo $?", asAlice),
              "var/ belongs to the user \"root\". Stop it as that user, or as root.\n1\n");
    fs::permissions(tree_, fs::perms(0755));
    EXPECT_EQ(run(tree_, "scripts/start; echo $?", asAlice),
              "You may not write to /mnt/tour. Start as root, or from a copy of your own.\n1\n");
    EXPECT_TRUE(contains(run(tree_, startBuilt), "veltd is already running"));
}

TEST_F(QuickStart, aPathThatTheDaemonsCannotHoldIsRefusedAtOnce) {
    for (const std::string name : {"100%", "a\"b", "a\\b", "a*b"}) {
        const fs::path odd = fs::path("/mnt") / name;
        furnishTree(odd);
        const std::string refusal =
            "Cannot use the folder " + odd.string() + ": its path may not contain \" \\ % or *.\n1\n";
        EXPECT_EQ(run("'" + odd.string() + "'", "scripts/start; echo $?"), refusal);
        EXPECT_EQ(run("'" + odd.string() + "'", startBuilt + "; echo $?"), refusal);
        EXPECT_FALSE(fs::exists(odd / "var"));
        fs::remove_all(odd);
    }
}

TEST_F(QuickStart, saysWhyItCannotGoOn) {
    run(tree_, "mkdir -p var/token");
    EXPECT_TRUE(contains(run(tree_, startBuilt), "Cannot read token: Is a directory.\n"));
    expectNothingRuns("without a token");
    run(tree_, "rmdir var/token; rm var/var/lib/velt/tokens.json; mkdir var/var/lib/velt/.tokens.json.new");
    const std::string start = run(tree_, startBuilt);
    EXPECT_TRUE(contains(start, "tokens.json")) << start;
    EXPECT_TRUE(contains(start, ": Is a directory.\n")) << start;
    run(tree_, "scripts/start --stop; rmdir var/var/lib/velt/.tokens.json.new; echo '{' "
               ">var/var/lib/velt/tokens.json");
    EXPECT_TRUE(contains(run(tree_, startBuilt),
                         "tokens.json is damaged. Restore it, or remove it and make new tokens.\n"));
    run(tree_, "rm var/var/lib/velt/tokens.json; mkdir -p var/run/velt/veltd.sock/full");
    const std::string unable = run(tree_, startBuilt);
    EXPECT_TRUE(contains(unable, "veltd did not start:\n")) << unable;
    EXPECT_TRUE(contains(unable, "veltd.sock")) << unable;
    EXPECT_EQ(run("/mnt", std::string(VELT_BUILT_FOLDER) + "/veltd trial stop nowhere; echo $?"),
              "Cannot enter nowhere/: No such file or directory.\n1\n");
}

TEST_F(QuickStart, aTokenThatIsLostIsReplaced) {
    run(tree_, startBuilt + "; . var/env; veltctl ftp set enable_ftp=on; rm var/token");
    const std::string second = run(tree_, startBuilt);
    EXPECT_TRUE(contains(second, "veltd needs a new token; restarting it.\nveltd is running as process "))
        << second;
    EXPECT_TRUE(contains(second, "127.0.0.1:2121, on and off")) << second;
    EXPECT_EQ(run(tree_, ". var/env; veltctl ftp set enable_ftp=off"), "enable_ftp: on -> off\n");
}

TEST_F(QuickStart, takesOtherPortsWhereItsOwnAreTaken) {
    const fs::path other = "/mnt/other";
    furnishTree(other);
    run(other, startBuilt + "; . var/env; veltctl ftp set enable_ftp=on; veltctl sftp set enable=on");
    const std::string second = run(tree_, startBuilt);
    EXPECT_TRUE(contains(second, "http://127.0.0.1:8081,")) << second;
    EXPECT_TRUE(contains(second, "127.0.0.1:2122, off")) << second;
    EXPECT_TRUE(contains(second, "127.0.0.1:2223, off")) << second;
    EXPECT_TRUE(contains(run(other, "scripts/start --stop"), "stopped"));
    EXPECT_TRUE(contains(run(tree_, startBuilt), "veltd is already running"))
        << "it was not the one that was stopped";
    fs::remove_all(other);
}

TEST_F(QuickStart, worksBelowAClosedFolder) {
    const fs::path closed = "/mnt/closed";
    furnishTree(closed / "tree");
    fs::permissions(closed, fs::perms::owner_all);
    const std::string mounts = contentsOf("/proc/self/mounts");
    const std::string start = run(closed / "tree", startBuilt);
    EXPECT_EQ(run(closed / "tree",
                  ". var/env; veltctl ftp set enable_ftp=on; curl -sS -T README.md ftp://127.0.0.1:2121/"),
              "enable_ftp: off -> on\n")
        << start;
    EXPECT_EQ(contentsOf(closed / "tree/var/demo/README.md"), contentsOf(sources / "README.md"));
    EXPECT_EQ(contentsOf("/proc/self/mounts"), mounts);
    run(closed / "tree", "scripts/start --stop");
    fs::remove_all(closed);
}

TEST_F(QuickStart, servesWhoeverBecameRootForTheStart) {
    run(tree_, "SUDO_UID=" + std::to_string(aliceId) + " " + startBuilt);
    EXPECT_EQ(run(tree_,
                  "echo mine >var/mine && . var/env && "
                  "curl -sS -H \"Authorization: Bearer $VELT_TOKEN\" $VELT_URL/healthz",
                  {"setpriv", "--reuid", "alice", "--regid", "alice", "--clear-groups"}),
              R"({"status":"ok"})");
    EXPECT_TRUE(contains(run(tree_, startBuilt), "veltd is already running"));
}

TEST_F(QuickStart, saysWhenFtpCannotWork) {
    const std::vector<std::string> withoutMounts{"setpriv", "--bounding-set", "-sys_admin", "--inh-caps",
                                                 "-sys_admin"};
    const std::string first = run(tree_, startBuilt, withoutMounts);
    EXPECT_TRUE(contains(first, "FTP will not start here: as root ")) << first;
    EXPECT_TRUE(contains(first, "SFTP starts, and shows its users the whole\nserver.")) << first;
    const std::string use =
        run(tree_, ". var/env; veltctl sftp set enable=on; veltctl ftp set enable_ftp=on", withoutMounts);
    EXPECT_TRUE(contains(use, "cannot make a mount namespace")) << use;
    EXPECT_TRUE(contains(use, "enable: off -> on")) << use;
    const std::string second = run(tree_, startBuilt, withoutMounts);
    EXPECT_TRUE(contains(second, "127.0.0.1:2121, off and off")) << second << "the change was taken back";
    EXPECT_TRUE(contains(second, "127.0.0.1:2222, on")) << second;
}

TEST_F(QuickStart, worksWithoutRootsRights) {
    // Where carol can get to it, wherever the tests were built.
    const std::string built = "/mnt/built";
    fs::create_directory(built);
    for (const char* program :
         {"veltd", "veltctl", "velt-supervise", "velt-login-view", "libvelt-standalone.so",
          "mod_velt_login.so", "velt-sftp-session.so", "VELT.Core.FileServ.FTP.so"}) {
        fs::copy_file(fs::path(VELT_BUILT_FOLDER) / program, fs::path(built) / program);
    }
    const std::string startHere = "scripts/start --built " + built;
    ASSERT_EQ(chown(tree_.c_str(), carolId, carolId), 0);
    const std::vector<std::string> asCarol{"setpriv", "--reuid", "carol",
                                           "--regid", "carol",   "--clear-groups"};
    const std::string start = run(tree_, startHere, asCarol);
    EXPECT_TRUE(contains(start, "for the user demo with the password ")) << start;
    // The third of the commands that it proposes.
    const std::string upload =
        run(tree_,
            ". var/env; veltctl ftp set enable_ftp=on; " +
                start.substr(start.find("curl -T"),
                             start.find('\n', start.find("curl -T")) - start.find("curl -T")) +
                " -sS",
            asCarol);
    EXPECT_EQ(upload, "enable_ftp: off -> on\n");
    EXPECT_EQ(contentsOf(tree_ / "var/demo/README.md"), contentsOf(sources / "README.md"));
    EXPECT_EQ(modeOf(tree_ / "var/demo-password"), 0600U);
    fs::last_write_time(fs::path(built) / "veltctl", fs::file_time_type::clock::now());
    const std::string rebuilt = run(tree_, startHere, asCarol);
    EXPECT_TRUE(contains(rebuilt, "veltd has been rebuilt; restarting it.\nveltd is running as process "))
        << rebuilt;
    EXPECT_TRUE(contains(rebuilt, "127.0.0.1:2121, on and off")) << rebuilt;
    EXPECT_TRUE(contains(run(tree_, startHere), "var/ belongs to the user \"carol\"."))
        << "root takes over what is carol's";
    run(tree_, "scripts/start --stop");
    fs::remove_all(built);
}

// The commands run in a view of the machine in which nothing but the tree can be written.
TEST_F(QuickStart, writesNothingOutsideItsTree) {
    const std::string seal =
        "mkdir -p /run/sshd; mount --bind " + tree_.string() + " " + tree_.string() + " && cd " +
        tree_.string() +
        "\nwhile read -r _ place type _; do\n"
        "    [ -e \"$place\" ] || continue # hidden behind another\n"
        "    case $type:$place in\n"
        "        proc:*|sysfs:*|devtmpfs:*|*:/dev/*|*:" +
        tree_.string() +
        ") ;;\n"
        "        *) mount -o remount,bind,ro \"$place\" || echo \"$place stays open\" ;;\n"
        "    esac\n"
        "done < <(cat /proc/self/mounts)\n";
    const std::string use =
        ". var/env; veltctl ftp set enable_ftp=on enable_ftps=on; veltctl sftp set enable=on\n"
        "curl -sS -T README.md ftp://127.0.0.1:2121/\n"
        "for folder in /etc /tmp /root /var/lib /run /mnt; do touch $folder/x && echo open; done "
        "2>/dev/null\n"
        "scripts/start --stop\n";
    const std::string output = run(tree_, seal + startBuilt + " >/dev/null\n" + use, {"unshare", "--mount"});
    EXPECT_EQ(output, "enable_ftp: off -> on\nenable_ftps: off -> on\nenable: off -> on\n"
                      "veltd and its services are stopped; var/ keeps their settings.\n");
    EXPECT_EQ(contentsOf(tree_ / "var/demo/README.md"), contentsOf(sources / "README.md"));
    EXPECT_EQ(run(tree_, "nft list tables"), "");
}

} // namespace
} // namespace velt::test
