// Whole requests that change the FTP settings: what happens, in which order.

#include "ftp/ftp.h"
#include "module/entry_functions.h"
#include "tests/support/fake_platform/text.h"
#include "tests/unit/ftp_journal.h"

#include <algorithm>
#include <cstring>
#include <random>

using namespace ftptest;

namespace {

class FTPSetTest : public FTPTest {
protected:
    /// FTPS alone is configured but off, everything else is off.
    void allOff() { platform.conf.service_flags = 2; }

    /// Plain FTP alone is configured and on, everything else is on.
    void allOn() {
        platform.services["ftpd"] = 1;
        auto& conf = platform.conf;
        setPort(conf, "2121");
        conf.passive_port_min = 50000;
        conf.passive_port_max = 50100;
        conf.use_ext_ip = conf.enable_fxp = conf.enable_flow_ctrl = conf.support_utf8 = 7;
        conf.maxuploadrate = 100;
        conf.maxdownloadrate = 200;
        conf.max_conn_per_ip = 5;
        conf.service_flags = 1;
        platform.timeout = 600;
        platform.fips = platform.ascii = platform.useUtf8 = 7;
        platform.extIp = "203.0.113.7";
    }

    static std::string switchedOn(const std::string& utf8) {
        return request(R"("timeout":600,"portnum":2121,"custom_port_range":true,"custom_port":"50000:50100",)"
                       R"("use_ext_ip":true,"ext_ip":"203.0.113.7",)" +
                           utf8 +
                           R"(,"enable_fxp":true,"enable_fips":true,"enable_ascii":true,)"
                           R"("enable_flow_ctrl":true,"maxuploadrate":100,"maxdownloadrate":200,)"
                           R"("max_conn_per_ip":5)",
                       true, false);
    }

    static std::string switchedOff(const std::string& utf8) {
        return request(R"("timeout":0,"portnum":21,"custom_port_range":false,"custom_port":"50000:50100",)"
                       R"("use_ext_ip":false,"ext_ip":"198.51.100.1",)" +
                           utf8 +
                           R"(,"enable_fxp":false,"enable_fips":false,"enable_ascii":false,)"
                           R"("enable_flow_ctrl":false,"maxuploadrate":0,"maxdownloadrate":0,)"
                           R"("max_conn_per_ip":0)",
                       false, true);
    }

    /// What allOn() is, as a request of version 3, without the address.
    static std::string repeated() {
        return request(
            R"("timeout":600,"portnum":2121,"custom_port_range":true,"custom_port":"50000:50100",)"
            R"("use_ext_ip":true,"utf8_mode":2,"enable_fxp":true,"enable_fips":true,"enable_ascii":true,)"
            R"("enable_flow_ctrl":true,"maxuploadrate":100,"maxdownloadrate":200,"max_conn_per_ip":5)",
            true, false);
    }

    /// From the request to the store: everything is switched on. `utf8Set` is the call that sets the switch,
    /// if any.
    static Lines switchingOn(const Lines& utf8Set, const std::string& supportUtf8) {
        return Lines{getParams(), R"(WebUtils::IsPortConflict("ftp", 2121, 2121))",
                     R"(WebUtils::IsPortConflict("ftp", 50000, 50100))"} +
               reads() + "VELTFTPTimeOutGet()" + "VELTFTPTimeOutSet(600)" + readsAddress() +
               R"(VLIBCINFOSetKeyValue("ftp_ext_ip", "203.0.113.7"))" + useUtf8Get + utf8Set +
               "VELTFTPFIPSEnabledGet()" + "VELTFTPFIPSEnabledSet(1)" + "VELTFTPASCIIEnabledGet()" +
               "VELTFTPASCIIEnabledSet(1)" +
               stores(R"(portnum: "2121", use_ext_ip: 1, enable_flow_ctrl: 1, maxuploadrate: 100, )"
                      "maxdownloadrate: 200, passive_port_min: 50000, passive_port_max: 50100, "
                      "service_flags: 1, " +
                      supportUtf8 + "max_conn_per_ip: 5, enable_fxp: 1") +
               "VELTFwRuleHup()";
    }

