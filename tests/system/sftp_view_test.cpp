// What a login over SFTP sees and may change while SFTP is confined.
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/daemons/sshd/sshd_plan.h"
#include "tests/support/files.h"
#include "tests/support/text.h"
#include "tests/support/waiting.h"
#include "tests/system/support/sftp_session.h"
#include "tests/system/support/shared_folders.h"

#include <unistd.h>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

constexpr auto none = Access::none;
constexpr auto write = Access::write;

const fs::path home = "/mnt/home/alice";

class SftpView : public SharedFolders {
protected:
    void startHomes() {
        record.user_chroot = 1;
        startSftp();
    }
    SftpSession logIn(const std::string& user = "alice") {
        SftpSession session(sftpPort, user);
        EXPECT_TRUE(session.isOpen()) << session.words() << DaemonProcess::output();
        return session;
    }
};

TEST_F(SftpView, isNoneWhereNobodyKnowsWhatMayBeSeen) {
    share("rw", {{"alice", write}});
    startSftp();
    const auto expectRefused = [&](const char* why) {
        EXPECT_FALSE(SftpSession(sftpPort, "alice").isOpen()) << why;
        EXPECT_TRUE(contains(DaemonProcess::output(), "velt-sftp-session: login of 'alice' refused: "))
            << why;
    };
    const fs::path shares = statePath(paths::shares);
    const std::string text = contentsOf(shares);
    writeFile(shares, text.substr(0, text.size() / 2));
    expectRefused("damaged shares");
    writeFile(shares, text);
    EXPECT_TRUE(SftpSession(sftpPort, "alice").isOpen());
    writeFile(statePath(paths::ftpSettings), "nonsense");
    expectRefused("damaged settings");
    fs::remove(statePath(paths::ftpSettings));
    fs::remove(statePath(paths::chrootRules));
    expectRefused("no rules");
}

TEST_F(SftpView, isAnEmptyFolderWithoutOurLibrary) {
    share("rw", {{"alice", write}});
    startSftp();
    const auto plan = planSftpDaemon();
    ASSERT_EQ(messageOf(plan), "");
    DaemonOrder bare = (*plan)->order;
    std::erase_if(bare.arguments, [](const std::string& word) { return word.starts_with("LD_PRELOAD="); });
    ASSERT_EQ(bare.arguments.size() + 1, (*plan)->order.arguments.size());
    bare.arguments.insert(bare.arguments.end(), {"-o", "Port=2223"});
    bare.ports = {2222, 2223};
    DaemonProcess daemon;
    stopSftp();
    ASSERT_TRUE(daemon.start(bare));
    SftpSession session(2223, "alice");
    EXPECT_EQ(joined(session.list("/")), "");
    EXPECT_FALSE(session.receive("/etc/passwd"));
    daemon.stop();
}

// Beside what homes_own_files_test.cpp tries over each protocol.
TEST_F(SftpView, keepsTheFilesThatProgramsObey) {
    fs::create_directories(home / ".ssh");
    ASSERT_EQ(chown((home / ".ssh").c_str(), aliceId, aliceId), 0);
    writeFile(home / ".ssh/authorized_keys", "key", aliceId);
    ASSERT_EQ(chmod((home / ".ssh/authorized_keys").c_str(), 0644), 0);
    startHomes();
    auto session = logIn();
    EXPECT_EQ(session.realPath("."), "/");
    for (const char* path : {"/.ssh/authorized_keys", "/.ssh"}) {
        EXPECT_EQ(session.setModeOfLink(path, 0777), sftpDenied) << path;
        EXPECT_EQ(session.setOwner(path, aliceId, 2001), sftpDenied) << path;
    }
    EXPECT_EQ(session.setTimesOfOpen("/.ssh/authorized_keys", 1000), sftpDenied);
    ASSERT_EQ(session.symbolicLink("/.ssh/authorized_keys", "/way"), sftpGood);
    EXPECT_EQ(session.send("/way", "x"), sftpDenied);
    EXPECT_EQ(session.setModeOfOpen("/way", 0666), sftpDenied);
    EXPECT_EQ(contentsOf(home / ".ssh/authorized_keys"), "key");
    EXPECT_EQ(modeOf(home / ".ssh/authorized_keys"), 0644U);
}

TEST_F(SftpView, setsOfAnOpenFileWhatItMaySetOfItsPath) {
    startHomes();
    fs::create_directories(home / ".ssh");
    writeFile(home / ".ssh/key", "key", aliceId);
    auto session = logIn();
    EXPECT_EQ(session.setModeOfOpen("/home-of", 0640), sftpGood);
    EXPECT_EQ(session.setTimesOfOpen("/home-of", 1000), sftpGood);
    EXPECT_EQ(modeOf(home / "home-of"), 0640U);
    ASSERT_EQ(session.symbolicLink("/.ssh/key", "/way"), sftpGood);
    const auto handle = session.open("/way", sftpRead);
    ASSERT_TRUE(handle);
    ASSERT_EQ(session.remove("/way"), sftpGood);
    ASSERT_EQ(session.symbolicLink("/home-of", "/way"), sftpGood);
    EXPECT_EQ(session.setModeOfHandle(*handle, 0777), sftpDenied) << "its path leads elsewhere by now";
}

