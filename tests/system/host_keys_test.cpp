// The public keys that administrators manage, and what they open.
#include "tests/support/files.h"
#include "tests/support/text.h"
#include "tests/system/support/host_service.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <utility>
#include <vector>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

class HostUserKeys : public HostService {
protected:
    static constexpr int sftpPort = 2222;

    void SetUp() override {
        HostService::SetUp();
        if (IsSkipped() || HasFatalFailure()) {
            return;
        }
        accounts_ = contentsOf("/etc/passwd");
        for (const char* name : {"key", "other"}) {
            makeKey(name);
        }
        writeFile("/mnt/home/alice/file", "contents", aliceId);
        done({"sftp", "set", "enable=on", "portnum=" + std::to_string(sftpPort)});
    }

    void TearDown() override {
        if (!accounts_.empty()) {
            std::ofstream("/etc/passwd") << accounts_;
        }
        fs::remove_all("/mnt/home/alice/.ssh");
        HostService::TearDown();
    }

    static void makeKey(const std::string& name) {
        const auto made = runProcess(
            {"ssh-keygen", "-q", "-t", "ed25519", "-N", "", "-C", "alice@" + name, "-f", "/mnt/srv/" + name});
        ASSERT_EQ(made.exitCode, 0) << made.errors;
    }

    static std::string lineOf(const std::string& name) { return contentsOf("/mnt/srv/" + name + ".pub"); }

    static std::string fingerprintOf(const std::string& name) {
        const std::string shown = runProcess({"ssh-keygen", "-lf", "/mnt/srv/" + name + ".pub"}).output;
        const auto begin = shown.find("SHA256:");
        return shown.substr(begin, shown.find(' ', begin) - begin);
    }

    /// Whether the key lets alice fetch her file over SFTP.
    static bool opens(const std::string& name) {
        const auto ended =
            runProcess({"sftp", "-F", "/dev/null", "-i", "/mnt/srv/" + name, "-P", std::to_string(sftpPort),
                        "-o", "BatchMode=yes", "-o", "IdentitiesOnly=yes", "-o", "StrictHostKeyChecking=no",
                        "-o", "UserKnownHostsFile=/dev/null", "-b", "-", "alice@127.0.0.1"},
                       "get file /mnt/srv/got\n", std::chrono::seconds(30));
        const bool got = fs::remove("/mnt/srv/got");
        return ended.exitCode == 0 && got;
    }

    static void allowByOwnFile(const std::string& name) {
        fs::create_directories("/mnt/home/alice/.ssh");
        writeFile("/mnt/home/alice/.ssh/authorized_keys", lineOf(name), aliceId);
        ASSERT_EQ(chown("/mnt/home/alice/.ssh", aliceId, aliceId), 0);
    }

    static fs::path stored() { return worldRoot / "etc/velt/keys/alice"; }

    static void replaceInStored(const std::string& from, const std::string& to) {
        std::string text = contentsOf(stored());
        ASSERT_NE(text.find(from), std::string::npos) << text;
        std::ofstream(stored()) << text.replace(text.find(from), from.size(), to);
    }

    void changeAccount(const std::string& from, const std::string& to) const {
        std::string changed = accounts_;
        ASSERT_NE(changed.find(from), std::string::npos) << changed;
        std::ofstream("/etc/passwd") << changed.replace(changed.find(from), from.size(), to);
    }

    std::string accounts_;
};

TEST_F(HostUserKeys, openSftpUntilTheyAreRemoved) {
    ASSERT_FALSE(fs::exists("/mnt/home/alice/.ssh"));
    EXPECT_FALSE(opens("key"));
    const std::string fingerprint = fingerprintOf("key");
    EXPECT_EQ(done({"keys", "add", "alice", "/mnt/srv/key.pub"}),
              "alice can log in over SFTP with the key " + fingerprint + ".\n");
    EXPECT_TRUE(opens("key"));
    EXPECT_FALSE(opens("other"));
    EXPECT_EQ(veltctl({"keys", "add", "alice", lineOf("key")}).exitCode, 4) << "it is there";
    EXPECT_TRUE(contains(done({"keys", "list", "alice"}), fingerprint + "  ssh-ed25519  256   alice@key"));
    done({"keys", "remove", "alice", "alice@key"});
    EXPECT_FALSE(opens("key"));
    EXPECT_EQ(veltctl({"keys", "remove", "alice", fingerprint}).exitCode, 3);
    const std::string log = done({"log"});
    EXPECT_TRUE(
        contains(log, "The key " + fingerprint + " (ssh-ed25519, alice@key) was added for \"alice\"."))
        << log;
    EXPECT_TRUE(
        contains(log, "The key " + fingerprint + " (ssh-ed25519, alice@key) of \"alice\" was removed."))
        << log;
}

