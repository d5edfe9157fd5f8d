#include "module/entry_functions.h"
#include "sftp/sftp.h"
#include "tests/support/handler_test.h"

#include <limits>
#include <tuple>

namespace {

using std::to_string;

constexpr char readConfig[] = "VELTSFTPConfigGet(1)";
constexpr char reloadFirewall[] = "VELTFwRuleHup()";
constexpr char pauseService[] = R"(VLIBServicePause("sftp"))";
constexpr char resumeService[] = R"(VLIBServiceResume("sftp"))";
constexpr char startService[] = R"(VLIBServiceStart("sftp", 0))";
constexpr char stopService[] = R"(VLIBServiceStop("sftp", 0))";
constexpr char enabledEntry[] = R"(VELTLogSet1(2, 1, 0x11B00036, "", "", "", ""))";

std::string conflictTest(int port) {
    return "WebUtils::IsPortConflict(\"ssh\", " + to_string(port) + ", " + to_string(port) + ")";
}

std::string store(int enable, int port) {
    return "VELTSFTPConfigSet(" + to_string(enable) + ", " + to_string(port) + ")";
}

std::string portEntry(const std::string& oldPort, const std::string& newPort) {
    return "VELTLogSet1(2, 1, 0x11B00035, \"" + oldPort + "\", \"" + newPort + R"(", "", ""))";
}

/// A "set" without a port up to the comparison with what is stored.
Lines begun() {
    return {getParams(), readConfig};
}

Lines begunWithPort(int port) {
    return {getParams(), conflictTest(port), readConfig};
}

class SFTPGetTest : public HandlerTest {};
class SFTPCheckTest : public HandlerTest {};

class SFTPSetTest : public HandlerTest {
protected:
    void SetUp() override {
        HandlerTest::SetUp();
        platform.lastError = {0x2A, "service.c", 77};
    }

    std::string failureOf(const std::string& call) const {
        return logLine("sftp", "Failed to " + call + "(sftp).[0x%04X %s:%d]", R"(0x2A, "service.c", 77)");
    }

    void storeSettings(int enable, int port) {
        platform.sftp.enable = enable;
        platform.sftp.port = port;
        platform.sftpAlive = enable;
    }
};

} // namespace

TEST_F(SFTPGetTest, AnswersThatTheServiceIsDownWhileTheStoredFlagIsOn) {
    platform.sftp.enable = 1;
    platform.sftp.port = 2222;
    EXPECT_EQ(run(SFTPGet),
              (Lines{readConfig, "VELTSFTPIsAlive()", succeeded(R"({"enable":false,"portnum":2222})")}));
}

TEST_F(SFTPGetTest, AnswersThatTheServiceRunsWhileTheStoredFlagIsOff) {
    platform.sftpAlive = 1;
    EXPECT_EQ(run(SFTPGet),
              (Lines{readConfig, "VELTSFTPIsAlive()", succeeded(R"({"enable":true,"portnum":22})")}));
}

TEST_F(SFTPGetTest, TakesAnyStateButZeroForRunning) {
    for (const int alive : {-1, 2, std::numeric_limits<int>::min()}) {
        platform.sftpAlive = alive;
        EXPECT_EQ(run(SFTPGet).back(), succeeded(R"({"enable":true,"portnum":22})")) << alive;
    }
}

TEST_F(SFTPGetTest, AnswersWithThePortAsAnUnsignedInteger) {
    platform.sftp.port = -1;
    EXPECT_EQ(run(SFTPGet).back(), succeeded(R"({"enable":false,"portnum":4294967295})"));
    EXPECT_EQ(answer().data["portnum"].type(), Json::uintValue);
    EXPECT_EQ(answer().data["enable"].type(), Json::booleanValue);
}

TEST_F(SFTPGetTest, FailsWhenTheConfigurationCannotBeRead) {
    platform.fail("VELTSFTPConfigGet");
    EXPECT_EQ(run(SFTPGet, R"({"unread":1})"),
              (Lines{readConfig, logLine("sftp", "Failed to get SFTP config.")} +
               failed("sftp", 1902, R"({"unread":1})")));
}