    static Lines switchingOff(const Lines& utf8Set, const std::string& supportUtf8) {
        return Lines{getParams(), R"(WebUtils::IsPortConflict("ftp", 21, 21))"} + reads(true) +
               "VELTFTPTimeOutGet()" + "VELTFTPTimeOutSet(0)" + readsAddress() +
               R"(VLIBCINFOSetKeyValue("ftp_ext_ip", "198.51.100.1"))" + useUtf8Get + utf8Set +
               "VELTFTPFIPSEnabledGet()" + "VELTFTPFIPSEnabledSet(0)" + "VELTFTPASCIIEnabledGet()" +
               "VELTFTPASCIIEnabledSet(0)" +
               stores(R"(portnum: "21", use_ext_ip: 0, enable_flow_ctrl: 0, maxuploadrate: 0, )"
                      "maxdownloadrate: 0, passive_port_min: 0, passive_port_max: 0, service_flags: 2, " +
                      supportUtf8 + "max_conn_per_ip: 0, enable_fxp: 0") +
               "VELTFwRuleHup()";
    }

    /// The administrator log of both, and the answer.
    static Lines recordsSwitchingOn(const Lines& utf8Entry) {
        return Lines{entry("0x11B00002"),
                     entry("0x11B00012", "21", "2121"),
                     "VELTFTPDefaultPassivePortGet()",
                     entry("0x11B0000A", "55536 - 55899", "50000 - 50100"),
                     entry("0x11B00020", "ON"),
                     entry("0x11B00019", "Disabled"),
                     entry("0x11B00009", "0 KB/s", "200 KB/s"),
                     entry("0x11B00008", "0 KB/s", "100 KB/s"),
                     entry("0x11B00022", "5")} +
               utf8Entry + entry("0x11B00013") + succeeded();
    }

    static Lines recordsSwitchingOff(const Lines& utf8Entry) {
        return Lines{entry("0x11B00012", "2121", "21"),
                     "VELTFTPDefaultPassivePortGet()",
                     entry("0x11B0000A", "50000 - 50100", "55536 - 55899"),
                     entry("0x11B00020", "OFF"),
                     entry("0x11B00019", "Enabled"),
                     entry("0x11B00009", "200 KB/s", "0 KB/s"),
                     entry("0x11B00008", "100 KB/s", "0 KB/s"),
                     entry("0x11B00022", "Off")} +
               utf8Entry + succeeded();
    }
};

Lines setsUse() {
    return {"VELTFTPUseUTF8Set(1)"};
}

Lines clearsUse() {
    return {"VELTFTPUseUTF8Set(0)"};
}

Lines supportOn() {
    return {entry("0x11B00021", "On")};
}

Lines supportOff() {
    return {entry("0x11B00021", "Off")};
}

} // namespace

TEST_F(FTPSetTest, Version1SwitchesEverySettingOn) {
    allOff();
    EXPECT_EQ(run(FTPSet, switchedOn(R"("enable_utf8":true)")), switchingOn({}, "support_utf8: 1, ") +
                                                                    stops() + startsPlain() +
                                                                    recordsSwitchingOn(supportOn()));
}

TEST_F(FTPSetTest, Version2SwitchesEverySettingOn) {
    allOff();
    platform.conf.support_utf8 = 1;
    EXPECT_EQ(run(FTPSetV2, switchedOn(R"("use_utf8":true)")),
              switchingOn(setsUse(), "") + stops() + startsPlain() + recordsSwitchingOn({}));
}

TEST_F(FTPSetTest, Version3SwitchesEverySettingOn) {
    allOff();
    EXPECT_EQ(run(FTPSetV3, switchedOn(R"("utf8_mode":2)")), switchingOn(setsUse(), "support_utf8: 1, ") +
                                                                 stops() + startsPlain() +
                                                                 recordsSwitchingOn(supportOn()));
}

TEST_F(FTPSetTest, Version1SwitchesEverySettingOff) {
    allOn();
    platform.useUtf8 = 0;
    EXPECT_EQ(run(FTPSet, switchedOff(R"("enable_utf8":false)")), switchingOff({}, "support_utf8: 0, ") +
                                                                      stops() + startsTls() +
                                                                      recordsSwitchingOff(supportOff()));
}

