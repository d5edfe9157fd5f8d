// The SFTP service with real clients.
#include "platform/sftp.h"
#include "standalone/contract/last_error.h"
#include "standalone/core/state_root.h"
#include "standalone/daemons/sshd/sshd_plan.h"
#include "standalone/rules/rule_store.h"
#include "tests/standalone/support/store_shares.h"
#include "tests/support/files.h"
#include "tests/support/result.h"
#include "tests/support/run_program.h"
#include "tests/system/support/daemon_process.h"
#include "tests/system/support/ftp_service.h"
#include "tests/system/support/private_world.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

class SftpService : public testing::Test {
protected:
    static constexpr int port = 2222;

    void SetUp() override {
        if (!whyNoWorld().empty()) {
            GTEST_SKIP() << whyNoWorld();
        }
        setenv("VELT_LIBEXEC_DIR", VELT_BUILT_FOLDER, 1);
        setStateRoot(worldRoot);
        const auto made = runProcess({"ssh-keygen", "-q", "-t", "ed25519", "-N", "", "-f", key_});
        ASSERT_EQ(made.exitCode, 0) << made.errors;
        allow("/mnt/home/alice", aliceId);
        writeFile("/mnt/home/alice/file", "contents", aliceId);
    }
    void TearDown() override {
        daemon_.stop();
        if (!accounts_.empty()) {
            std::ofstream("/etc/passwd") << accounts_;
        }
        for (const fs::path& path :
             {fs::path(key_), fs::path(key_ + ".pub"), fs::path("/mnt/known"),
              fs::path("/mnt/home/alice/.ssh"), fs::path("/mnt/home/alice/file"), fs::path("/mnt/home/root"),
              worldRoot / "etc", worldRoot / "run", worldRoot / "var"}) {
            std::error_code error;
            fs::remove_all(path, error);
        }
    }

    void allow(const fs::path& home, unsigned id) {
        fs::create_directories(home / ".ssh");
        writeFile(home / ".ssh" / "authorized_keys", contentsOf(key_ + ".pub"), id);
        ASSERT_EQ(chown((home / ".ssh").c_str(), id, id), 0);
    }

    /// Until the end of the test.
    void changeAccount(const std::string& from, const std::string& to) {
        accounts_ = contentsOf("/etc/passwd");
        std::string changed = accounts_;
        ASSERT_NE(changed.find(from), std::string::npos);
        std::ofstream("/etc/passwd") << changed.replace(changed.find(from), from.size(), to);
    }

    void start(int atPort) {
        daemon_.stop();
        ASSERT_EQ(VELTSFTPConfigSet(1, atPort), 0) << lastErrorSentence();
        const auto plan = planSftpDaemon();
        ASSERT_EQ(messageOf(plan), "");
        EXPECT_EQ((*plan)->order.ports, std::vector<int>{atPort});
        ASSERT_TRUE(daemon_.start((*plan)->order));
        std::string known;
        for (const char* kind : {"ed25519", "rsa"}) {
            known += "[127.0.0.1]:" + std::to_string(atPort) + ' ' +
                     contentsOf(worldRoot / "var/lib/velt/ssh" / ("host_" + std::string(kind) + "_key.pub"));
        }
        writeFile("/mnt/known", known);
    }

    std::vector<std::string> client(const std::string& program, int atPort) const {
        return {program,
                "-F",
                "/dev/null",
                "-i",
                key_,
                "-o",
                "Port=" + std::to_string(atPort),
                "-o",
                "BatchMode=yes",
                "-o",
                "StrictHostKeyChecking=yes",
                "-o",
                "UserKnownHostsFile=/mnt/known"};
    }
    ProcessResult sftp(const std::string& commands, const std::string& user = "alice", int atPort = port) {
        auto arguments = client("sftp", atPort);
        arguments.insert(arguments.end(), {"-b", "-", user + "@127.0.0.1"});
        return runProcess(arguments, commands, std::chrono::seconds(20));
    }

    const std::string key_ = "/mnt/key";
    std::string accounts_; ///< before a change of the test's; "" for none
    DaemonProcess daemon_;
};

TEST_F(SftpService, transfersFilesBothWays) {
    start(port);
    const auto result = sftp("get file /mnt/got\nput /etc/hostname sent\n");
    EXPECT_EQ(result.exitCode, 0) << result.errors;
    EXPECT_EQ(contentsOf("/mnt/got"), "contents");
    EXPECT_EQ(contentsOf("/mnt/home/alice/sent"), contentsOf("/etc/hostname"));
    fs::remove("/mnt/got");
    fs::remove("/mnt/home/alice/sent");
}

