// What a "set" of the FTP settings leaves behind when a call fails.

#include "module/entry_functions.h"
#include "tests/unit/ftp_journal.h"

#include <algorithm>
#include <cstring>
#include <string>

using namespace ftptest;

namespace {

class FTPSetFailureTest : public FTPTest {
protected:
    /// A request whose `operation` fails: the calls up to it, the reason, and the failed answer.
    void expectFailure(const std::string& operation, VELT::APIEntryFunction entry, const std::string& params,
                       const Lines& calls, const std::string& message) {
        SCOPED_TRACE(operation);
        platform.fail(operation);
        EXPECT_EQ(run(entry, params),
                  Lines{getParams()} + calls + log(message) + failed("ftp", 1902, params));
    }

    /// A request that fails while services stop or start, beside the store of its one change.
    void expectServiceFailure(const std::string& operation, int nth, const std::string& params,
                              const Lines& calls, const std::string& message) {
        SCOPED_TRACE(operation + " " + std::to_string(nth));
        startAfresh();
        platform.conf.service_flags = flags;
        platform.fail(operation, nth);
        EXPECT_EQ(run(FTPSet, params), Lines{getParams()} + reads() + useUtf8Get + stores("enable_fxp: 1") +
                                           calls + log(message) + failed("ftp", 1902, params));
        EXPECT_EQ(platform.conf.enable_fxp, 1) << "the record is stored";
    }

    /// A start sequence of which each call fails in turn; announcements do not.
    void expectStartFailures(const std::string& params, const Lines& starts) {
        int startCalls = 0;
        int keyCalls = 2; // made while the services stopped
        for (auto line = starts.begin(); line != starts.end(); ++line) {
            const std::string operation = fake::Platform::operationOf(*line);
            const Lines calls = stops() + Lines(starts.begin(), line + 1);
            if (operation == "VLIBServicectlStart") {
                expectServiceFailure(operation, ++startCalls, params, calls, "Failed to enable FTP/FTPS.");
            } else if (operation == "VLIBServicecfgRunKeySet") {
                expectServiceFailure(operation, ++keyCalls, params, calls, "Failed to enable FTP/FTPS.");
            }
        }
    }

    /// A request that starts both services, all of whose announcements succeed but the one with `map`.
    Lines announcing(int map, const Lines& failedAnnouncement) {
        const Lines whole = Lines{getParams()} + reads() + useUtf8Get + stores("enable_fxp: 1") + stops() +
                            startsBoth() + entry("0x11B00002") + entry("0x11B00013") + succeeded();
        const char* const services[] = {"ftpd", "ftpd-ssl"};
        const Lines announcement = announces(map, services[(map + 1) % 2], map <= 2 ? "stop" : "start");
        const auto at = std::search(whole.begin(), whole.end(), announcement.begin(), announcement.end());
        EXPECT_NE(at, whole.end());
        return Lines(whole.begin(), at) + failedAnnouncement +
               Lines(at + static_cast<std::ptrdiff_t>(announcement.size()), whole.end());
    }

    int flags = 0;
};

std::string fxpPlain() {
    return request(R"("enable_fxp":true)", true, false);
}

std::string fxpTls() {
    return request(R"("enable_fxp":true)", false, true);
}

std::string fxpBoth() {
    return request(R"("enable_fxp":true)", true, true);
}

const char* const timeoutGet = "VELTFTPTimeOutGet()";
const char* const writesAddress = R"(VLIBCINFOSetKeyValue("ftp_ext_ip", "203.0.113.7"))";

} // namespace

TEST_F(FTPSetFailureTest, WithoutTheRecord) {
    expectFailure("VELTFTPConfGet", FTPSet, request(R"("timeout":5)"), reads(), "Failed to get FTP config.");
}

TEST_F(FTPSetFailureTest, AtTheTimeout) {
    expectFailure("VELTFTPTimeOutSet", FTPSet, request(R"("portnum":21,"timeout":5)"),
                  Lines{R"(WebUtils::IsPortConflict("ftp", 21, 21))"} + reads() + timeoutGet +
                      "VELTFTPTimeOutSet(5)",
                  "Failed to set FTP timeout.");
}

TEST_F(FTPSetFailureTest, AtReadingTheAddress) {
    platform.fail("VLIBCFileGetKeyValue");
    const std::string params = request(R"("ext_ip":"203.0.113.7")");
    EXPECT_EQ(run(FTPSet, params),
              Lines{getParams()} + reads() + readsAddress() + log("Failed to VLIBCFileGetKeyValue.") +
                  log("Failed to get FTP external IP setting.") + failed("ftp", 1902, params));
}

TEST_F(FTPSetFailureTest, AtWritingTheAddress) {
    expectFailure("VLIBCINFOSetKeyValue", FTPSet, request(R"("ext_ip":"203.0.113.7")"),
                  reads() + readsAddress() + writesAddress, "Failed to set FTP external IP");
}