TEST_F(SftpView, letsNoFileRunWithTheRightsOfItsOwnerOrGroup) {
    startHomes();
    auto session = logIn();
    for (const std::uint32_t mode : {04755U, 02755U, 06777U}) {
        EXPECT_EQ(session.setMode("/home-of", mode), sftpDenied);
        EXPECT_EQ(session.setModeOfOpen("/home-of", mode), sftpDenied);
        EXPECT_EQ(session.send("/new", "x", sftpWrite | sftpMake, mode), sftpDenied);
    }
    EXPECT_FALSE(fs::exists(home / "new"));
    EXPECT_EQ(session.setMode("/home-of", 0700), sftpGood);
    EXPECT_EQ(modeOf(home / "home-of"), 0700U);
}

TEST_F(SftpView, makesLinksThatLeadOutOfItNowhere) {
    share("rw", {{"alice", write}});
    startSftp();
    auto session = logIn();
    for (const char* target : {"/etc/passwd", "../../etc/passwd", "/mnt/home/bob/home-of"}) {
        ASSERT_EQ(session.symbolicLink(target, "/rw/link"), sftpGood) << target;
        EXPECT_EQ(session.target("/rw/link"), target);
        EXPECT_FALSE(session.receive("/rw/link")) << target;
        EXPECT_EQ(session.send("/rw/link", "x"), sftpAbsent) << target;
        ASSERT_EQ(session.remove("/rw/link"), sftpGood);
    }
}

TEST_F(SftpView, isTheSameForEachChannelAndProgramOfAConnection) {
    startHomes();
    logIn(); // and with it the program that tells ssh the password
    const fs::path got = "/mnt/srv/got";
    fs::create_directories(got.parent_path());
    const auto client = [](std::vector<std::string> arguments, const std::string& commands) {
        arguments.insert(arguments.begin() + 1,
                         {"-F", "/dev/null", "-o", "StrictHostKeyChecking=no", "-o",
                          "UserKnownHostsFile=/dev/null", "-o", "Port=2222", "-o", "LogLevel=ERROR", "-o",
                          "ControlMaster=auto", "-o", "ControlPath=/mnt/srv/channels", "-o",
                          "ControlPersist=30", "-o", "BatchMode=no"});
        arguments.insert(arguments.begin(), {"env", "SSH_ASKPASS=/mnt/tell-password",
                                             "SSH_ASKPASS_REQUIRE=force", "VELT_PASSWORD=alice-secret"});
        return runProcess(arguments, commands, std::chrono::seconds(20));
    };
    const std::string alice = "alice@127.0.0.1";
    for (const char* channel : {"first", "second"}) {
        const auto listed =
            client({"sftp", "-b", "-", alice}, "ls -1 /\nget /home-of " + got.string() + "\n");
        EXPECT_EQ(listed.exitCode, 0) << channel << listed.errors;
        EXPECT_TRUE(contains(listed.output, "\n/home-of\n")) << listed.output;
        EXPECT_NE(client({"sftp", "-b", "-", alice}, "get /etc/passwd " + got.string() + "\n").exitCode, 0);
        EXPECT_EQ(contentsOf(got), "alice");
        fs::remove(got);
    }
    EXPECT_EQ(client({"scp", alice + ":/home-of", got.string()}, "").exitCode, 0);
    EXPECT_EQ(contentsOf(got), "alice");
    fs::remove(got);
    EXPECT_NE(client({"scp", alice + ":/etc/passwd", got.string()}, "").exitCode, 0);
    EXPECT_NE(client({"scp", "-O", alice + ":/home-of", got.string()}, "").exitCode, 0);
    EXPECT_FALSE(fs::exists(got));
    for (const char* command : {"id", "/bin/sh", "internal-sftp; id"}) {
        const auto executed = client({"ssh", alice, command}, "");
        EXPECT_FALSE(contains(executed.output, "uid=")) << command;
        EXPECT_NE(executed.exitCode, 0) << command;
    }
    client({"ssh", "-O", "exit", alice}, "");
}

TEST_F(SftpView, isNotServedWhereNobodyMayMount) {
    startSftp();
    const auto plan = planSftpDaemon();
    ASSERT_EQ(messageOf(plan), "");
    stopSftp();
    // A child of its start may have the socket for a moment more.
    ASSERT_TRUE(waitUntil([] { return !isListening(sftpPort); }, patience));
    DaemonOrder order = (*plan)->order;
    order.arguments.insert(order.arguments.begin(),
                           {"/usr/bin/setpriv", "--bounding-set", "-sys_admin", "--inh-caps", "-sys_admin"});
    DaemonProcess daemon;
    EXPECT_FALSE(daemon.start(order));
    EXPECT_TRUE(contains(DaemonProcess::output(),
                         "SFTP sessions cannot be confined here: cannot make a mount "
                         "namespace: Operation not permitted"))
        << DaemonProcess::output();
}

TEST_F(SftpView, isTheWholeServerWhereItIsNotConfined) {
    share("no", {{"alice", none}});
    startSftp(false);
    auto session = logIn();
    EXPECT_EQ(session.realPath("."), home.string());
    EXPECT_EQ(session.receive("/mnt/srv/no/file"), "no");
}

} // namespace
} // namespace velt::test