TEST_F(FTPSetTest, Version2SwitchesEverySettingOff) {
    allOn();
    EXPECT_EQ(run(FTPSetV2, switchedOff(R"("use_utf8":false)")),
              switchingOff(clearsUse(), "") + stops() + startsTls() + recordsSwitchingOff({}));
}

TEST_F(FTPSetTest, Version3SwitchesEverySettingOff) {
    allOn();
    EXPECT_EQ(run(FTPSetV3, switchedOff(R"("utf8_mode":0)")), switchingOff(clearsUse(), "support_utf8: 0, ") +
                                                                  stops() + startsTls() +
                                                                  recordsSwitchingOff(supportOff()));
}

TEST_F(FTPSetTest, AVersionBelow1IsVersion1AndOneAbove3IsVersion3) {
    allOff();
    EXPECT_EQ(run(setVersion0, switchedOn(R"("enable_utf8":true)")), switchingOn({}, "support_utf8: 1, ") +
                                                                         stops() + startsPlain() +
                                                                         recordsSwitchingOn(supportOn()));
    startAfresh();
    allOff();
    EXPECT_EQ(run(setVersion4, switchedOn(R"("utf8_mode":2)")), switchingOn(setsUse(), "support_utf8: 1, ") +
                                                                    stops() + startsPlain() +
                                                                    recordsSwitchingOn(supportOn()));
}

TEST_F(FTPSetTest, WhatWasSetIsReadBack) {
    const std::string params = switchedOn(R"("utf8_mode":2)");
    run(FTPSetV3, params);
    run(FTPGetV3);
    EXPECT_EQ(answer().data, json(params));
}

TEST_F(FTPSetTest, ARequestThatRepeatsEveryValueChangesNothing) {
    allOn();
    EXPECT_EQ(run(FTPSetV3, repeated()),
              (Lines{getParams(), R"(WebUtils::IsPortConflict("ftp", 2121, 2121))",
                     R"(WebUtils::IsPortConflict("ftp", 50000, 50100))"} +
               reads(true) + "VELTFTPTimeOutGet()" + useUtf8Get + "VELTFTPFIPSEnabledGet()" +
               "VELTFTPASCIIEnabledGet()" + succeeded()));
}

TEST_F(FTPSetTest, OneDifferenceAmongRepeatedValuesIsEnoughToRestart) {
    const struct {
        const char* key;
        Json::Value value;
        int reloads;
    } rows[] = {
        {"enable_ftp", false, 0},       {"enable_ftps", true, 0},        {"timeout", 601, 0},
        {"portnum", 2122, 1},           {"custom_port_range", false, 1}, {"custom_port", "50000:50101", 1},
        {"use_ext_ip", false, 0},       {"ext_ip", "203.0.113.7", 0},    {"utf8_mode", 1, 0},
        {"enable_fxp", false, 0},       {"enable_fips", false, 0},       {"enable_ascii", false, 0},
        {"enable_flow_ctrl", false, 0}, {"maxuploadrate", 101, 0},       {"maxdownloadrate", 201, 0},
        {"max_conn_per_ip", 6, 0}};
    for (const auto& row : rows) {
        SCOPED_TRACE(row.key);
        startAfresh();
        allOn();
        Json::Value params = json(repeated());
        params[row.key] = row.value;
        run(FTPSetV3, fake::render(params));
        EXPECT_EQ(platform.count("VELTFTPConfSet"), 1);
        EXPECT_EQ(platform.count("VELTFwRuleHup"), row.reloads);
        EXPECT_EQ(platform.callsTo("VLIBServicectlStop") +
                      platform.callsTo("VLIBServicecfgRunKeySet(\"ftpd-ssl\", 2)"),
                  stopCalls(3) + stopCalls().back());
    }
}

TEST_F(FTPSetTest, ARequestWithTheServiceSwitchesAloneReadsNothingMore) {
    EXPECT_EQ(run(FTPSet, request()), Lines{getParams()} + reads() + useUtf8Get + succeeded());
}

TEST_F(FTPSetTest, TheServiceSwitchesAreComparedWithTheRecordAndNotWithTheController) {
    platform.services["ftpd"] = 1;
    EXPECT_EQ(run(FTPSet, request("", false, false)),
              Lines{getParams()} + reads(true) + useUtf8Get + succeeded());
    platform.services["ftpd"] = 0;
    platform.conf.service_flags = 3;
    EXPECT_EQ(run(FTPSet, request("", true, true)), Lines{getParams()} + reads() + useUtf8Get + succeeded());
}