TEST_F(SFTPCheckTest, WantsEnableToBeABool) {
    for (const char* const params :
         {"{}", "null", R"({"enable":null})", R"({"enable":"true"})", R"({"enable":1})", R"({"enable":0})",
          R"({"enable":1.0})", R"({"enable":[true]})", R"({"enable":{}})", R"({"Enable":true})",
          R"({"portnum":222})", R"({"enable":1,"portnum":"22"})"}) {
        EXPECT_EQ(run(SFTPSet, params),
                  (Lines{getParams(), logLine("sftp", "bool variable 'enable' is missing.")} +
                   failed("sftp", 1901, params)))
            << params;
    }
}

TEST_F(SFTPCheckTest, WantsThePortToBeAnInteger) {
    for (const char* const port : {R"("22")", "22.5", "true", "[22]", "{}", "2147483648", "-2147483649",
                                   "4294967318", "18446744073709551615", "1e300"}) {
        const std::string params = std::string(R"({"enable":true,"portnum":)") + port + "}";
        const Lines journal = run(SFTPSet, params);
        const Lines rejected = Lines{getParams(), logLine("sftp", "Invalid type of input.")};
        EXPECT_EQ(journal, rejected + failed("sftp", 1901, params)) << params;
    }
}

TEST_F(SFTPCheckTest, WantsThePortWithinItsRange) {
    for (const int port : {0, -1, 65536, std::numeric_limits<int>::max(), std::numeric_limits<int>::min()}) {
        const std::string params = R"({"enable":true,"portnum":)" + to_string(port) + "}";
        const Lines rejected = {getParams(), logLine("sftp", "Invalid port value of input.")};
        EXPECT_EQ(run(SFTPSet, params), rejected + failed("sftp", 1901, params)) << params;
    }
}

TEST_F(SFTPCheckTest, LetsTheEndsOfThePortRangePass) {
    for (const int port : {1, 65535}) {
        const Lines expected =
            begunWithPort(port) + Lines{store(0, port), reloadFirewall, stopService, succeeded()};
        EXPECT_EQ(run(SFTPSet, R"({"enable":false,"portnum":)" + to_string(port) + "}"), expected);
    }
}

TEST_F(SFTPCheckTest, TakesARealWithoutFractionForAnInteger) {
    EXPECT_EQ(run(SFTPSet, R"({"enable":false,"portnum":22.0})"), begunWithPort(22) + Lines{succeeded()});
}

TEST_F(SFTPCheckTest, RefusesAPortThatAnotherServiceHolds) {
    platform.takenPorts["sftp"] = {222}; // the server's ports are registered as those of "ssh"
    const std::string params = R"({"enable":true,"portnum":222})";
    EXPECT_EQ(run(SFTPSet, params),
              (Lines{getParams(), conflictTest(222), logLine("sftp", "Port conflict.")} +
               failed("sftp", 1951, params)));
}

TEST_F(SFTPCheckTest, TestsAnUnchangedPortForConflictsToo) {
    platform.takenPorts["ftp"] = {22};
    const std::string params = R"({"enable":false,"portnum":22})";
    EXPECT_EQ(run(SFTPSet, params), (Lines{getParams(), conflictTest(22), logLine("sftp", "Port conflict.")} +
                                     failed("sftp", 1951, params)));
}

TEST_F(SFTPCheckTest, LetsThePortsOfTheSecureShellServicePass) {
    platform.takenPorts["ssh"] = {22};
    EXPECT_EQ(run(SFTPSet, R"({"enable":false,"portnum":22})"), begunWithPort(22) + Lines{succeeded()});
}

TEST_F(SFTPCheckTest, TestsNeighbouringPortsForNothing) {
    platform.takenPorts["ftp"] = {21, 23};
    EXPECT_EQ(run(SFTPSet, R"({"enable":false,"portnum":22})"), begunWithPort(22) + Lines{succeeded()});
}

