// What health says of real daemons, each trouble staged as it was met: by id, and with the command that mends
// it, which the test runs.
#include "tests/support/files.h"
#include "tests/support/text.h"
#include "tests/support/waiting.h"
#include "tests/system/support/health_service.h"
#include "tests/system/support/leftovers.h"

#include <sys/stat.h>

#include <filesystem>

namespace velt::test {
namespace fs = std::filesystem;
namespace {

using std::chrono::seconds;

const std::string rulesFile = worldRoot / "etc/velt/chroot_rules";
const std::string sharesFile = worldRoot / "etc/velt/shares.json";

class HostHealth : public HealthService {
protected:
    static void signalDaemon(const std::string& name, const std::string& signal) {
        const std::string state = contentsOf(worldRoot / ("run/velt/" + name + ".state"));
        const std::string pid = state.substr(state.find("\ndaemon ") + 8);
        ASSERT_EQ(runProcess({"kill", signal, pid.substr(0, pid.find(' '))}).exitCode, 0) << state;
    }
};

TEST_F(HostHealth, AllIsWellWithEverythingSwitchedOn) {
    done({"ftp", "set", "enable_ftp=on", "enable_ftps=on"});
    done({"sftp", "set", "enable=on"});
    EXPECT_EQ(diagnosis(), "");
    EXPECT_TRUE(waitUntil([this] { return curl("/readyz").status == 200; }, seconds(5)));
}

TEST_F(HostHealth, AKeyOfAnotherCertificateKeepsEverybodyOut) {
    const Certificate good = makeCertificate();
    putInPlace(good.text, good.key);
    done({"ftp", "set", "enable_ftp=on", "enable_ftps=on"});
    const Certificate next = makeCertificate();
    putInPlace(next.text, good.key);
    EXPECT_EQ(fetchHome(), "") << "each session reads the files, plain ones too";
    const std::string found = diagnosis();
    EXPECT_EQ(found, "no-greeting: veltctl restart ftp\n"
                     "certificate-key-mismatch: Put the key of this certificate in place, then run: veltctl "
                     "restart ftp\n");
    EXPECT_EQ(veltctl({"doctor"}).exitCode, 8);
    EXPECT_EQ(curl("/readyz", "", {"--header", "Authorization:"}).status, 503);
    putInPlace(next.text, next.key);
    mend(found, "certificate-key-mismatch");
    EXPECT_EQ(fetchHome(), "alice");
    EXPECT_TRUE(handshakes({"-CAfile", worldRoot / "etc/velt/tls/server.crt"}));
    EXPECT_EQ(diagnosis(), "");
}

TEST_F(HostHealth, AKeyThatIsOpenToOthersIsFound) {
    const Certificate good = makeCertificate();
    putInPlace(good.text, good.key);
    done({"ftp", "set", "enable_ftps=on"});
    const std::string key = worldRoot / "etc/velt/tls/server.key";
    ASSERT_EQ(::chmod(key.c_str(), 0644), 0);
    const std::string found = diagnosis();
    EXPECT_EQ(found, "certificate-unusable: chmod 640 " + key + " && veltctl restart ftp\n");
    mend(found, "certificate-unusable");
    EXPECT_EQ(diagnosis(), "");
}

TEST_F(HostHealth, ADaemonThatIsStuckIsExchanged) {
    done({"ftp", "set", "enable_ftp=on"});
    done({"sftp", "set", "enable=on"});
    furnishSftp();
    for (const char* each : {"ftpd", "sftp"}) {
        signalDaemon(each, "-STOP");
    }
    const std::string found = diagnosis();
    EXPECT_EQ(found, "no-greeting: veltctl restart ftp\nno-greeting: veltctl restart sftp\n");
    mend(found, "no-greeting");
    EXPECT_EQ(fetchHome(), "alice");
    EXPECT_TRUE(servesSftp(2222));
    EXPECT_EQ(diagnosis(), "");
}

TEST_F(HostHealth, SettingsThatWereEditedByHandAreFound) {
    done({"ftp", "set", "enable_ftp=on", "timeout=400"});
    const fs::path file = worldRoot / "etc/velt/ftp.conf";
    std::string text = contentsOf(file);
    const auto place = text.find("timeout = 400");
    ASSERT_NE(place, std::string::npos) << text;
    writeFile(file, text.replace(place, 13, "timeout = 500"));
    std::string found = diagnosis();
    EXPECT_EQ(found, "settings-not-in-force: veltctl restart ftp\n");
    mend(found, "settings-not-in-force");
    EXPECT_EQ(diagnosis(), "");
    writeFile(file, "nonsense\n");
    found = diagnosis();
    EXPECT_EQ(found, "service-former-settings: Correct the file, then run: veltctl restart ftp\n");
    EXPECT_NE(veltctl({"restart", "ftp"}).exitCode, 0) << "the file is to be corrected first";
    writeFile(file, text);
    mend(found, "service-former-settings");
    EXPECT_EQ(diagnosis(), "");
}

TEST_F(HostHealth, AStartThatFailedAtTheBootIsMadeUpFor) {
    done({"ftp", "set", "enable_ftp=on"});
    done({"sftp", "set", "enable=on"});
    EXPECT_EQ(stopHost(), 0);
    ASSERT_EQ(runProcess({"pkill", "--exact", "velt-supervise"}).exitCode, 0);
    ASSERT_TRUE(waitUntil([] { return !somethingListens(); }, seconds(10)));
    furnishSftp();
    std::string found;
    {
        const TakenPort other(port);
        const TakenPort further(2222, TakenPort::As::bound);
        startHost();
        found = diagnosis();
        const std::string hint = "End the program that has the port, or choose another port, then run: ";
        EXPECT_EQ(found, "service-down: " + hint + "veltctl restart ftp\nservice-down: " + hint +
                             "veltctl restart sftp\n");
        EXPECT_TRUE(contains(veltctl({"status"}).output, "2 errors: see 'veltctl doctor'."));
        const std::string log = done({"log"});
        EXPECT_TRUE(contains(log, "The FTP service is on, but could not be started: Port 2121 is in use by "))
            << log;
        const ProcessResult inVain = veltctl({"restart", "ftp"});
        EXPECT_NE(inVain.exitCode, 0);
        EXPECT_TRUE(contains(inVain.errors, "Port 2121 is in use by system-host-tes")) << inVain.errors;
    }
    mend(found.substr(0, found.find('\n') + 1), "service-down");
    EXPECT_EQ(fetchHome(), "alice");
    EXPECT_TRUE(
        waitUntil([] { return contains(done({"log"}), "The SFTP service runs again."); }, seconds(10)))
        << "without the command, too";
    EXPECT_TRUE(servesSftp(2222));
    EXPECT_EQ(diagnosis(), "");
}

TEST_F(HostHealth, FilesThatKeepEverybodyOutAreFound) {
    done({"ftp", "set", "enable_ftp=on"});
    const std::string all = contentsOf(sharesFile);
    fs::remove(rulesFile);
    Json::Value misspelt = jsonOf(all);
    misspelt["shares"][0]["users"]["alicia"] = "read";
    writeFile(sharesFile, textOf(misspelt));
    EXPECT_EQ(fetchHome(), "") << "nobody can log in";
    std::string found = diagnosis();
    EXPECT_EQ(found, "rules-missing: Put your copy back, or, if there were no rules, run: "
                     "echo velt-chroot-rules 1 | install -m 600 /dev/stdin " +
                         rulesFile + "\nshares-unknown-account: Correct the name in " + sharesFile +
                         ", then run: veltctl doctor\n");
    done({"restart", "ftp"});
    EXPECT_EQ(fetchHome(), "") << "a start makes no empty file, which would confine nobody";
    const auto refused = veltctl({"chroot", "users", "add", "alice"});
    EXPECT_NE(refused.exitCode, 0);
    EXPECT_TRUE(contains(refused.errors, "The file of the chroot rules, " + rulesFile + ", is missing."))
        << refused.errors;
    mend(found, "rules-missing");
    EXPECT_EQ(fetchHome(), "alice");
    writeFile(sharesFile, "{");
    ASSERT_EQ(::chmod(rulesFile.c_str(), 0666), 0);
    EXPECT_EQ(fetchHome(), "");
    found = diagnosis();
    EXPECT_EQ(found, "shares-damaged: Correct " + sharesFile +
                         ", then run: veltctl doctor\nrules-untrusted: chown root " + rulesFile +
                         " && chmod go-w " + rulesFile + "\n");
    mend(found, "rules-untrusted");
    writeFile(sharesFile, all);
    EXPECT_EQ(fetchHome(), "alice");
    EXPECT_EQ(diagnosis(), "");
}

TEST_F(HostHealth, AProgramThatLoginsNeedAndThatCannotBeRunIsFound) {
    EXPECT_EQ(stopHost(), 0);
    programFolder = "/mnt/programs";
    fs::create_directories(programFolder);
    for (const char* each : {"velt-login-view", "velt-authorized-keys", "velt-supervise", "mod_velt_login.so",
                             "velt-sftp-session.so"}) {
        fs::copy_file(fs::path(VELT_BUILT_FOLDER) / each, fs::path(programFolder) / each,
                      fs::copy_options::overwrite_existing);
    }
    startHost();
    done({"ftp", "set", "enable_ftp=on"});
    EXPECT_EQ(fetchHome(), "alice");
    EXPECT_EQ(diagnosis(), "");
    const std::string view = programFolder + "/velt-login-view";
    ASSERT_EQ(::chmod(view.c_str(), 0644), 0);
    EXPECT_EQ(fetchHome(), "");
    std::string found = diagnosis();
    EXPECT_EQ(found, "program-unusable: chmod 755 " + view + "\n");
    EXPECT_EQ(veltctl({"doctor"}).exitCode, 8);
    mend(found, "program-unusable");
    EXPECT_EQ(fetchHome(), "alice");
    EXPECT_EQ(diagnosis(), "") << "as it is now";
    fs::rename(view, view + ".gone");
    EXPECT_EQ(fetchHome(), "");
    found = diagnosis();
    EXPECT_EQ(found, "program-unusable: Install this system again, then run: veltctl doctor\n");
    fs::rename(view + ".gone", view);
    EXPECT_EQ(diagnosis(), "");
}

TEST_F(HostHealth, SettingsThatNoStartCouldUseAreFoundWhileTheServiceRuns) {
    done({"ftp", "set", "enable_ftp=on", "timeout=400"});
    const fs::path file = worldRoot / "etc/velt/ftp.conf";
    const std::string good = contentsOf(file);
    std::string bad = good;
    writeFile(file, bad.replace(good.find("timeout = 400"), 13, "timeout = -4"));
    EXPECT_EQ(diagnosis(), "settings-refused: Correct " + file.string() + ", then run: veltctl doctor\n");
    EXPECT_NE(veltctl({"ftp", "set", "maxnumclients=7"}).exitCode, 0);
    writeFile(file, good);
    EXPECT_EQ(diagnosis(), "");
    for (const char* each : {"network.conf", "bans.conf", "known_services.conf"}) {
        const fs::path other = worldRoot / "etc/velt" / each;
        const bool isThere = fs::exists(other);
        const std::string before = isThere ? contentsOf(other) : "";
        writeFile(other, "junk\n");
        EXPECT_EQ(diagnosis(),
                  "settings-damaged: Correct " + other.string() + ", then run: veltctl doctor\n");
        if (isThere) {
            writeFile(other, before);
        } else {
            fs::remove(other);
        }
    }
    EXPECT_EQ(diagnosis(), "");
}

TEST_F(HostHealth, APortThatCannotBeJudgedIsRefusedWithTheReason) {
    const fs::path file = worldRoot / "etc/velt/known_services.conf";
    writeFile(file, "junk\n");
    const ProcessResult move = veltctl({"ftp", "set", "enable_ftp=on", "portnum=2191"});
    EXPECT_NE(move.exitCode, 0);
    EXPECT_TRUE(contains(move.errors, "Cannot read " + file.string() + ", line 1: expected a port"))
        << move.errors;
    EXPECT_FALSE(contains(move.errors, "from 1 to 65535")) << move.errors;
    fs::remove(file);
}

TEST_F(HostHealth, AShareThatKeepsAnonymousUsersOutIsFound) {
    done({"ftp", "set", "enable_ftp=on"});
    done({"security", "set", "anonymous=on", "anonymous_chroot=on", "anonymous_chroot_share=public"});
    EXPECT_EQ(anonymousLogin(), 230);
    EXPECT_EQ(diagnosis(), "");
    const std::string all = contentsOf(sharesFile);
    Json::Value closed = jsonOf(all);
    std::string folder;
    for (Json::Value& share : closed["shares"]) {
        if (share["name"] == "public") {
            share["users"].removeMember("ftp");
            folder = share["path"].asString();
        }
    }
    writeFile(sharesFile, textOf(closed));
    EXPECT_EQ(anonymousLogin(), 530);
    EXPECT_EQ(diagnosis(), "anonymous-kept-out: Write \"ftp\": \"read\" into the users of the share in " +
                               sharesFile + ", then run: veltctl doctor\n");
    writeFile(sharesFile, all);
    fs::rename(folder, folder + ".away");
    EXPECT_EQ(anonymousLogin(), 530);
    const std::string found = diagnosis();
    EXPECT_EQ(found, "anonymous-kept-out: Put your copy back, or, for an empty one, run: install -d " +
                         folder + "\n");
    mend(found, "anonymous-kept-out");
    EXPECT_EQ(anonymousLogin(), 230);
    EXPECT_EQ(diagnosis(), "");
    fs::remove(folder);
    fs::rename(folder + ".away", folder);
}

TEST_F(HostHealth, ALogThatIsDamagedIsFoundAndPutAside) {
    const std::string log = worldRoot / "var/lib/velt/log.db";
    EXPECT_EQ(diagnosis(), "");
    for (const char* each : {"", "-wal", "-shm"}) {
        fs::remove(log + each);
    }
    writeFile(log, std::string(5000, 'x'));
    const std::string found = diagnosis();
    EXPECT_TRUE(contains(found, "log-unusable: ")) << found;
    EXPECT_EQ(veltctl({"log"}).exitCode, 5);
    mend(found, "log-unusable");
    EXPECT_EQ(diagnosis(), "");
    done({"ftp", "set", "timeout=444"});
    EXPECT_TRUE(contains(done({"history"}), "/ftp/timeout"));
}

TEST_F(HostHealth, ADaemonThatWasKilledIsInTheLogAndInTheEvents) {
    done({"ftp", "set", "enable_ftp=on"});
    done({"sftp", "set", "enable=on"});
    for (const auto& [each, title] : {std::pair("ftpd", "FTP"), std::pair("sftp", "SFTP")}) {
        signalDaemon(each, "-KILL");
        const std::string again = std::string(" The ") + title + " service runs again.";
        EXPECT_TRUE(waitUntil([&] { return contains(done({"log"}), again); }, seconds(10)));
    }
    const std::string log = done({"log"});
    EXPECT_TRUE(contains(log, "The FTP service ended unexpectedly: ")) << log;
    EXPECT_TRUE(contains(log, "The SFTP service ended unexpectedly: ")) << log;
    const std::string events = contentsOf(worldRoot / "var/log/velt/events.jsonl");
    EXPECT_TRUE(contains(events, R"("ended")") && contains(events, R"("recovered")")) << events;
    EXPECT_EQ(diagnosis(), "");
}

TEST_F(HostHealth, DaemonsOfReplacedProgramsAreFound) {
    const ReplaceablePrograms programs("/usr/sbin");
    furnishSftp();
    done({"ftp", "set", "enable_ftp=on"});
    done({"sftp", "set", "enable=on"});
    programs.replace("proftpd");
    programs.replace("sshd");
    FtpSession session = aliceAt();
    const std::string found = diagnosis();
    EXPECT_EQ(found, "program-replaced: veltctl restart ftp\nprogram-replaced: veltctl restart sftp\n");
    mend(found, "program-replaced");
    EXPECT_EQ(diagnosis(), "");
    EXPECT_EQ(session.command("NOOP").code, 200) << "the port was handed over";
    EXPECT_TRUE(servesSftp(2222));
    session.command("QUIT");
    done({"ftp", "set", "enable_ftp=off"});
    done({"sftp", "set", "enable=off"});
}

TEST_F(HostHealth, APortThatIsBoundAndDoesNotListenIsNoHalfMove) {
    done({"ftp", "set", "enable_ftp=on"});
    {
        const TakenPort other(2131, TakenPort::As::bound);
        const ProcessResult move = veltctl({"ftp", "set", "portnum=2131"});
        EXPECT_EQ(move.exitCode, 4) << move.errors;
        EXPECT_TRUE(contains(move.errors, "2131")) << move.errors;
        EXPECT_EQ(jsonOf(exported())["ftp"]["portnum"], port);
        EXPECT_EQ(fetchHome(), "alice");
        EXPECT_EQ(diagnosis(), "");
    }
    done({"ftp", "set", "portnum=2131"});
    EXPECT_EQ(fetchHome(2131), "alice");
    EXPECT_TRUE(contains(done({"log"}), "The FTP port was changed from 2121 to 2131."));
}

} // namespace
} // namespace velt::test