TEST_F(HostUserKeys, standBesideTheUsersOwn) {
    allowByOwnFile("other");
    done({"keys", "add", "alice", "-"}, lineOf("key"));
    EXPECT_TRUE(opens("key"));
    EXPECT_TRUE(opens("other"));
    ASSERT_EQ(chmod("/mnt/home/alice/.ssh/authorized_keys", 0666), 0);
    EXPECT_TRUE(opens("key")) << "although the own file cannot be trusted";
    EXPECT_FALSE(opens("other"));
    ASSERT_EQ(chmod("/mnt/home/alice/.ssh/authorized_keys", 0600), 0);
    std::ofstream(stored()) << "{";
    EXPECT_TRUE(opens("other")) << "although the stored file is damaged";
    EXPECT_FALSE(opens("key"));
    const ProcessResult found = veltctl({"doctor"});
    EXPECT_TRUE(
        contains(found.output, "The file of the keys of alice, " + stored().string() + ", is damaged"))
        << found.output;
}

TEST_F(HostUserKeys, giveALaterAccountOfTheNameNothing) {
    done({"keys", "add", "alice", "/mnt/srv/key.pub"});
    const std::string before = ":" + std::to_string(aliceId) + ":";
    changeAccount("alice:x" + before, "alice:x:4711:");
    ASSERT_EQ(chmod("/mnt/home/alice", 0755), 0);
    ASSERT_EQ(chmod("/mnt/home/alice/file", 0644), 0);
    EXPECT_FALSE(opens("key"));
    const ProcessResult found = veltctl({"doctor"});
    const std::string mend = "veltctl keys remove alice " + fingerprintOf("key");
    EXPECT_TRUE(contains(found.output, mend)) << found.output;
    EXPECT_TRUE(contains(done({"keys", "list"}), "former-account"));
    EXPECT_EQ(veltctl({"keys", "add", "alice", "/mnt/srv/other.pub"}).exitCode, 3);
    done({"keys", "remove", "alice", fingerprintOf("key")});
    done({"keys", "add", "alice", "/mnt/srv/other.pub"});
    EXPECT_TRUE(opens("other"));
    EXPECT_FALSE(opens("key"));
}

TEST_F(HostUserKeys, openNothingFromElsewhereOrLater) {
    done({"keys", "add", "alice",
          "from=\"127.0.0.0/8,!127.0.0.9\",expiry-time=\"21001231\" " + lineOf("key")});
    EXPECT_TRUE(opens("key"));
    replaceInStored("127.0.0.0/8", "192.0.2.0/24");
    EXPECT_FALSE(opens("key")) << "an edit counts at the next login";
    replaceInStored("192.0.2.0/24", "127.0.0.*");
    EXPECT_TRUE(opens("key"));
    const std::string text = contentsOf(stored());
    const auto time = text.find("expiry-time=\\\"") + 14;
    replaceInStored(text.substr(time, 15), "20200101000000Z");
    EXPECT_FALSE(opens("key"));
    EXPECT_TRUE(contains(done({"keys", "list"}), "expired"));
    EXPECT_EQ(veltctl({"keys", "add", "alice", "command=\"/bin/sh\" " + lineOf("other")}).exitCode, 3);
}

TEST_F(HostUserKeys, giveNoShellAndForwardNothing) {
    done({"keys", "add", "alice", "/mnt/srv/key.pub"});
    for (const std::string& wish : {"-W127.0.0.1:" + std::to_string(sftpPort), std::string("-T")}) {
        const auto ended =
            runProcess({"ssh", "-F", "/dev/null", "-i", "/mnt/srv/key", "-p", std::to_string(sftpPort), "-o",
                        "BatchMode=yes", "-o", "StrictHostKeyChecking=no", "-o",
                        "UserKnownHostsFile=/dev/null", wish, "alice@127.0.0.1"},
                       "echo uid=$(id -u)\n", std::chrono::seconds(30));
        EXPECT_FALSE(contains(ended.output, "uid=")) << ended.output;
        EXPECT_FALSE(contains(ended.output, "SSH-2.0")) << ended.output;
    }
}

