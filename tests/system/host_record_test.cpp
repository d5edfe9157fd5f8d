// What requests leave behind: who made them, what was announced, and what holds when the host ends in
// between.
#include "tests/support/files.h"
#include "tests/support/text.h"
#include "tests/support/waiting.h"
#include "tests/system/support/daemon_process.h"
#include "tests/system/support/host_service.h"

#include <sys/stat.h>

#include <algorithm>
#include <csignal>
#include <filesystem>
#include <sstream>
#include <thread>

namespace velt::test {
namespace fs = std::filesystem;
namespace {

class HostRecord : public HostService {
protected:
    /// The newest entries of the administrator log, as "actor address text".
    static std::vector<std::string> logLines(const Words& filters) {
        Words words{"log", "--json"};
        words.insert(words.end(), filters.begin(), filters.end());
        std::vector<std::string> lines;
        const Json::Value log = jsonOf(done(words));
        for (const Json::Value& entry : log["entries"]) {
            lines.push_back(entry["actor"].asString() + " " + entry["address"].asString() + " " +
                            entry["text"].asString());
        }
        return lines;
    }

    static std::string newest() {
        const std::vector<std::string> lines = logLines({"--limit", "1"});
        return lines.empty() ? "" : lines[0];
    }

    /// The pids of the programs of this name that run in this world, each with a line end.
    static std::string pidsOf(const std::string& name) {
        return runProcess({"pgrep", "--runstates", "D,R,S", "--exact", name}).output;
    }

    /// veltctl, left running with these words.
    static RunningProgram following(Words words) {
        words.insert(words.begin(), {"/mnt/veltctl", "--socket", worldRoot / "run/velt/veltd.sock"});
        return RunningProgram::start(words, {"LANG=C.UTF-8"}, "/mnt/veltctl.log");
    }

