// The FTP daemon's module while one system call after another fails: a login that should be refused is, and
// what a session may not change it does not change.
#include "base/unique_fd.h"
#include "tests/support/fault_sweep.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

extern "C" {
#include "tests/standalone/login/stand_in_daemon.h"
}

#include <filesystem>
#include <string>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

/// A home whose kept files lie behind links, as some people have them.
class ModuleFaults : public testing::Test {
protected:
    void SetUp() override {
        fs::create_directory(home_);
        root_.write("etc/velt/chroot_rules", "");
        bringBack();
        script("exit 0\n");
    }

    void bringBack() const {
        fs::remove_all(home_);
        root_.write("home/dots/keys/authorized_keys", "old");
        root_.write("home/dots/rc", "old");
        root_.write("home/.profile", "old");
        root_.write("home/letter", "old");
        fs::create_directory_symlink("dots/keys", home_ / ".ssh");
        fs::create_symlink("dots/rc", home_ / ".bashrc");
        fs::create_hard_link(home_ / "dots/rc", home_ / "twin");
    }

    /// Not those of the program.
    static bool isTheModules(const SeenCall& call) { return call.program != "program" && !isLoading(call); }

    void script(const std::string& text) const {
        chmod(root_.write("program", "#!/bin/sh\n" + text).c_str(), 0755);
    }

    login_end logIn() const {
        const std::string program = root_.path() / "program";
        const login_world world{program.c_str(), root_.path().c_str(), 1, 1, 0, home_.c_str()};
        return log_in(&world);
    }

    /// What each session might try with a path of the home.
    void tryToChange(const char* path) const {
        const std::string place = home_ / path;
        if (const UniqueFd file(open_as_the_daemon(place.c_str(), O_WRONLY | O_TRUNC)); file) {
            (void)::write(file.get(), "new", 3);
        }
        cut_as_the_daemon(place.c_str(), 1);
        change_mode_as_the_daemon(place.c_str(), 0666);
        move_as_the_daemon(place.c_str(), (home_ / "moved").c_str());
        move_as_the_daemon((home_ / "letter").c_str(), place.c_str());
    }

    /// How the kept files are, which no session changes.
    std::string keptFiles() const {
        std::string all;
        for (const char* file : {".profile", ".bashrc", ".ssh/authorized_keys", "dots/rc",
                                 "dots/keys/authorized_keys", "twin"}) {
            struct stat status {};
            const std::string path = home_ / file;
            const bool there = stat(path.c_str(), &status) == 0;
            all += std::string(file) + " " + (there ? root_.read("home/" + std::string(file)) : "gone") +
                   " " + std::to_string(status.st_mode & 0777) + "\n";
        }
        return all;
    }

    TemporaryFolder root_;
    const fs::path home_ = root_.path() / "home";
};

TEST_F(ModuleFaults, LetNobodyInWhomTheProgramRefuses) {
    script("echo no >&2; exit 1\n");
    FaultSweep sweep;
    sweep.prepare = [] {};
    sweep.counts = isTheModules;
    sweep.act = [this] { return std::string(logIn() == login_granted ? "granted" : "refused"); };
    sweep.check = [](const SweptRun& run) { EXPECT_EQ(run.end.told, "refused"); };
    EXPECT_GE(sweepFaults(sweep), 15);
}

TEST_F(ModuleFaults, AtALoginLeaveNoKeptFileOpen) {
    const std::string kept = keptFiles();
    FaultSweep sweep;
    sweep.prepare = [this] { bringBack(); };
    sweep.counts = isTheModules;
    sweep.act = [this] {
        const login_end end = logIn();
        endFaults();
        if (end == login_granted) {
            for (const char* path :
                 {".ssh/authorized_keys", "dots/keys/authorized_keys", "dots/rc", "twin", ".profile"}) {
                tryToChange(path);
            }
        }
        return std::string(end == login_granted ? "granted" : "refused");
    };
    sweep.check = [&](const SweptRun&) { EXPECT_EQ(keptFiles(), kept); };
    EXPECT_GE(sweepFaults(sweep), 20);
}

class ChangeFaults : public ModuleFaults, public testing::WithParamInterface<const char*> {};

TEST_P(ChangeFaults, LeaveKeptFilesAsTheyAre) {
    const std::string kept = keptFiles();
    FaultSweep sweep;
    sweep.prepare = [this] {
        bringBack();
        ASSERT_EQ(logIn(), login_granted);
    };
    sweep.act = [this] {
        tryToChange(GetParam());
        return std::string("tried");
    };
    sweep.check = [&](const SweptRun& run) {
        EXPECT_EQ(run.end.told, "tried");
        EXPECT_EQ(keptFiles(), kept);
    };
    EXPECT_GE(sweepFaults(sweep), 8);
}

INSTANTIATE_TEST_SUITE_P(All, ChangeFaults,
                         testing::Values(".ssh/authorized_keys", ".ssh", ".bashrc",
                                         "dots/keys/authorized_keys", "dots/rc", "twin", ".profile", "dots"));

} // namespace
} // namespace velt::test