TEST_F(SftpService, givesNoShellAndForwardsNothing) {
    changeAccount("/mnt/home/alice:/usr/sbin/nologin", "/mnt/home/alice:/bin/sh");
    start(port);
    auto shell = client("ssh", port);
    shell.insert(shell.end(), {"alice@127.0.0.1", "id"});
    const auto refused = runProcess(shell, {}, std::chrono::seconds(20));
    EXPECT_NE(refused.exitCode, 0);
    EXPECT_EQ(refused.output.find("uid="), std::string::npos);

    auto forward = client("ssh", port);
    forward.insert(forward.end(), {"-W", "127.0.0.1:" + std::to_string(port), "alice@127.0.0.1"});
    const auto tunnel = runProcess(forward, {}, std::chrono::seconds(20));
    EXPECT_NE(tunnel.exitCode, 0);
    EXPECT_EQ(tunnel.output.find("SSH-2.0"), std::string::npos) << tunnel.output;

    for (const std::string& from : {std::to_string(port + 1), std::string("/mnt/home/alice/forwarded")}) {
        auto back = client("ssh", port);
        back.insert(back.end(), {"-N", "-o", "ExitOnForwardFailure=yes", "-R",
                                 from + ":127.0.0.1:" + std::to_string(port), "alice@127.0.0.1"});
        const auto listening = runProcess(back, {}, std::chrono::seconds(20));
        EXPECT_EQ(listening.exitCode, 255) << "ssh ends by itself, since it was refused";
        EXPECT_NE(listening.errors.find("forwarding failed"), std::string::npos) << listening.errors;
    }
}

TEST_F(SftpService, aKeyThatIsRestrictedToACommandOpensNothing) {
    const fs::path keys = "/mnt/home/alice/.ssh/authorized_keys";
    const std::string key = contentsOf(key_ + ".pub");
    start(port);
    for (const char* const options : {"restrict,command=\"/bin/false\" ", "COMMAND=\"internal-sftp -R\" "}) {
        writeFile(keys, options + key, aliceId);
        EXPECT_NE(sftp("get file /mnt/got\n").exitCode, 0) << options;
        EXPECT_FALSE(fs::exists("/mnt/got"));
    }
    writeFile(keys, "restrict,from=\"127.0.0.1\" " + key, aliceId);
    EXPECT_EQ(sftp("ls file\n").exitCode, 0);
    fs::permissions(keys, fs::perms(0620));
    EXPECT_NE(sftp("ls file\n").exitCode, 0) << "others may have written the key";
}

TEST_F(SftpService, aCertificateThatIsRestrictedToACommandOpensNothing) {
    const std::string certificate = key_ + "-cert.pub";
    const auto sign = [&](std::vector<std::string> options) {
        std::vector<std::string> arguments{"ssh-keygen", "-q", "-s", key_, "-I", "id", "-n", "alice"};
        arguments.insert(arguments.end(), options.begin(), options.end());
        arguments.push_back(key_ + ".pub");
        const auto signing = runProcess(arguments);
        EXPECT_EQ(signing.exitCode, 0) << signing.errors;
    };
    writeFile("/mnt/home/alice/.ssh/authorized_keys", "cert-authority " + contentsOf(key_ + ".pub"), aliceId);
    start(port);
    EXPECT_NE(sftp("ls file\n").exitCode, 0) << "it is the authority's key";
    sign({});
    EXPECT_EQ(sftp("ls file\n").exitCode, 0);
    sign({"-O", "force-command=/bin/false"});
    EXPECT_NE(sftp("ls file\n").exitCode, 0);
    fs::remove(certificate);
}

TEST_F(SftpService, refusesRootAndStrangers) {
    changeAccount("root:/root:", "root:/mnt/home/root:");
    allow("/mnt/home/root", 0);
    start(port);
    EXPECT_NE(sftp("pwd\n", "root").exitCode, 0) << "whatever key root has";
    EXPECT_NE(sftp("pwd\n", "carol").exitCode, 0) << "she has no key here";
}

TEST_F(SftpService, whoDoesNotLogInKeepsNobodyOut) {
    start(port);
    std::vector<UniqueFd> silent;
    for (int i = 0; i < 250; i++) {
        silent.push_back(connectTo("127.0.0.1", port, "127.0.0.2"));
    }
    for (int i = 0; i < 5; i++) {
        EXPECT_EQ(sftp("ls file\n").exitCode, 0);
    }
}

// Rules and grants are FTP's; here the modes must say the same.
TEST_F(SftpService, goesByTheRightsOfTheFileSystemAlone) {
    fs::create_directories("/mnt/srv/share");
    writeFile("/mnt/srv/share/open", "for all");
    writeFile("/mnt/srv/share/own", "for root");
    fs::permissions("/mnt/srv/share/own", fs::perms(0600));
    const ShareEntry share{"share", "", "/mnt/srv/share", true, {{"alice", Access::none}}, {}};
    ASSERT_EQ(messageOf(storeShares({share})), "");
    ASSERT_EQ(messageOf(velt::storeRules({{true, aliceId, "/home"}})), "");
    start(port);
    EXPECT_EQ(sftp("get /mnt/srv/share/open /mnt/got\n").exitCode, 0);
    EXPECT_EQ(contentsOf("/mnt/got"), "for all");
    EXPECT_NE(sftp("get /mnt/srv/share/own /mnt/got\n").exitCode, 0);
    fs::remove("/mnt/got");
    fs::remove_all("/mnt/srv/share");
}

TEST_F(SftpService, listensOnTheStoredPortOnly) {
    start(port);
    start(2223);
    EXPECT_EQ(sftp("pwd\n", "alice", 2223).exitCode, 0);
    EXPECT_FALSE(isListening(port));
}

TEST_F(SftpService, keepsItsIdentityOverRestarts) {
    start(port);
    const std::string first = contentsOf("/mnt/known");
    start(port);
    EXPECT_EQ(contentsOf("/mnt/known"), first);
    EXPECT_EQ(sftp("pwd\n").exitCode, 0);
}

} // namespace
} // namespace velt::test