TEST_F(FTPSetFailureTest, AtTheUseOfUtf8InVersion2) {
    platform.conf.support_utf8 = 1;
    expectFailure("VELTFTPUseUTF8Set", FTPSetV2, request(R"("use_utf8":true)"),
                  reads() + useUtf8Get + "VELTFTPUseUTF8Set(1)", "Failed to set FTP use UTF8 config.");
}

TEST_F(FTPSetFailureTest, AtTheUseOfUtf8InVersion3) {
    expectFailure("VELTFTPUseUTF8Set", FTPSetV3, request(R"("utf8_mode":1)"),
                  reads() + useUtf8Get + "VELTFTPUseUTF8Set(0)", "Failed to set FTP use UTF8 config.");
}

TEST_F(FTPSetFailureTest, AtFipsMode) {
    expectFailure("VELTFTPFIPSEnabledSet", FTPSet, request(R"("enable_fips":true)"),
                  reads() + useUtf8Get + "VELTFTPFIPSEnabledGet()" + "VELTFTPFIPSEnabledSet(1)",
                  "Failed to set FTP FIPS mode.");
}

TEST_F(FTPSetFailureTest, AtAsciiMode) {
    expectFailure("VELTFTPASCIIEnabledSet", FTPSet, request(R"("enable_ascii":true)"),
                  reads() + useUtf8Get + "VELTFTPASCIIEnabledGet()" + "VELTFTPASCIIEnabledSet(1)",
                  "Failed to set FTP ASCII mode.");
}

TEST_F(FTPSetFailureTest, AtTheStore) {
    const std::string params = request(R"("maxuploadrate":5,"portnum":2121)");
    expectFailure("VELTFTPConfSet", FTPSet, params,
                  Lines{R"(WebUtils::IsPortConflict("ftp", 2121, 2121))"} + reads() + useUtf8Get +
                      stores(R"(portnum: "2121", maxuploadrate: 5)"),
                  "Failed to set FTP config.");
}

TEST_F(FTPSetFailureTest, WhatWasSetBeforeAFailureStays) {
    platform.fail("VELTFTPASCIIEnabledSet");
    run(FTPSetV3, request(R"("timeout":5,"portnum":2121,"ext_ip":"203.0.113.7","utf8_mode":2,)"
                          R"("enable_fips":true,"enable_ascii":true,"maxuploadrate":5)",
                          true, true));
    EXPECT_EQ(answer().code, 1902);
    EXPECT_EQ(platform.timeout, 5);
    EXPECT_EQ(platform.extIp, "203.0.113.7");
    EXPECT_EQ(platform.useUtf8, 1);
    EXPECT_EQ(platform.fips, 1);
    EXPECT_EQ(platform.ascii, 0);
    const _tag_VELT_FTP_CONF_ untouched = fake::State::defaultConf();
    EXPECT_EQ(std::memcmp(&platform.conf, &untouched, sizeof(untouched)), 0);
    EXPECT_EQ(platform.count("VLIBServicectlStop"), 0);
}

TEST_F(FTPSetFailureTest, ANegativeAnswerOtherThanMinusOneIsAFailureToo) {
    platform.fail("VELTFTPConfSet", 1, -5);
    run(FTPSet, fxpPlain());
    EXPECT_EQ(answer().code, 1902);
}

TEST_F(FTPSetFailureTest, APositiveAnswerIsNoFailure) {
    for (const char* const operation :
         {"VELTFTPConfGet", "VELTFTPTimeOutSet", "VLIBCINFOSetKeyValue", "VELTFTPUseUTF8Set",
          "VELTFTPFIPSEnabledSet", "VELTFTPASCIIEnabledSet", "VELTFTPConfSet", "VELTFwRuleHup",
          "VLIBServicectlStop", "VLIBServicecfgRunKeySet", "VLIBSyseventEmit", "VLIBServicectlStart"}) {
        SCOPED_TRACE(operation);
        startAfresh();
        platform.fail(operation, fake::Platform::everyCall, 1);
        run(FTPSetV3, request(R"("timeout":5,"portnum":2121,"ext_ip":"203.0.113.7","utf8_mode":2,)"
                              R"("enable_fips":true,"enable_ascii":true)",
                              true, true));
        EXPECT_TRUE(answer().success);
        EXPECT_EQ(platform.callsTo("syslog"), Lines{});
    }
}

TEST_F(FTPSetFailureTest, AFirewallThatDoesNotReloadIsOnlyLogged) {
    platform.fail("VELTFwRuleHup");
    EXPECT_EQ(run(FTPSet, request(R"("portnum":2121)")),
              Lines{getParams()} + R"(WebUtils::IsPortConflict("ftp", 2121, 2121))" + reads() + useUtf8Get +
                  stores(R"(portnum: "2121")") + "VELTFwRuleHup()" + log("Failed to reload firewall rules.") +
                  stops() + succeeded());
}