TEST_F(SFTPCheckTest, LetsTheJsonLibrarysErrorPassWhenTheParametersAreNoObject) {
    for (const char* const params : {"[]", "[true]", "7", "true", R"("enable")"}) {
        EXPECT_EQ(runThrowing<Json::LogicError>(SFTPSet, params), Lines{getParams()}) << params;
    }
}

TEST_F(SFTPSetTest, DoesNothingWhenTheStateIsTheStoredOne) {
    for (const bool enable : {true, false}) {
        storeSettings(enable ? 1 : 0, 22);
        const std::string flag = enable ? R"({"enable":true)" : R"({"enable":false)";
        EXPECT_EQ(run(SFTPSet, flag + "}"), begun() + Lines{succeeded()});
        EXPECT_EQ(run(SFTPSet, flag + R"(,"portnum":null})"), begun() + Lines{succeeded()});
        EXPECT_EQ(run(SFTPSet, flag + R"(,"portnum":22})"), begunWithPort(22) + Lines{succeeded()});
    }
}

TEST_F(SFTPSetTest, TakesAnyStoredFlagButZeroForEnabled) {
    for (const int stored : {5, -1}) {
        storeSettings(stored, 22);
        EXPECT_EQ(run(SFTPSet, R"({"enable":true})"), begun() + Lines{succeeded()}) << stored;
    }
}

TEST_F(SFTPSetTest, PausesAndResumesWhenThePortChanges) {
    storeSettings(1, 22);
    EXPECT_EQ(run(SFTPSet, R"({"enable":true,"portnum":222})"),
              (begunWithPort(222) + Lines{pauseService, store(1, 222), reloadFirewall, resumeService,
                                          portEntry("22", "222"), succeeded()}));
    EXPECT_EQ(platform.sftp.port, 222);
    EXPECT_TRUE(platform.paused.empty());
}

TEST_F(SFTPSetTest, StoresTheEnableFlagAsItStandsWhenOnlyThePortChanges) {
    for (const int stored : {5, -1}) {
        storeSettings(stored, 22);
        EXPECT_EQ(run(SFTPSet, R"({"enable":true,"portnum":23})"),
                  (begunWithPort(23) + Lines{pauseService, store(stored, 23), reloadFirewall, resumeService,
                                             portEntry("22", "23"), succeeded()}));
    }
}

TEST_F(SFTPSetTest, StartsTheServiceWhenItBecomesEnabled) {
    for (const char* const params : {R"({"enable":true})", R"({"enable":true,"portnum":null})"}) {
        storeSettings(0, 22);
        EXPECT_EQ(run(SFTPSet, params),
                  (begun() + Lines{store(1, 22), startService, enabledEntry, succeeded()}));
        EXPECT_EQ(platform.sftpAlive, 1);
    }
}

TEST_F(SFTPSetTest, StartsTheServiceWithoutAFirewallReloadWhenTheRequestNamesTheStoredPort) {
    EXPECT_EQ(run(SFTPSet, R"({"enable":true,"portnum":22})"),
              (begunWithPort(22) + Lines{store(1, 22), startService, enabledEntry, succeeded()}));
}

TEST_F(SFTPSetTest, LogsThePortBeforeTheStartWhenBothChange) {
    EXPECT_EQ(run(SFTPSet, R"({"enable":true,"portnum":222})"),
              (begunWithPort(222) + Lines{store(1, 222), reloadFirewall, startService, portEntry("22", "222"),
                                          enabledEntry, succeeded()}));
}

TEST_F(SFTPSetTest, PausesAndStopsTheServiceWhenItBecomesDisabledAndLogsNothing) {
    for (const int stored : {7, -1}) {
        storeSettings(stored, 22);
        EXPECT_EQ(run(SFTPSet, R"({"enable":false})"),
                  (begun() + Lines{pauseService, store(0, 22), stopService, succeeded()}));
        EXPECT_EQ(platform.sftpAlive, 0);
    }
}

