// What health says of real daemons, each trouble staged: by id, and with the command that mends it.
#include "tests/support/files.h"
#include "tests/support/waiting.h"
#include "tests/system/support/host_service.h"
#include "tests/system/support/leftovers.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <thread>

namespace velt::test {
namespace fs = std::filesystem;
namespace {

using std::chrono::seconds;

/// A port of this world that somebody else listens on.
class TakenPort {
public:
    explicit TakenPort(int taken) : descriptor_(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
        const int on = 1;
        ::setsockopt(descriptor_, SOL_SOCKET, SO_REUSEADDR, &on, sizeof on);
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_port = htons(static_cast<in_port_t>(taken));
        EXPECT_EQ(::bind(descriptor_, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
        EXPECT_EQ(::listen(descriptor_, 1), 0);
    }
    ~TakenPort() { ::close(descriptor_); }
    TakenPort(const TakenPort&) = delete;
    TakenPort& operator=(const TakenPort&) = delete;

private:
    int descriptor_;
};

class HostHealth : public HostService {
protected:
    /// The findings that are errors and warnings now, as "id: mend" lines, without those of the machine that
    /// runs the tests.
    static std::string diagnosis() {
        std::this_thread::sleep_for(std::chrono::milliseconds(1100)); // a judgement is kept for a second
        std::string text;
        const Json::Value health = jsonOf(veltctl({"doctor", "--json"}).output);
        for (const Json::Value& each : health["findings"]) {
            if (each["severity"] != "notice" && each["subject"] != "host") {
                text += each["id"].asString() + ": " + each["mend"].asString() + "\n";
            }
        }
        return text;
    }

    struct Pair {
        std::string certificate;
        std::string key;
    };

    static void give(const std::string& certificate, const std::string& key) {
        const fs::path folder = worldRoot / "etc/velt/tls";
        fs::create_directories(folder);
        writeFile(folder / "server.crt", certificate);
        writeFile(folder / "server.key", key);
        ASSERT_EQ(::chmod((folder / "server.key").c_str(), 0600), 0);
    }

    static Pair makePair() {
        const ProcessResult made =
            runProcess({"openssl", "req", "-x509", "-newkey", "ec", "-pkeyopt", "ec_paramgen_curve:P-256",
                        "-nodes", "-keyout", "/mnt/made.key", "-out", "/mnt/made.crt", "-days", "100",
                        "-subj", "/CN=files.example", "-addext", "subjectAltName=DNS:files.example"});
        EXPECT_EQ(made.exitCode, 0) << made.errors;
        Pair pair{contentsOf("/mnt/made.crt"), contentsOf("/mnt/made.key")};
        fs::remove("/mnt/made.crt");
        fs::remove("/mnt/made.key");
        return pair;
    }
};

TEST_F(HostHealth, AllIsWellWithEverythingSwitchedOn) {
    done({"ftp", "set", "enable_ftp=on", "enable_ftps=on"});
    done({"sftp", "set", "enable=on"});
    EXPECT_EQ(diagnosis(), "");
    EXPECT_TRUE(waitUntil([this] { return curl("/readyz").status == 200; }, seconds(5)));
}

TEST_F(HostHealth, AKeyOfAnotherCertificateIsFoundWhileItKeepsEverybodyOut) {
    const Pair good = makePair();
    give(good.certificate, good.key);
    done({"ftp", "set", "enable_ftp=on", "enable_ftps=on"});
    EXPECT_EQ(diagnosis(), "");
    give(makePair().certificate, good.key);
    EXPECT_EQ(fetchHome(), "") << "each session reads the files, plain ones too";
    EXPECT_EQ(diagnosis(),
              "no-greeting: veltctl restart ftp\n"
              "certificate-key-mismatch: Put the key of this certificate in place, then run: veltctl restart "
              "ftp\n");
    EXPECT_EQ(veltctl({"doctor"}).exitCode, 8);
    EXPECT_EQ(curl("/readyz", "", {"--header", "Authorization:"}).status, 503);
    const Pair renewed = makePair();
    give(renewed.certificate, renewed.key);
    EXPECT_EQ(diagnosis(), "");
}

TEST_F(HostHealth, AStartThatFailedAtTheBootIsMadeUpForAndSoIsHealth) {
    done({"ftp", "set", "enable_ftp=on"});
    done({"sftp", "set", "enable=on"});
    EXPECT_EQ(stopHost(), 0);
    ASSERT_EQ(runProcess({"pkill", "--exact", "velt-supervise"}).exitCode, 0);
    ASSERT_TRUE(waitUntil([] { return !somethingListens(); }, seconds(10)));
    {
        const TakenPort other(port);
        startHost();
        const std::string found = diagnosis();
        EXPECT_EQ(found, "service-down: veltctl restart ftp\n");
        EXPECT_NE(veltctl({"status"}).output.find("1 error: see 'veltctl doctor'."), std::string::npos);
    }
    EXPECT_TRUE(waitUntil([] { return fetchHome() == "alice"; }, seconds(10)));
    EXPECT_EQ(diagnosis(), "");
    EXPECT_NE(done({"log"}).find("The FTP service runs again."), std::string::npos);
}

TEST_F(HostHealth, AFirewallThatDoesNotFollowIsFound) {
    const auto settings = [](const std::string& lines) {
        writeFile(worldRoot / "etc/velt/firewall.conf", "version = 1\n" + lines);
    };
    settings("mode = drop\nports = 22 443\n");
    done({"ftp", "set", "enable_ftp=on"});
    EXPECT_EQ(diagnosis(), "");
    settings("mode = drop\nports = 22,443\n");
    EXPECT_EQ(diagnosis(),
              "firewall-settings-damaged: Correct the file, then run: systemctl restart veltd\n");
    settings("mode = drop\nports = 22 443\n");
    ASSERT_EQ(runProcess({"nft", "flush", "ruleset"}).exitCode, 0);
    EXPECT_EQ(diagnosis(), "firewall-rules-missing: systemctl restart veltd\n");
    EXPECT_EQ(stopHost(), 0);
    startHost();
    EXPECT_EQ(diagnosis(), "");
    settings("mode = off\n");
    done({"ftp", "set", "enable_ftp=off"});
}

TEST_F(HostHealth, FilesThatKeepEverybodyOutAreFound) {
    done({"ftp", "set", "enable_ftp=on"});
    const fs::path rules = worldRoot / "etc/velt/chroot_rules";
    const fs::path shares = worldRoot / "etc/velt/shares.json";
    EXPECT_EQ(diagnosis(), "");
    const std::string before = contentsOf(rules);
    fs::remove(rules);
    EXPECT_EQ(fetchHome(), "") << "nobody can log in";
    EXPECT_EQ(diagnosis(),
              "rules-missing: Put your copy back, or, if there were no rules, run: veltctl restart ftp\n");
    writeFile(rules, before);
    ASSERT_EQ(::chmod(rules.c_str(), 0666), 0);
    EXPECT_EQ(diagnosis(),
              "rules-untrusted: chown root " + rules.string() + " && chmod go-w " + rules.string() + "\n");
    ASSERT_EQ(runProcess({"chmod", "go-w", rules}).exitCode, 0);
    const std::string all = contentsOf(shares);
    writeFile(shares, "{");
    EXPECT_EQ(diagnosis(), "shares-damaged: Correct " + shares.string() + ", then run: veltctl doctor\n");
    writeFile(shares, all);
    EXPECT_EQ(diagnosis(), "");
    EXPECT_EQ(fetchHome(), "alice");
}

TEST_F(HostHealth, ADaemonThatWasKilledIsInTheLog) {
    done({"ftp", "set", "enable_ftp=on"});
    done({"sftp", "set", "enable=on"});
    for (const char* each : {"ftpd", "sftp"}) {
        const std::string state = contentsOf(worldRoot / ("run/velt/" + std::string(each) + ".state"));
        const std::string pid = state.substr(state.find("\ndaemon ") + 8);
        ASSERT_EQ(runProcess({"kill", "-KILL", pid.substr(0, pid.find(' '))}).exitCode, 0) << state;
        EXPECT_TRUE(waitUntil(
            [] {
                const std::string log = veltctl({"log", "--limit", "1"}).output;
                return log.find("service runs again.") != std::string::npos;
            },
            seconds(10)));
    }
    const std::string log = done({"log"});
    EXPECT_NE(log.find("The FTP service ended unexpectedly: "), std::string::npos) << log;
    EXPECT_NE(log.find("The SFTP service ended unexpectedly: "), std::string::npos) << log;
    EXPECT_EQ(diagnosis(), "");
}

} // namespace
} // namespace velt::test