TEST_F(FTPSetFailureTest, AtEachCallThatStopsTheServices) {
    flags = 1;
    for (int call = 1; call <= 5; ++call) {
        const bool stop = call <= 3;
        expectServiceFailure(stop ? "VLIBServicectlStop" : "VLIBServicecfgRunKeySet", stop ? call : call - 3,
                             fxpPlain(), stopCalls(call), "Failed to stop FTP/FTPS.");
    }
}

TEST_F(FTPSetFailureTest, AtEachCallThatStartsPlainFtp) {
    flags = 1;
    expectStartFailures(fxpPlain(), startsPlain());
}

TEST_F(FTPSetFailureTest, AtEachCallThatStartsFtps) {
    flags = 2;
    expectStartFailures(fxpTls(), startsTls());
}

TEST_F(FTPSetFailureTest, AtEachCallThatStartsBoth) {
    flags = 3;
    expectStartFailures(fxpBoth(), startsBoth());
}

TEST_F(FTPSetFailureTest, AnAnnouncementWithoutAMapIsLeftOut) {
    for (int announcement = 1; announcement <= 4; ++announcement) {
        SCOPED_TRACE(announcement);
        startAfresh();
        platform.conf.service_flags = 3;
        platform.fail("VLIBCSzHashAlloc", announcement);
        Lines expected = announcing(announcement, {"VLIBCSzHashAlloc(1024)", log("Failed to allocate hash")});
        // The maps after the missing one have its number and so on.
        for (int map = announcement; map < 4; ++map) {
            for (std::string& line : expected) {
                const auto at = line.find("(map" + std::to_string(map + 1));
                if (at != std::string::npos) {
                    line[at + std::strlen("(map")] = static_cast<char>('0' + map);
                }
            }
        }
        EXPECT_EQ(run(FTPSet, fxpBoth()), expected);
    }
}

TEST_F(FTPSetFailureTest, AnAnnouncementWhoseMapCannotBeFilledIsLeftOut) {
    const char* const services[] = {"ftpd", "ftpd-ssl"};
    for (int announcement = 1; announcement <= 4; ++announcement) {
        for (int key = 1; key <= 2; ++key) {
            SCOPED_TRACE(std::to_string(announcement) + ", key " + std::to_string(key));
            startAfresh();
            platform.conf.service_flags = 3;
            platform.fail("VLIBCSzHashSetValue", 2 * (announcement - 1) + key);
            const Lines whole = announces(announcement, services[(announcement + 1) % 2],
                                          announcement <= 2 ? "stop" : "start");
            EXPECT_EQ(run(FTPSet, fxpBoth()),
                      announcing(announcement, Lines(whole.begin(), whole.begin() + 1 + key) +
                                                   log("Failed to set parameters") + whole.back()));
        }
    }
}

TEST_F(FTPSetFailureTest, AnAnnouncementThatIsNotTakenIsLogged) {
    const char* const services[] = {"ftpd", "ftpd-ssl"};
    for (int announcement = 1; announcement <= 4; ++announcement) {
        SCOPED_TRACE(announcement);
        startAfresh();
        platform.conf.service_flags = 3;
        platform.fail("VLIBSyseventEmit", announcement);
        const std::string service = services[(announcement + 1) % 2];
        const Lines whole = announces(announcement, service, announcement <= 2 ? "stop" : "start");
        EXPECT_EQ(run(FTPSet, fxpBoth()),
                  announcing(announcement,
                             Lines(whole.begin(), whole.end() - 1) +
                                 log("Failed to emit service action event for [%s]", "\"" + service + "\"") +
                                 whole.back()));
    }
}

TEST_F(FTPSetFailureTest, AnExceptionFromAnyCallEndsTheRequestThereAndLeavesNothingToFree) {
    const std::string params =
        request(R"("timeout":5,"portnum":2121,"ext_ip":"203.0.113.7","utf8_mode":2,"enable_fips":true,)"
                R"("enable_ascii":true,"custom_port_range":true,"custom_port":"1:2")",
                true, true);
    const Lines whole = run(FTPSetV3, params);
    ASSERT_TRUE(answer().success);
    std::map<std::string, int> calls;
    for (auto line = whole.begin(); line != whole.end(); ++line) {
        const std::string operation = fake::Platform::operationOf(*line);
        const int nth = ++calls[operation];
        if (operation == "VLIBCSzHashFree") {
            continue;
        }
        SCOPED_TRACE(operation + " " + std::to_string(nth));
        startAfresh();
        platform.throwFrom(operation, nth);
        Lines expected(whole.begin(), line + 1);
        if (operation == "VLIBCSzHashSetValue" || operation == "VLIBSyseventEmit") {
            expected.push_back(*std::find_if(line, whole.end(), [](const std::string& later) {
                return later.starts_with("VLIBCSzHashFree");
            }));
        }
        EXPECT_EQ(runThrowing<fake::Thrown>(FTPSetV3, params), expected);
        EXPECT_EQ(platform.handleErrors(), Lines{});
    }
}