    /// Whether FTP and SFTP serve their clients.
    static void expectServices() {
        EXPECT_EQ(fetchHome(), "alice");
        EXPECT_TRUE(servesSftp(2222));
    }
};

TEST_F(HostRecord, othersMayWriteToNoFolderOfTheHostWhateverItWasStartedWith) {
    ASSERT_EQ(stopHost(), 0);
    std::error_code none;
    fs::remove_all(worldRoot / "run", none);
    fs::remove_all(worldRoot / "var/log", none);
    const mode_t before = umask(0);
    startHost();
    umask(before);
    done({"ftp", "set", "enable_ftp=on"});
    std::string writable;
    for (const fs::directory_entry& entry : fs::recursive_directory_iterator(worldRoot)) {
        const auto others =
            entry.symlink_status().permissions() & (fs::perms::group_write | fs::perms::others_write);
        if (entry.is_directory() && !entry.is_symlink() && others != fs::perms::none) {
            writable += entry.path().string() + "\n";
        }
    }
    EXPECT_EQ(writable, "");
}

TEST_F(HostRecord, theLogNamesWhoAskedAndFromWhere) {
    done({"ftp", "set", "enable_ftp=on"});
    EXPECT_EQ(newest(),
              "root local The settings were changed (settings): /ftp/enable_ftp from false to true.");
    EXPECT_EQ(logLines({"--event", "0x11b00013"}),
              std::vector<std::string>{"root local The FTP service was started."});
    EXPECT_EQ(veltctlAs(carolId, {"ftp", "set", "max_conn_per_ip=7"}).exitCode, 0);
    EXPECT_EQ(newest(),
              "carol local The settings were changed (settings): /ftp/max_conn_per_ip from 0 to 7.");
    const std::string token = makeToken("night job", "admin");
    EXPECT_EQ(veltctlWith(token, {"ftp", "set", "max_conn_per_ip=8"}).exitCode, 0);
    EXPECT_EQ(
        logLines({"--actor", "night job"}),
        (std::vector<std::string>{
            "night job 127.0.0.1 The settings were changed (settings): /ftp/max_conn_per_ip from 7 to 8.",
            "night job 127.0.0.1 The limit of FTP connections from one address was set to \"8\"."}));
    EXPECT_EQ(curl("/api/VELT.Core.FileServ.FTP.Security/v1/set", R"({"anonymous": true})").status, 204);
    EXPECT_EQ(newest(), "curl 127.0.0.1 The settings were changed (VELT.Core.FileServ.FTP.Security v1 set): "
                        "/security/anonymous from false to true.");
    EXPECT_EQ(logLines({"--event", "0x11b00010"}).size(), 1U);
    EXPECT_EQ(logLines({"--since", "1h", "--actor", "carol"}).size(), 2U);
}

TEST_F(HostRecord, eventsTellOfAChangeWhileItHappens) {
    RunningProgram events = following({"events", "--count", "4", "--json", "--kind", "service,change"});
    RunningProgram log = following({"log", "--follow", "--limit", "1"});
    EXPECT_TRUE(contains(log.readUntil("\n"), "The settings were changed")) << "the newest entry so far";
    std::this_thread::sleep_for(std::chrono::milliseconds(200)); // until both streams are there
    done({"ftp", "set", "enable_ftp=on"});
    const std::string seen = events.readUntil("\"change\"");
    for (const char* part :
         {R"({"action":"stop","service":"ftpd"})", R"({"action":"stop","service":"ftpd-ssl"})",
          R"({"action":"start","service":"ftpd"})"}) {
        EXPECT_TRUE(contains(seen, part)) << seen;
    }
    EXPECT_EQ(events.wait(), 0) << "four events were asked for";
    const std::string line = log.readUntil("The FTP service was started.\n");
    EXPECT_TRUE(contains(line, "root  local  The FTP service was started.")) << line;
    log.signal(SIGINT);
    EXPECT_EQ(log.wait(), 0);
}

TEST_F(HostRecord, twoWhoWriteAtOnceLoseNothing) {
    done({"ftp", "set", "enable_ftp=on"});
    for (int round = 1; round <= 3; ++round) {
        const std::string value = std::to_string(round);
        const std::string add = round % 2 == 1 ? "add" : "remove";
        std::vector<ProcessResult> results(4);
        std::vector<std::thread> writers;
        const std::vector<Words> commands{
            {"ftp", "set", "max_conn_per_ip=" + value},
            {"ftp", "set", round % 2 == 1 ? "enable_ftps=on" : "enable_ftps=off"},
            {"chroot", "rules", add, "user", "alice", "/public"},
            {"chroot", "rules", add, "user", "bob", "/public"}};
        for (std::size_t i = 0; i < commands.size(); ++i) {
            writers.emplace_back([&, i] { results[i] = veltctl(commands[i]); });
        }
        for (std::thread& writer : writers) {
            writer.join();
        }
        for (const ProcessResult& result : results) {
            EXPECT_EQ(result.exitCode, 0) << result.errors;
        }
        const Json::Value now = jsonOf(exported());
        EXPECT_EQ(now["ftp"]["max_conn_per_ip"], round);
        EXPECT_EQ(now["ftp"]["enable_ftps"], round % 2 == 1);
        EXPECT_EQ(now["ftp"]["enable_ftp"], true);
        EXPECT_EQ(now["chroot_rules"].size(), round % 2 == 1 ? 2U : 0U);
    }
}

TEST_F(HostRecord, aStopFinishesTheWriteThatRuns) {
    ProcessResult result;
    std::thread writer([&result] { result = veltctl({"ftp", "set", "enable_ftp=on", "timeout=77"}); });
    // The daemon's start is what takes time: the settings are stored by then.
    while (contentsOf(worldRoot / "etc/velt/ftp.conf").find("timeout = 77") == std::string::npos) {
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
    EXPECT_EQ(stopHost(), 0);
    writer.join();
    EXPECT_TRUE(result.exitCode == 0 || contains(result.errors, "but the new settings could not be read"))
        << result.errors;
    EXPECT_EQ(fetchHome(), "alice") << "the services go on without the host";
    startHost();
    EXPECT_EQ(jsonOf(exported())["ftp"]["enable_ftp"], true);
}

TEST_F(HostRecord, whatWasEnabledRunsAgainUnderTheNextHost) {
    furnishSftp();
    done({"ftp", "set", "enable_ftp=on"});
    done({"sftp", "set", "enable=on"});
    const std::string before = exported();
    EXPECT_EQ(stopHost(), 0);
    expectServices();
    startHost();
    expectServices();
    EXPECT_EQ(exported(), before);
    EXPECT_EQ(jsonOf(done({"status", "--json"}))["services"][2]["enabled"], true);
}

TEST_F(HostRecord, aKilledHostLeavesWholeSettingsAndDaemonsToTheNext) {
    furnishSftp();
    done({"sftp", "set", "enable=on"});
    done({"ftp", "set", "enable_ftp=on"});
    for (const int delay : {0, 5, 20, 60, 150}) {
        const testing::ScopedTrace trace(__FILE__, __LINE__, std::to_string(delay) + " ms");
        const Json::Value before = jsonOf(exported());
        const int other = before["ftp"]["max_conn_per_ip"].asInt() + 1;
        std::thread writer([&] {
            veltctl({"ftp", "set", "max_conn_per_ip=" + std::to_string(other),
                     "maxuploadrate=" + std::to_string(other)});
        });
        std::this_thread::sleep_for(std::chrono::milliseconds(delay));
        killHost();
        writer.join();
        startHost();
        const Json::Value after = jsonOf(exported());
        EXPECT_EQ(after["ftp"]["max_conn_per_ip"] == other, after["ftp"]["maxuploadrate"] == other)
            << "both are in the record that is stored whole";
        expectServices();
        EXPECT_EQ(std::ranges::count(pidsOf("velt-supervise"), '\n'), 2) << "one for each service";
        EXPECT_EQ(jsonOf(done({"status", "--json"}))["services"][0]["wanted"], true);
    }
}

TEST_F(HostRecord, aKilledSupervisorIsReplacedAndItsDaemonToo) {
    done({"ftp", "set", "enable_ftp=on"});
    const std::string supervisor = pidsOf("velt-supervise");
    const std::string daemon = pidsOf("proftpd");
    ASSERT_EQ(kill(std::stoi(supervisor), SIGKILL), 0);
    const auto servesAnew = [&] { return !contains(pidsOf("proftpd"), daemon) && fetchHome() == "alice"; };
    EXPECT_TRUE(waitUntil(servesAnew, std::chrono::seconds(5))) << "nobody looks after the daemon any more";
    EXPECT_NE(pidsOf("velt-supervise"), "");
}

TEST_F(HostRecord, aServiceThatIsDownStaysSwitchedOnWhenAnotherSettingChanges) {
    done({"ftp", "set", "enable_ftp=on"});
    done({"sftp", "set", "enable=on"});
    EXPECT_EQ(stopHost(), 0);
    // As after a crash of everything: what is switched on is down, and its port is taken when the host comes.
    std::istringstream supervisors(pidsOf("velt-supervise"));
    for (pid_t pid = 0; supervisors >> pid;) {
        kill(pid, SIGTERM);
    }
    while (isListening(2222) || isListening(port)) {
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }
    {
        const UniqueFd other = listenOn(2222);
        startHost();
        EXPECT_EQ(fetchHome(), "alice") << "started by the new host";
        const ProcessResult status = veltctl({"status"});
        EXPECT_TRUE(contains(status.output, "sftp     down   2222")) << status.output;
        EXPECT_EQ(jsonOf(exported())["sftp"]["enable"], true);
        done({"sftp", "set", "portnum=2223"});
    }
    EXPECT_TRUE(isListening(2223)) << "moved away from the taken port, and up again";
    EXPECT_EQ(jsonOf(exported())["sftp"]["enable"], true);
}

} // namespace
} // namespace velt::test