TEST_F(FTPSetTest, StartsWhatIsEnabled) {
    const struct {
        bool plain, tls;
        Lines starts;
    } rows[] = {{true, false, startsPlain()}, {false, true, startsTls()}, {true, true, startsBoth()}};
    for (const auto& row : rows) {
        SCOPED_TRACE(row.starts.front());
        startAfresh();
        platform.services["ftpd-ssl"] = 1;
        platform.conf.service_flags = (row.plain ? 1 : 0) + (row.tls ? 2 : 0);
        const Lines journal = run(FTPSet, request(R"("maxuploadrate":5)", row.plain, row.tls));
        EXPECT_EQ(journal, Lines{getParams()} + reads() + useUtf8Get + stores("maxuploadrate: 5") + stops() +
                               row.starts + entry("0x11B00008", "0 KB/s", "5 KB/s") + succeeded());
        EXPECT_EQ(platform.runKeys["ftpd"], row.plain ? 1 : 2) << "FTPS alone leaves the key at 2";
        EXPECT_EQ(platform.runKeys["ftpd-ssl"], row.tls ? 1 : 2);
        EXPECT_EQ(platform.running.count("ftpd"), 1U);
    }
}

TEST_F(FTPSetTest, StartsNothingWhenBothServicesAreOff) {
    platform.services["ftpd"] = 1;
    platform.conf.service_flags = 3;
    platform.running = {"ftpd", "ftpd-pure", "ftpd-ssl"};
    EXPECT_EQ(run(FTPSet, request()), Lines{getParams()} + reads(true) + useUtf8Get +
                                          stores("service_flags: 0") + stops() + entry("0x11B00006") +
                                          succeeded());
    EXPECT_EQ(platform.running, std::set<std::string>{});
    EXPECT_EQ(platform.runKeys, (std::map<std::string, int>{{"ftpd", 2}, {"ftpd-ssl", 2}}));
}

TEST_F(FTPSetTest, OtherFlagsCountAsEnabledForTheLogAndStartNothing) {
    platform.services["ftpd"] = 1;
    platform.conf.service_flags = 4 + 1;
    EXPECT_EQ(run(FTPSet, request(R"("max_conn_per_ip":8)")),
              Lines{getParams()} + reads(true) + useUtf8Get + stores("service_flags: 4, max_conn_per_ip: 8") +
                  stops() + entry("0x11B00022", "8") + succeeded());
}

TEST_F(FTPSetTest, AMapThatMovesIsFollowed) {
    platform.hashMoves = true;
    EXPECT_EQ(run(FTPSet, request(R"("enable_fxp":true)")),
              Lines{getParams()} + applied({useUtf8Get}, "enable_fxp: 1"));
}

TEST_F(FTPSetTest, TheRestOfTheRecordComesBackByteForByte) {
    std::mt19937 random(20); // NOLINT(cert-msc32-c,cert-msc51-cpp): the same bytes in every run
    for (int round = 0; round < 50; ++round) {
        _tag_VELT_FTP_CONF_ stored;
        auto* bytes = reinterpret_cast<unsigned char*>(&stored);
        std::generate(bytes, bytes + sizeof(stored),
                      [&random] { return static_cast<unsigned char>(random()); });
        stored.portnum[7] = '\0';
        platform.conf = stored;
        const bool plain = (stored.service_flags & 1) != 0;
        const bool tls = (stored.service_flags & 2) != 0;

        run(FTPSet, request(R"("ext_ip":"203.0.113.7")", plain, tls));
        EXPECT_EQ(std::memcmp(&platform.conf, &stored, sizeof(stored)), 0) << "nothing of the record differs";

        run(FTPSet, request("", !plain, !tls));
        stored.service_flags ^= 3;
        EXPECT_EQ(std::memcmp(&platform.conf, &stored, sizeof(stored)), 0) << "only the two flags differ";
    }
    EXPECT_EQ(platform.count("VELTFTPConfSet"), 100);
}
