// What veltd and the services do, with the little that their units leave them.
#include "base/unique_fd.h"
#include "standalone/core/state_root.h"
#include "standalone/settings/confinement_settings.h"
#include "standalone/shares/folder_access.h"
#include "tests/support/files.h"
#include "tests/support/result.h"
#include "tests/support/waiting.h"
#include "tests/system/support/systemd_host.h"
#include "tests/system/support/systemd_services.h"

#include <grp.h>
#include <linux/capability.h>
#include <netinet/in.h>
#include <sched.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <csignal>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>
#include <thread>
#include <utility>
#include <vector>

namespace velt::test {
namespace {
namespace fs = std::filesystem;
using std::chrono::seconds;

/// What the kernel says of a process: the value of a line of its status.
std::string statusOf(const std::string& process, const std::string& name) {
    std::istringstream lines(contentsOf("/proc/" + process + "/status"));
    for (std::string line; std::getline(lines, line);) {
        if (line.starts_with(name + ":\t")) {
            return line.substr(name.size() + 2);
        }
    }
    return "";
}

/// The set of those of these capabilities that the machine has at all, as the kernel writes it.
std::string rights(const std::vector<int>& capabilities) {
    unsigned long long mask = 0;
    for (const int capability : capabilities) {
        mask |= 1ULL << static_cast<unsigned>(capability);
    }
    mask &= std::stoull(statusOf("1", "CapBnd"), nullptr, 16);
    std::array<char, 20> text{};
    std::snprintf(text.data(), text.size(), "%016llx", mask);
    return text.data();
}

/// A process of alice's that listens on the port.
class AlicesListener {
public:
    explicit AlicesListener(int port) : process_(::fork()) {
        if (process_ == 0) {
            listen(port);
            ::_exit(1);
        }
        const auto isAlices = [this] {
            return statusOf(std::to_string(process_), "Uid").starts_with("1001");
        };
        EXPECT_TRUE(waitUntil(isAlices, patience));
    }
    ~AlicesListener() {
        ::kill(process_, SIGKILL);
        ::waitpid(process_, nullptr, 0);
    }
    AlicesListener(const AlicesListener&) = delete;
    AlicesListener& operator=(const AlicesListener&) = delete;

private:
    static void listen(int port) {
        const UniqueFd socket(::socket(AF_INET, SOCK_STREAM, 0)); // which her program inherits
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_port = htons(static_cast<in_port_t>(port));
        if (::bind(socket.get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0 &&
            ::listen(socket.get(), 1) == 0 && ::setgroups(0, nullptr) == 0 &&
            ::setgid(SystemdWorld::aliceId) == 0 && ::setuid(SystemdWorld::aliceId) == 0) {
            // Until it starts a program of hers, the kernel counts it as one of root's.
            ::execl("/bin/sleep", "sleep", "60", nullptr);
        }
    }

    pid_t process_;
};

TEST_F(UnderSystemd, theHostHasNoMoreRightsThanItNeeds) {
    inside([] {
        startHost();
        const std::string host = unitProperty("veltd.service", "MainPID");
        EXPECT_EQ(statusOf(host, "CapBnd"), rights({CAP_DAC_READ_SEARCH, CAP_SETUID, CAP_SETGID, CAP_KILL,
                                                    CAP_NET_BIND_SERVICE, CAP_NET_ADMIN, CAP_SYS_PTRACE}));
        EXPECT_EQ(statusOf(host, "NoNewPrivs"), "1");
        EXPECT_EQ(statusOf(host, "Seccomp"), "2");
        const std::string within = "nsenter --mount --target " + host + " ";
        const auto canMakeFileIn = [&](const std::string& folder) {
            shell(within + "touch " + folder + "/made-by-veltd");
            return fs::exists(folder + "/made-by-veltd");
        };
        EXPECT_TRUE(canMakeFileIn("/etc/velt"));
        for (const char* folder :
             {"/", "/usr", "/home", "/home/alice", "/srv", "/root", "/opt", "/var", "/boot"}) {
            EXPECT_FALSE(canMakeFileIn(folder)) << folder;
        }
        std::ofstream("/tmp/of-others") << "seen by all but the host";
        EXPECT_EQ(shell(within + "ls -A /tmp"), "");
    });
}

TEST_F(UnderSystemd, theServicesHaveNoMoreRightsThanTheyNeed) {
    inside([] {
        startHost();
        done({"ftp", "set", "enable_ftp=on"});
        done({"sftp", "set", "enable=on", "portnum=2222"});
        const std::string expected =
            rights({CAP_AUDIT_WRITE, CAP_CHOWN, CAP_DAC_OVERRIDE, CAP_DAC_READ_SEARCH, CAP_FOWNER, CAP_FSETID,
                    CAP_KILL, CAP_NET_ADMIN, CAP_NET_BIND_SERVICE, CAP_SETGID, CAP_SETUID, CAP_SYS_ADMIN,
                    CAP_SYS_CHROOT, CAP_SYS_NICE, CAP_SYS_PTRACE, CAP_SYS_RESOURCE});
        for (const char* service : {"ftpd", "sftp"}) {
            const DaemonState state = serviceState(service);
            for (const ProcessId& process : {state.supervisor, state.daemon}) {
                EXPECT_EQ(statusOf(std::to_string(process.pid), "CapBnd"), expected) << service;
                EXPECT_EQ(statusOf(std::to_string(process.pid), "NoNewPrivs"), "1") << service;
                EXPECT_EQ(statusOf(std::to_string(process.pid), "Seccomp"), "2") << service;
            }
        }
    });
}

TEST_F(UnderSystemd, systemdFindsLittleExposed) {
    if (!fs::exists("/usr/bin/systemd-analyze")) {
        GTEST_SKIP() << "systemd-analyze is not installed";
    }
    inside([] {
        startHost();
        done({"ftp", "set", "enable_ftp=on"});
        done({"sftp", "set", "enable=on", "portnum=2222"});
        // The thresholds are tenths.
        const std::vector<std::pair<std::string, std::string>> units{
            {"/usr/local/lib/systemd/system/veltd.service", "29"},
            {"/run/systemd/system/velt-ftpd.service", "51"},
            {"/run/systemd/system/velt-sftp.service", "51"}};
        for (const auto& [unit, threshold] : units) {
            const ProcessResult verdict = runProcess({"systemd-analyze", "security", "--no-pager",
                                                      "--offline=true", "--threshold=" + threshold, unit});
            EXPECT_EQ(verdict.exitCode, 0) << unit << verdict.output << verdict.errors;
            EXPECT_NE(verdict.output.find("Overall exposure level"), std::string::npos) << verdict.errors;
        }
    });
}

TEST_F(UnderSystemd, allSettingsAreReadAndSetByTheHost) {
    inside([] {
        startHost();
        const std::vector<std::vector<std::string>> changes{
            {"ftp", "set", "enable_ftp=on", "enable_ftps=on", "timeout=301", "custom_port=55600:55700",
             "custom_port_range=on", "use_ext_ip=on", "ext_ip=192.0.2.1", "utf8_mode=1", "enable_fxp=on",
             "enable_ascii=on", "enable_flow_ctrl=on", "maxuploadrate=90000", "maxdownloadrate=90000",
             "max_conn_per_ip=9"},
            {"ftp", "set", "use_ext_ip=off", "ext_ip=", "portnum=989"},
            {"security", "set", "user_chroot=on", "anonymous=on", "anonymous_chroot=on",
             "anonymous_chroot_share=public", "enable_umask=off"},
            {"sftp", "set", "enable=on", "portnum=2222"},
            {"chroot", "users", "add", "alice"},
            {"chroot", "users", "delete", "alice"},
            {"chroot", "rules", "add", "user", "alice", "/home"},
            {"chroot", "rules", "remove", "user", "alice"},
            {"tokens", "create", "watcher", "--role", "viewer"},
        };
        for (const auto& words : changes) {
            done(words);
        }
        const std::vector<std::vector<std::string>> questions{{"ftp", "get"},
                                                              {"ftp", "get", "--api-version", "1"},
                                                              {"ftp", "get", "--api-version", "2"},
                                                              {"security", "get"},
                                                              {"sftp", "get"},
                                                              {"chroot", "users", "list", "--others"},
                                                              {"chroot", "rules", "load"},
                                                              {"shares"},
                                                              {"status"},
                                                              {"log"},
                                                              {"tokens", "list"},
                                                              {"export"},
                                                              {"call", "--list"}};
        for (const auto& words : questions) {
            EXPECT_NE(done(words), "");
        }
        EXPECT_EQ(fetchByFtp("/home-of", 989), "alice");
        EXPECT_EQ(shell("curl -sS --ssl-reqd --insecure ftp://127.0.0.1:989/about"), "public");
        EXPECT_EQ(logInBySftp(2222).exitCode, 0);
        EXPECT_NE(contentsOf("/etc/veltinfo.conf"), "");
        EXPECT_NE(contentsOf("/var/log/velt/events.jsonl"), "");
        EXPECT_EQ(shell("journalctl --unit=veltd --grep='not permitted|Read-only|denied|Bad system call'"),
                  "-- No entries --\n");
        done({"ftp", "set", "enable_ftp=off", "enable_ftps=off"});
        done({"sftp", "set", "enable=off"});
        EXPECT_EQ(unitState("velt-ftpd.service"), "inactive");
        EXPECT_EQ(unitState("velt-sftp.service"), "inactive");
    });
}

TEST_F(UnderSystemd, theHostNamesWhoHoldsAPort) {
    inside([] {
        startHost();
        for (const int port : {990, 2200}) {
            const AlicesListener hers(port);
            const std::string refusal =
                refused({"sftp", "set", "enable=on", "portnum=" + std::to_string(port)});
            EXPECT_NE(refusal.find("is taken by sleep"), std::string::npos) << refusal;
        }
    });
}

TEST_F(UnderSystemd, theHostKeepsTheFirewall) {
    if (::access("/usr/sbin/nft", X_OK) != 0) {
        GTEST_SKIP() << "nftables is not installed";
    }
    inside([] {
        startHost();
        done({"ftp", "set", "enable_ftp=on", "portnum=2121"});
        const std::string rules = shell("nft list table inet velt_fileserv");
        EXPECT_NE(rules.find("2121"), std::string::npos) << rules;
        EXPECT_NE(rules.find("2323"), std::string::npos) << rules;
        done({"ftp", "set", "enable_ftp=off"});
        EXPECT_EQ(shell("nft list table inet velt_fileserv").find("2121"), std::string::npos);
    });
}

TEST_F(UnderSystemd, theHostAsksForTheAccessToSharesAsTheServicesSeeThem) {
    inside([] {
        startHost();
        // What the account "ftp" cannot enter is no share for anonymous users.
        done({"ftp", "set", "enable_ftp=on"});
        refused({"security", "set", "anonymous=on", "anonymous_chroot=on", "anonymous_chroot_share=private"});
        // In the view that veltd has of the machine everything is read-only.
        const pid_t host = std::stoi(unitProperty("veltd.service", "MainPID"));
        const UniqueFd view(static_cast<int>(::syscall(SYS_pidfd_open, host, 0)));
        ASSERT_EQ(::setns(view.get(), CLONE_NEWNS), 0);
        EXPECT_FALSE(std::ofstream("/srv/public/written"));
        const Identity alice{"alice", SystemdWorld::aliceId, {SystemdWorld::aliceId}};
        for (const char* folder : {"/srv/public", "/home/alice"}) {
            const auto access = folderAccess(folder, alice);
            ASSERT_EQ(messageOf(access), "");
            EXPECT_EQ(*access, Access::write) << folder;
        }
        EXPECT_EQ(folderAccess("/root", alice).valueOr(Access::write), Access::read);
        EXPECT_EQ(folderAccess("/proc/1/root", alice).valueOr(Access::write), Access::none);
    });
}

TEST_F(UnderSystemd, membersOfTheGroupMayAdminister) {
    inside([] {
        startHost();
        struct stat socket {};
        ASSERT_EQ(::stat("/run/velt/veltd.sock", &socket), 0);
        EXPECT_EQ(socket.st_mode & 0777U, 0660U);
        const std::string as = "setpriv --reuid 1001 --regid 1001 --groups ";
        const std::string group = std::to_string(socket.st_gid);
        EXPECT_NE(socket.st_gid, 0U);
        EXPECT_EQ(shell(as + group + " /usr/local/bin/veltctl ftp set timeout=77"), "timeout: 300 -> 77\n");
        EXPECT_NE(shell(as + "1001 /usr/local/bin/veltctl ftp get").find("ermission"), std::string::npos);
    });
}

/// Kills the service's supervisor, which systemd does not start again.
void endSupervisor(const std::string& service) {
    const std::string folder = "/run/systemd/system/velt-" + service + ".service.d";
    fs::create_directories(folder);
    std::ofstream(folder + "/once.conf") << "[Service]\nRestart=no\n";
    ASSERT_EQ(runProcess({"systemctl", "daemon-reload"}).exitCode, 0);
    const ProcessId supervisor = serviceState(service).supervisor;
    signalProcess(supervisor, SIGKILL);
    ASSERT_TRUE(waitUntil([&] { return !isAlive(supervisor); }, patience));
}

TEST_F(UnderSystemd, theHostEndsTheSftpSessionsOfASupervisorThatIsGone) {
    inside([] {
        startHost();
        done({"security", "set", "user_chroot=on"});
        done({"sftp", "set", "enable=on", "portnum=2222"});
        SlowTransfer transfer(2222);
        endSupervisor("sftp");
        done({"sftp", "set", "enable=off"});
        EXPECT_FALSE(transfer.succeeds());
        EXPECT_NE(runProcess({"pidof", "sshd"}).exitCode, 0) << "a session goes on";
    });
}

TEST_F(UnderSystemd, theHostEndsTheFtpSessionsOfASupervisorThatIsGone) {
    inside([] {
        startHost();
        done({"ftp", "set", "enable_ftp=on"});
        std::thread client([] {
            EXPECT_NE(runProcess({"curl", "-sS", "--user", "alice:alice-secret", "--limit-rate", "1M",
                                  "--output", "/root/got", "ftp://127.0.0.1/public/large"},
                                 {}, seconds(30))
                          .exitCode,
                      0);
        });
        EXPECT_TRUE(
            waitUntil([] { return fs::exists("/root/got") && fs::file_size("/root/got") > 0; }, patience));
        endSupervisor("ftpd");
        done({"ftp", "set", "enable_ftp=off"});
        EXPECT_NE(runProcess({"pidof", "proftpd"}).exitCode, 0) << "a session goes on";
        client.join();
    });
}

TEST_F(UnderSystemd, aWrongOptionIsNotTriedAgain) {
    inside([] {
        startHost();
        fs::create_directories("/etc/default");
        std::ofstream("/etc/default/veltd") << "VELTD_OPTIONS=--no-such-option\n";
        runProcess({"systemctl", "restart", "veltd"}, {}, seconds(20));
        EXPECT_TRUE(waitUntil([] { return unitState("veltd.service") == "failed"; }, patience));
        EXPECT_EQ(unitProperty("veltd.service", "ExecMainStatus"), "2");
        EXPECT_EQ(unitProperty("veltd.service", "NRestarts"), "0");
    });
}

TEST_F(UnderSystemd, sessionsWorkInHomesAndShares) {
    inside([] {
        startHost();
        done({"ftp", "set", "enable_ftp=on", "enable_ftps=on"});
        done({"sftp", "set", "enable=on", "portnum=2222"});
        const std::string alice = "curl -sS --user alice:alice-secret ";
        EXPECT_EQ(shell(alice + "-T /home/alice/home-of ftp://127.0.0.1/public/by-ftp"), "");
        EXPECT_EQ(shell(alice + "-Q 'SITE CHMOD 640 /public/by-ftp' ftp://127.0.0.1/public/by-ftp"), "alice");
        EXPECT_EQ(shell("stat -c '%U %a' /srv/public/by-ftp"), "alice 640\n");
        EXPECT_EQ(shell(alice + "-P - ftp://127.0.0.1/public/by-ftp"), "alice") << "from port 20";
        EXPECT_EQ(shell(alice + "--ssl-reqd --insecure ftp://127.0.0.1/public/by-ftp"), "alice");
        done({"security", "set", "user_chroot=on", "anonymous=on", "anonymous_chroot=on",
              "anonymous_chroot_share=public"});
        EXPECT_EQ(shell(alice + "-T /home/alice/home-of ftp://127.0.0.1/sent"), "");
        EXPECT_EQ(contentsOf("/home/alice/sent"), "alice");
        EXPECT_EQ(shell("curl -sS -T /home/alice/home-of ftp://127.0.0.1/by-guest"), "");
        EXPECT_EQ(contentsOf("/srv/public/by-guest"), "alice");
        const ProcessResult inHome = runSftp(2222, "put /root/key.pub /by-sftp\n");
        EXPECT_EQ(inHome.exitCode, 0) << inHome.errors;
        EXPECT_EQ(shell("stat -c '%U' /home/alice/by-sftp"), "alice\n");
        ASSERT_EQ(messageOf(storeConfinementSettings({.sftp = false})), "");
        done({"restart", "sftp"});
        const ProcessResult onServer = runSftp(2222, "mkdir folder\nchmod 2770 /home/alice/folder\n");
        EXPECT_EQ(onServer.exitCode, 0) << onServer.errors;
        EXPECT_EQ(shell("stat -c '%U %a' /home/alice/folder"), "alice 2770\n");
    });
}

} // namespace
} // namespace velt::test