TEST_F(SFTPSetTest, LogsTheEnablingWhenTwoFlagsDifferThatBothMeanEnabled) {
    _tag_VELT_SFTP_CONFIG_ oldConf{};
    oldConf.enable = 5;
    oldConf.port = 22;
    _tag_VELT_SFTP_CONFIG_ newConf = oldConf;
    newConf.enable = 1;
    SFTPServiceHandler handler(nullptr, nullptr);
    handler.LogChanges(&oldConf, &newConf);
    EXPECT_EQ(platform.journal, Lines{enabledEntry});
}

TEST_F(SFTPSetTest, LogsNoPortChangeThatComesWithTheDisabling) {
    storeSettings(1, 22);
    EXPECT_EQ(
        run(SFTPSet, R"({"enable":false,"portnum":222})"),
        (begunWithPort(222) + Lines{pauseService, store(0, 222), reloadFirewall, stopService, succeeded()}));
}

TEST_F(SFTPSetTest, StopsTheServiceWhenThePortChangesWhileItStaysDisabled) {
    EXPECT_EQ(run(SFTPSet, R"({"enable":false,"portnum":222})"),
              (begunWithPort(222) + Lines{store(0, 222), reloadFirewall, stopService, succeeded()}));
}

TEST_F(SFTPSetTest, LogsAnOldPortOfAnySizeInFull) {
    storeSettings(1, std::numeric_limits<int>::min());
    EXPECT_EQ(run(SFTPSet, R"({"enable":true,"portnum":65535})"),
              (begunWithPort(65535) + Lines{pauseService, store(1, 65535), reloadFirewall, resumeService,
                                            portEntry("-2147483648", "65535"), succeeded()}));
}

TEST_F(SFTPSetTest, FailsWhenTheConfigurationCannotBeRead) {
    platform.fail("VELTSFTPConfigGet");
    const std::string params = R"({"enable":true})";
    EXPECT_EQ(run(SFTPSet, params),
              begun() + Lines{logLine("sftp", "Failed to get SFTP config.")} + failed("sftp", 1902, params));
}

TEST_F(SFTPSetTest, FailsWithNothingStoredWhenThePauseFails) {
    storeSettings(1, 22);
    platform.fail("VLIBServicePause");
    const std::string params = R"({"enable":true,"portnum":222})";
    EXPECT_EQ(run(SFTPSet, params), (begunWithPort(222) + Lines{pauseService, failureOf("VLIBServicePause")} +
                                     failed("sftp", 1902, params)));
    EXPECT_EQ(platform.logLines.front().rendered.substr(platform.logLines.front().rendered.find(' ')),
              " Failed to VLIBServicePause(sftp).[0x002A service.c:77]");
}

TEST_F(SFTPSetTest, LeavesTheServicePausedWhenTheStoreFails) {
    storeSettings(1, 22);
    platform.fail("VELTSFTPConfigSet");
    const std::string params = R"({"enable":true,"portnum":222})";
    EXPECT_EQ(run(SFTPSet, params),
              (begunWithPort(222) +
               Lines{pauseService, store(1, 222), logLine("sftp", "Failed to set SFTP config.")} +
               failed("sftp", 1902, params)));
    EXPECT_TRUE(platform.paused.contains("sftp"));

    EXPECT_EQ(run(SFTPSet, R"({"enable":true,"portnum":22})"), begunWithPort(22) + Lines{succeeded()});
    EXPECT_TRUE(platform.paused.contains("sftp")) << "what is stored is asked for: nothing is done";

    run(SFTPSet, params);
    EXPECT_TRUE(platform.paused.empty()) << "the next change resumes it";
}

