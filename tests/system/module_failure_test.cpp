// What the module answers when a request cannot be done, and what its clients have then.
#include "tests/support/text.h"
#include "tests/system/support/daemon_process.h"
#include "tests/system/support/module_service.h"

#include <sys/time.h>

#include <csignal>
#include <filesystem>

namespace velt::test {
namespace {

class ModuleFailure : public ModuleService {
protected:
    /// The request fails with the code, a sentence says why, and the service goes on as before.
    static void expectRefusal(const std::string& changes, int code, const std::string& sentence) {
        const ModuleAnswer answer = setFtp(changes);
        EXPECT_EQ(answer.code, code) << changes;
        EXPECT_EQ(answer.sentence, sentence) << changes;
        EXPECT_EQ(fetchHome(), "alice") << changes;
    }
};

TEST_F(ModuleFailure, saysWhyARangeIsRefused) {
    ASSERT_EQ(setFtp().code, 0);
    expectRefusal(R"({"custom_port_range": true, "custom_port": "40000:30000"})", rangeConflict,
                  "The port range is 40000-30000; its first port has to be lower than its last.");
    expectRefusal(R"({"custom_port_range": true, "custom_port": "2100:2200"})", rangeConflict,
                  "Port 2121 is taken by the FTP service.");
    expectRefusal(R"({"custom_port_range": true, "custom_port": "30000:70000"})", rangeConflict,
                  "Port 70000: expected a port from 1 to 65535.");
    expectRefusal(R"({"custom_port_range": true, "custom_port": "30000:30000"})", operationFailed,
                  "The passive port range has only the port 30000; the FTP daemon needs two ports or more.");
    expectRefusal(R"({"custom_port_range": true, "custom_port": "900:910"})", operationFailed,
                  "The passive port range is 900 to 910; expected ports from 1024 to 65535.");
    EXPECT_EQ(getFtp()["custom_port_range"], false);
}

TEST_F(ModuleFailure, saysWhyAPortIsRefused) {
    ASSERT_EQ(setFtp().code, 0);
    expectRefusal(
        R"({"portnum": 30005, "custom_port_range": true, "custom_port": "30000:30010"})", operationFailed,
        "The passive port range 30000 to 30010 contains the FTP port 30005; choose a range without it.");
    expectRefusal(
        R"({"portnum": 55600})", operationFailed,
        "The passive port range 55536 to 55899 contains the FTP port 55600; choose a range without it.");
    expectRefusal(R"({"portnum": 0})", portConflict, "Port 0: expected a port from 1 to 65535.");
    expectRefusal(R"({"portnum": 22})", portConflict, "Port 22 is taken by the SFTP service.");
    EXPECT_EQ(getFtp()["portnum"], port);
}

TEST_F(ModuleFailure, saysWhyAnotherValueIsRefused) {
    ASSERT_EQ(setFtp().code, 0);
    expectRefusal(
        R"({"ext_ip": "eth0"})", operationFailed,
        "The external address is \"eth0\"; expected an IPv4 address such as 192.0.2.1, or nothing.");
    expectRefusal(R"({"timeout": -5})", operationFailed,
                  "The FTP setting timeout is -5; expected a number from 0 to 86400.");
    EXPECT_EQ(getFtp()["ext_ip"], "");
}

TEST_F(ModuleFailure, namesTheProgramThatHasThePort) {
    ASSERT_EQ(setFtp().code, 0);
    const UniqueFd other = listenOn(2300);
    const ModuleAnswer answer = setFtp(R"({"portnum": 2300})");
    EXPECT_EQ(answer.code, portConflict);
    EXPECT_EQ(answer.sentence, "Port 2300 is taken by " + lastPortConflict().holder + ".");
    EXPECT_TRUE(contains(answer.sentence, "(process 1)")) << answer.sentence;
    EXPECT_EQ(fetchHome(), "alice");
}

TEST_F(ModuleFailure, refusesItsOwnPortWhileAStrangerHoldsIt) {
    ASSERT_EQ(setFtp(R"({"enable_ftp": false})").code, 0);
    const UniqueFd other = listenOn(port);
    const ModuleAnswer answer = setFtp();
    EXPECT_EQ(answer.code, portConflict);
    EXPECT_TRUE(contains(answer.sentence, "Port 2121 is taken by ")) << answer.sentence;
    EXPECT_EQ(logSentences(), std::vector<std::string>{}) << "nothing was switched on";
}

TEST_F(ModuleFailure, passesOnWhatTheDaemonSays) {
    ASSERT_EQ(setFtp().code, 0);
    const auto folder = worldRoot / "etc/velt/tls";
    std::filesystem::create_directories(folder);
    writeFile(folder / "server.crt", "no certificate\n");
    writeFile(folder / "server.key", "no key\n");
    const ModuleAnswer answer = setFtp(R"({"enable_ftps": true})");
    EXPECT_EQ(answer.code, operationFailed);
    EXPECT_TRUE(contains(answer.sentence, "server.crt")) << answer.sentence;
    EXPECT_TRUE(answer.sentence.ends_with(".")) << answer.sentence;
    EXPECT_EQ(fetchHome(), "alice") << "the service goes on with its former settings";
}

/// While it is there this process is interrupted every few milliseconds.
class Interruptions {
public:
    Interruptions() {
        struct sigaction action {};
        action.sa_handler = [](int) {}; // without SA_RESTART
        EXPECT_EQ(sigaction(SIGALRM, &action, nullptr), 0);
        every({0, 3000});
    }
    ~Interruptions() { every({0, 0}); }
    Interruptions(const Interruptions&) = delete;
    Interruptions& operator=(const Interruptions&) = delete;

private:
    static void every(timeval interval) {
        const itimerval timer{interval, interval};
        EXPECT_EQ(setitimer(ITIMER_REAL, &timer, nullptr), 0);
    }
};

TEST_F(ModuleFailure, noneComesFromASignalOfTheHost) {
    const Interruptions interruptions;
    for (const char* changes :
         {R"({"enable_ftps": true})", R"({"portnum": 2122})", R"({"enable_ftp": false})"}) {
        const ModuleAnswer answer = setFtp(changes);
        EXPECT_EQ(answer.code, 0) << changes << ": " << answer.sentence;
    }
    for (const char* parameters : {R"({"enable": true, "portnum": 2222})", R"({"enable": false})"}) {
        const ModuleAnswer answer = setSftp(parameters);
        EXPECT_EQ(answer.code, 0) << parameters << ": " << answer.sentence;
    }
}

} // namespace
} // namespace velt::test