TEST_F(HostUserKeys, areImportedAndOutliveTheHost) {
    makeKey("third");
    const std::string weak = "ssh-rsa AAAAB3NzaC1yc2E= old\n";
    const ProcessResult import = veltctl({"keys", "import", "alice", "-"},
                                         "# two good ones\n" + lineOf("key") + weak + lineOf("other"));
    EXPECT_EQ(import.exitCode, 3);
    EXPECT_TRUE(contains(import.output, "line 3: refused: key: expected base64 that is one whole key"))
        << import.output;
    EXPECT_TRUE(contains(import.output, "2 added, 0 already there, 1 refused.\n")) << import.output;
    writeFile("/mnt/srv/authorized_keys", lineOf("other") + lineOf("third"));
    const Json::Value again = jsonOf(done({"keys", "import", "alice", "/mnt/srv/authorized_keys", "--json"}));
    EXPECT_EQ(again["added"], 1);
    EXPECT_EQ(again["present"], 1);
    killHost();
    startHost();
    EXPECT_EQ(jsonOf(done({"keys", "list", "--json"}))["keys"].size(), 3U);
    for (const char* name : {"key", "other", "third"}) {
        EXPECT_TRUE(opens(name)) << name;
    }
}

/// The commands of a page, made such that they can be run here.
std::vector<std::string> commandsOf(const char* page, const std::string& key) {
    std::ifstream lines(std::string(VELT_SOURCE_FOLDER) + page);
    std::vector<std::string> commands;
    for (std::string line; std::getline(lines, line);) {
        line.erase(0, line.find_first_not_of(' '));
        if (!line.starts_with("veltctl keys ")) {
            continue;
        }
        for (const auto& [from, to] : {std::pair<std::string, std::string>{"veltctl ", "/mnt/veltctl "},
                                       {"/home/", "/mnt/home/"},
                                       {"anna", "alice"},
                                       {"anna", "alice"},
                                       {"20271231", "21001231"},
                                       {"192.0.2.0/24", "127.0.0.0/8"},
                                       {"id_ed25519.pub", "/mnt/srv/key.pub"},
                                       {"ssh-ed25519 AAAA...", key}}) {
            const auto at = line.find(from);
            line.replace(std::min(at, line.size()), at == std::string::npos ? 0 : from.size(),
                         at == std::string::npos ? "" : to);
        }
        commands.push_back(line);
    }
    return commands;
}

TEST_F(HostUserKeys, areManagedAsThePagesSay) {
    makeKey("third");
    allowByOwnFile("third");
    const std::string other = lineOf("other");
    int count = 0;
    for (const char* page : {"/docs/confinement.md", "/docs/man/veltctl.1"}) {
        for (const std::string& command : commandsOf(page, other.substr(0, other.rfind(' ')))) {
            const ProcessResult ended = runProcess(
                {"sh", "-c", "VELT_SOCKET=" + (worldRoot / "run/velt/veltd.sock").string() + " " + command});
            EXPECT_EQ(ended.exitCode, 0) << command << '\n' << ended.errors;
            ++count;
        }
    }
    EXPECT_EQ(count, 7);
    for (const char* name : {"key", "other", "third"}) {
        EXPECT_TRUE(opens(name)) << name;
    }
}

TEST_F(HostUserKeys, areShownToViewersAndChangedByAdministrators) {
    done({"keys", "add", "alice", "/mnt/srv/key.pub"});
    const std::string viewer = makeToken("viewer", "viewer");
    EXPECT_TRUE(contains(veltctlWith(viewer, {"keys", "list"}).output, fingerprintOf("key")));
    EXPECT_EQ(veltctlWith(viewer, {"keys", "remove", "alice", fingerprintOf("key")}).exitCode, 6);
    EXPECT_EQ(veltctlWith(viewer, {"keys", "add", "alice", lineOf("other")}).exitCode, 6);
    struct stat facts {};
    ASSERT_EQ(stat(stored().c_str(), &facts), 0);
    EXPECT_EQ(facts.st_mode & 07777, 0600U);
    ASSERT_EQ(stat(stored().parent_path().c_str(), &facts), 0);
    EXPECT_EQ(facts.st_mode & 07777, 0700U);
}

} // namespace
} // namespace velt::test