TEST_F(SFTPSetTest, GoesOnWhenTheFirewallCannotBeReloaded) {
    storeSettings(1, 22);
    platform.fail("VELTFwRuleHup");
    EXPECT_EQ(run(SFTPSet, R"({"enable":true,"portnum":222})"),
              (begunWithPort(222) + Lines{pauseService, store(1, 222), reloadFirewall,
                                          logLine("sftp", "Failed to reload firewall rules."), resumeService,
                                          portEntry("22", "222"), succeeded()}));
}

TEST_F(SFTPSetTest, FailsWithoutALogEntryWhenTheResumeFails) {
    storeSettings(1, 22);
    platform.fail("VLIBServiceResume");
    const std::string params = R"({"enable":true,"portnum":222})";
    EXPECT_EQ(run(SFTPSet, params), (begunWithPort(222) +
                                     Lines{pauseService, store(1, 222), reloadFirewall, resumeService,
                                           failureOf("VLIBServiceResume")} +
                                     failed("sftp", 1902, params)));
}

TEST_F(SFTPSetTest, FailsWithoutALogEntryWhenTheStartFails) {
    platform.fail("VLIBServiceStart");
    const std::string params = R"({"enable":true})";
    EXPECT_EQ(run(SFTPSet, params),
              (begun() + Lines{store(1, 22), startService, failureOf("VLIBServiceStart")} +
               failed("sftp", 1902, params)));
}

TEST_F(SFTPSetTest, FailsWhenTheStopFails) {
    storeSettings(1, 22);
    platform.fail("VLIBServiceStop");
    const std::string params = R"({"enable":false})";
    EXPECT_EQ(run(SFTPSet, params),
              (begun() + Lines{pauseService, store(0, 22), stopService, failureOf("VLIBServiceStop")} +
               failed("sftp", 1902, params)));
}

TEST_F(SFTPSetTest, FailsWhenTheStopOfADisabledServiceFails) {
    platform.fail("VLIBServiceStop");
    const std::string params = R"({"enable":false,"portnum":222})";
    EXPECT_EQ(run(SFTPSet, params),
              (begunWithPort(222) +
               Lines{store(0, 222), reloadFirewall, stopService, failureOf("VLIBServiceStop")} +
               failed("sftp", 1902, params)));
}

TEST_F(SFTPSetTest, IgnoresTheFailureOfLogEntries) {
    platform.fail("VELTLogSet1", fake::Platform::everyCall);
    EXPECT_EQ(run(SFTPSet, R"({"enable":true,"portnum":222})"),
              (begunWithPort(222) + Lines{store(1, 222), reloadFirewall, startService, portEntry("22", "222"),
                                          enabledEntry, succeeded()}));
}

TEST_F(SFTPSetTest, TakesAPositiveResultForNoFailure) {
    for (const auto& [operation, oldEnable, newEnable] :
         {std::tuple("VELTSFTPConfigGet", 0, "true"), std::tuple("VLIBServicePause", 1, "true"),
          std::tuple("VELTSFTPConfigSet", 1, "true"), std::tuple("VELTFwRuleHup", 1, "true"),
          std::tuple("VLIBServiceResume", 1, "true"), std::tuple("VLIBServiceStart", 0, "true"),
          std::tuple("VLIBServiceStop", 1, "false")}) {
        SCOPED_TRACE(operation);
        startAfresh();
        storeSettings(oldEnable, 22);
        platform.fail(operation, 1, 1);
        const std::string params = std::string(R"({"enable":)") + newEnable + R"(,"portnum":222})";
        EXPECT_EQ(run(SFTPSet, params).back(), succeeded()) << operation;
        EXPECT_TRUE(platform.logLines.empty()) << operation;
    }
}

TEST_F(SFTPSetTest, LetsAnExceptionOfThePlatformPass) {
    storeSettings(1, 22);
    platform.throwFrom("VELTSFTPConfigSet");
    EXPECT_EQ(runThrowing<fake::Thrown>(SFTPSet, R"({"enable":true,"portnum":222})"),
              begunWithPort(222) + Lines({pauseService, store(1, 222)}));
}
