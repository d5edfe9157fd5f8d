// The FTP daemon's module at a login, where the daemon or the program that makes the view cannot do their
// part.
#include "base/unique_fd.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

extern "C" {
#include "standalone/login/login_program.h"
#include "standalone/login/stranger.h"
#include "tests/standalone/login/stand_in_daemon.h"
}

#include <array>
#include <cerrno>
#include <chrono>
#include <vector>

namespace velt::test {
namespace {

class LoginModule : public testing::Test {
protected:
    void SetUp() override { folder_.write("etc/velt/chroot_rules", ""); }

    std::string script(const std::string& text) {
        const auto file = folder_.write("program", "#!/bin/sh\n" + text);
        chmod(file.c_str(), 0755);
        return file.string();
    }
    login_end logIn(const std::string& program, bool knowsUser = true, bool knowsGroups = true,
                    int code = 0) {
        const login_world world{program.c_str(), folder_.path().c_str(), knowsUser, knowsGroups, code,
                                home_.c_str()};
        return log_in(&world);
    }

    TemporaryFolder folder_;
    std::string home_ = "/home/alice";
};

TEST_F(LoginModule, handsWhatTheDaemonKnowsToTheProgram) {
    EXPECT_EQ(logIn(script("printf '%s\\n' \"$@\" > \"$1/told\"; env > \"$1/environment\"\n")),
              login_granted);
    EXPECT_EQ(folder_.read("told"),
              folder_.path().string() + "\nserver\n/\nalice\n1001\n1001,1001,2001\n/home/alice\n");
    EXPECT_EQ(folder_.read("environment").find("HOME="), std::string::npos);
    EXPECT_STREQ(logged(), "");
}

TEST_F(LoginModule, logsWhatTheProgramRemarks) {
    EXPECT_EQ(logIn(script("echo 'a share is left out' >&2\n")), login_granted);
    EXPECT_NE(std::string(logged()).find("login of 'alice': a share is left out"), std::string::npos);
}

TEST_F(LoginModule, takesARefusalForAWrongPassword) {
    EXPECT_EQ(logIn(script("printf 'no\\tsuch\\nfolder\\n' >&2; exit 1\n")), login_wrong);
    EXPECT_NE(std::string(logged()).find("login of 'alice' refused: no such folder"), std::string::npos)
        << logged();
    EXPECT_EQ(logIn(script("kill -KILL $$\n")), login_wrong);
    EXPECT_EQ(logIn((folder_.path() / "absent").string()), login_wrong);
    EXPECT_EQ(logIn(""), login_wrong) << "nothing configured";
}

TEST_F(LoginModule, refusesWhomTheDaemonCannotTell) {
    const auto program = script("exit 0\n");
    EXPECT_EQ(logIn(program, true, true), login_granted);
    EXPECT_EQ(logIn(program, true, false), login_wrong);
    EXPECT_EQ(logIn(program, false, true), login_wrong);
}

TEST_F(LoginModule, refusesWhoseHomeCannotBeLookedAt) {
    const auto program = script("exit 0\n");
    home_ = folder_.path() / "home";
    EXPECT_EQ(logIn(program), login_granted) << "there is none";
    std::filesystem::create_directory_symlink("home", home_);
    EXPECT_EQ(logIn(program), login_wrong);
    EXPECT_NE(std::string(logged()).find("cannot look at the home: "), std::string::npos) << logged();
    EXPECT_EQ(rights_taken(), 0);
}

TEST_F(LoginModule, keepsTheFilesOfTheHome) {
    home_ = folder_.path();
    const std::string profile = folder_.path() / ".profile";
    ASSERT_EQ(logIn(script("")), login_granted);
    EXPECT_LT(open_as_the_daemon(profile.c_str(), O_WRONLY | O_CREAT), 0);
    EXPECT_EQ(errno, EACCES);
    home_ = folder_.path() / "another";
    ASSERT_EQ(logIn(script("")), login_granted);
    EXPECT_TRUE(UniqueFd(open_as_the_daemon(profile.c_str(), O_WRONLY | O_CREAT)));
}

TEST_F(LoginModule, refusesWhereItCannotKnowWhenRulesChange) {
    std::filesystem::remove_all(folder_.path() / "etc");
    EXPECT_EQ(logIn(script("exit 0\n")), login_wrong);
    EXPECT_NE(std::string(logged()).find("cannot look at the shares and rules: "), std::string::npos)
        << logged();
    EXPECT_EQ(rights_taken(), 0);
}

TEST_F(LoginModule, movesNothingAfterAChangeOfTheRules) {
    const std::string from = folder_.write("from", "").string();
    const std::string to = folder_.path() / "to";
    ASSERT_EQ(logIn(script("exit 0\n")), login_granted);
    EXPECT_EQ(move_as_the_daemon(from.c_str(), to.c_str()), 0);
    folder_.write("etc/velt/chroot_rules", "another");
    EXPECT_EQ(move_as_the_daemon(to.c_str(), from.c_str()), -1);
    EXPECT_STREQ(logged(), "session of 'alice' ended: the shares or rules have changed since its login");
    EXPECT_TRUE(std::filesystem::exists(to));
    EXPECT_EQ(rights_taken(), 0);
}

class Strangers : public LoginModule {
protected:
    void SetUp() override {
        LoginModule::SetUp();
        comeFrom("192.0.2.7");
    }
    void TearDown() override { connect_from(nullptr, nullptr, nullptr); }

    void comeFrom(const char* address, const char* spared = nullptr) const {
        connect_from(address, board_.c_str(), spared);
    }
    bool isSentAway() {
        const login_world world{program_.c_str(), folder_.path().c_str(), 1, 1, 0, home_.c_str()};
        return is_sent_away(&world) != 0;
    }
    /// Whether one more could come from there.
    bool hasRoom() {
        const UniqueFd place(velt_count_stranger(file_.c_str(), &address_));
        return static_cast<bool>(place);
    }
    /// All places of 192.0.2.7 but so many.
    std::vector<UniqueFd> takeAllBut(int left) {
        std::vector<UniqueFd> places;
        for (int i = left; i < velt_most_strangers; i++) {
            EXPECT_TRUE(places.emplace_back(velt_count_stranger(file_.c_str(), &address_)));
        }
        return places;
    }

    const std::string board_ = folder_.path() / "board";
    const std::string file_ = board_ + ".strangers";
    const std::string program_ = script("exit 0\n");
    in6_addr address_{{{0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0xff, 0xff, 192, 0, 2, 7}}};
};

TEST_F(Strangers, countUntilTheyHaveLoggedIn) {
    const auto others = takeAllBut(1);
    EXPECT_FALSE(isSentAway());
    EXPECT_FALSE(hasRoom()) << "that one counts";
    connect_from(nullptr, nullptr, nullptr);
    EXPECT_EQ(logIn(program_, true, true, -1), login_wrong);
    EXPECT_FALSE(hasRoom()) << "after a wrong password, too";
    EXPECT_EQ(logIn(program_), login_granted);
    EXPECT_TRUE(hasRoom());
}

TEST_F(Strangers, areSentAwayWhenTheyAreTooMany) {
    const auto others = takeAllBut(0);
    EXPECT_TRUE(isSentAway());
    EXPECT_STREQ(logged(), "refused a connection from 192.0.2.7: 100 of this address are not logged in");
    EXPECT_EQ(rights_taken(), 0);
    comeFrom("192.0.2.7", "192.0.2.0/24");
    EXPECT_FALSE(isSentAway()) << "spared";
    comeFrom("192.0.2.7", "192.0.3.0/24");
    EXPECT_TRUE(isSentAway());
}

TEST_F(Strangers, areServedWhereTheyCannotBeCounted) {
    connect_from("192.0.2.7", "/proc/none/board", nullptr);
    EXPECT_FALSE(isSentAway());
    EXPECT_NE(std::string(logged()).find("cannot be counted: "), std::string::npos) << logged();
    const std::string path(5000, 'x');
    connect_from("192.0.2.7", path.c_str(), nullptr);
    EXPECT_FALSE(isSentAway());
}

TEST_F(Strangers, ofLoopbackAreAsManyAsTheyLike) {
    address_ = {{{0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0xff, 0xff, 127, 0, 0, 9}}};
    const auto others = takeAllBut(0);
    comeFrom("127.0.0.9");
    EXPECT_FALSE(isSentAway());
}

TEST_F(LoginModule, doesNothingForAWrongPassword) {
    EXPECT_EQ(logIn(script("touch \"$1/ran\"\n"), true, true, -1), login_wrong);
    EXPECT_STREQ(logged(), "mod_velt_login: password refused from 192.0.2.7");
    EXPECT_FALSE(std::filesystem::exists(folder_.path() / "ran"));
}

TEST_F(LoginModule, endsASessionThatChangesItsRootWithoutIt) {
    const auto program = script("exit 0\n");
    const login_world world{program.c_str(), folder_.path().c_str(), 1, 1, 0, home_.c_str()};
    EXPECT_EQ(change_root_unasked(&world), login_disconnected);
}

TEST_F(LoginModule, waitsForAProgramNoLongerThanItSays) {
    const auto program = script("exec sleep 30\n");
    std::array<char*, 2> arguments{const_cast<char*>(program.c_str()), nullptr};
    std::array<char, 64> words{};
    const auto start = std::chrono::steady_clock::now();
    EXPECT_EQ(velt_run_login_program(arguments.data(), 1, words.data(), words.size()), 0);
    EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(5));
    EXPECT_STREQ(words.data(), "no result within 1 s");
    EXPECT_EQ(waitpid(-1, nullptr, WNOHANG), -1) << "the program has been ended";
}

TEST_F(LoginModule, givesNoFileOfTheDaemonToTheProgram) {
    const int keys = fcntl(STDIN_FILENO, F_DUPFD, 100);
    ASSERT_GE(keys, 100);
    EXPECT_EQ(logIn(script("test ! -e /proc/self/fd/" + std::to_string(keys) + "\n")), login_granted)
        << logged();
    close(keys);
}

TEST_F(LoginModule, givesBackTheRightsThatItTakes) {
    logIn(script("exit 0\n"));
    EXPECT_EQ(rights_taken(), 0);
    logIn(script("exit 1\n"));
    EXPECT_EQ(rights_taken(), 0);
}

TEST_F(LoginModule, cutsLongWords) {
    const auto program =
        script("i=0; while [ $i -lt 2000 ]; do echo 0123456789012345 >&2; i=$((i+1)); done; exit 1\n");
    std::array<char*, 2> arguments{const_cast<char*>(program.c_str()), nullptr};
    std::array<char, 20> words{};
    words.fill('x');
    EXPECT_EQ(velt_run_login_program(arguments.data(), 10, words.data(), words.size()), 0);
    EXPECT_STREQ(words.data(), "0123456789012345 01");
}

TEST_F(LoginModule, letsNoFileRunWithItsOwnersRights) {
    ASSERT_EQ(logIn(script("")), login_granted);
    const std::string file = folder_.write("file", "").string();
    const UniqueFd opened(open(file.c_str(), O_RDONLY | O_CLOEXEC));
    const auto modeOf = [&] {
        struct stat status {};
        return stat(file.c_str(), &status) == 0 ? status.st_mode & 07777U : 0;
    };
    EXPECT_EQ(change_mode_as_the_daemon(file.c_str(), 0751), 0);
    EXPECT_EQ(modeOf(), 0751U);
    EXPECT_EQ(change_mode_of_open_file_as_the_daemon(file.c_str(), opened.get(), 01640), 0);
    EXPECT_EQ(modeOf(), 01640U);
    for (const unsigned mode : {04640U, 02640U, 06777U}) {
        EXPECT_EQ(change_mode_as_the_daemon(file.c_str(), mode), -1) << mode;
        EXPECT_EQ(errno, EPERM);
        EXPECT_EQ(change_mode_of_open_file_as_the_daemon(file.c_str(), opened.get(), mode), -1) << mode;
    }
    EXPECT_EQ(modeOf(), 01640U);
}

TEST_F(LoginModule, opensFilesAsTheDaemonWould) {
    ASSERT_EQ(logIn(script("")), login_granted);
    const std::string file = folder_.write("file", "content").string();
    std::filesystem::create_symlink("file", folder_.path() / "link");
    std::filesystem::create_symlink("made", folder_.path() / "dangling");
    std::filesystem::create_symlink("turn", folder_.path() / "turn");
    const auto writes = [&](const std::string& name, int flags) {
        const UniqueFd opened(open_as_the_daemon((folder_.path() / name).c_str(), flags));
        return opened && write(opened.get(), "new", 3) == 3;
    };
    EXPECT_TRUE(writes("link", O_WRONLY | O_APPEND));
    EXPECT_EQ(folder_.read("file"), "contentnew");
    EXPECT_TRUE(writes("dangling", O_WRONLY | O_CREAT));
    EXPECT_EQ(folder_.read("made"), "new");
    EXPECT_FALSE(writes("file", O_RDONLY));
    EXPECT_FALSE(writes("turn", O_WRONLY | O_CREAT));
    EXPECT_EQ(errno, ELOOP);
    EXPECT_FALSE(writes("absent", O_WRONLY));
    EXPECT_EQ(errno, ENOENT);
    EXPECT_FALSE(writes("file/below", O_WRONLY | O_CREAT));
    EXPECT_EQ(errno, ENOTDIR);
    EXPECT_FALSE(writes(std::string(PATH_MAX, 'x'), O_WRONLY | O_CREAT));
    EXPECT_EQ(errno, ENAMETOOLONG);
    EXPECT_EQ(cut_as_the_daemon((folder_.path() / "link").c_str(), 7), 0);
    EXPECT_EQ(folder_.read("file"), "content");
    EXPECT_EQ(move_as_the_daemon((folder_.path() / "link").c_str(), (folder_.path() / "moved").c_str()), 0);
    EXPECT_TRUE(std::filesystem::is_symlink(folder_.path() / "moved"));
}

TEST_F(LoginModule, letsNobodyMakeLinks) {
    ASSERT_EQ(logIn(script("")), login_granted);
    const std::string file = folder_.write("file", "").string();
    EXPECT_EQ(link_as_the_daemon(file.c_str(), (folder_.path() / "link").c_str()), -2);
    EXPECT_EQ(errno, EPERM);
    EXPECT_FALSE(std::filesystem::exists(folder_.path() / "link"));
}

TEST_F(LoginModule, leavesNoDescriptorBehind) {
    const auto count = [] { return std::distance(std::filesystem::directory_iterator("/proc/self/fd"), {}); };
    logIn(script("exit 0\n")); // a session looks at some files until its end
    const auto before = count();
    logIn(script("exit 0\n"));
    logIn(script("exit 1\n"));
    logIn((folder_.path() / "absent").string());
    ASSERT_EQ(logIn(script("")), login_granted);
    const std::string file = folder_.write("file", "").string();
    for (const std::string& path : {file, file + "/below", file + "/no/folder"}) {
        change_mode_as_the_daemon(path.c_str(), 0777);
        move_as_the_daemon(path.c_str(), path.c_str());
    }
    EXPECT_EQ(count(), before);
}

} // namespace
} // namespace velt::test
