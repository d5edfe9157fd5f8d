// The administrator log of a changed FTP configuration.

#include "ftp/ftp.h"
#include "module/entry_functions.h"
#include "tests/unit/ftp_journal.h"

#include <climits>
#include <cstring>

using namespace ftptest;

namespace {

using Conf = _tag_VELT_FTP_CONF_;

class FTPChangeLogTest : public FTPTest {
protected:
    /// What is written about a change from oldConf to newConf.
    Lines changes(int wasEnabled, int nowEnabled) {
        fake::Request request;
        fake::Response response;
        const Conf oldBefore = oldConf;
        const Conf newBefore = newConf;
        platform.journal.clear();
        FTPServiceHandler(&request, &response).LogChanges(wasEnabled, nowEnabled, &oldConf, &newConf);
        EXPECT_EQ(std::memcmp(&oldConf, &oldBefore, sizeof(Conf)), 0) << "the records are only read";
        EXPECT_EQ(std::memcmp(&newConf, &newBefore, sizeof(Conf)), 0) << "the records are only read";
        return platform.journal;
    }

    /// What is written when one number of the record changes while FTP is on.
    Lines numberChanges(int32_t Conf::*field, int from, int to) {
        oldConf.*field = from;
        newConf.*field = to;
        return changes(1, 1);
    }

    Lines portChanges(const char* from, const char* to) {
        setPort(oldConf, from);
        setPort(newConf, to);
        return changes(1, 1);
    }

    Lines rangeChanges(int fromFirst, int fromLast, int toFirst, int toLast) {
        oldConf.passive_port_min = fromFirst;
        oldConf.passive_port_max = fromLast;
        newConf.passive_port_min = toFirst;
        newConf.passive_port_max = toLast;
        return changes(1, 1);
    }

    /// Every field of the record differs, also those that have no entry.
    void changeEverything() {
        std::memset(&oldConf, 0, sizeof(oldConf));
        std::memset(&newConf, 1, sizeof(newConf));
        setPort(oldConf, "21");
        setPort(newConf, "2121");
        oldConf.service_flags = 1;
        newConf.service_flags = 3;
        newConf.passive_port_min = 50000;
        newConf.passive_port_max = 50100;
        newConf.maxdownloadrate = 200;
        newConf.maxuploadrate = 100;
        newConf.max_conn_per_ip = 5;
    }

    Conf oldConf = fake::State::defaultConf();
    Conf newConf = fake::State::defaultConf();
};

Lines rangeEntry(const std::string& from, const std::string& to) {
    return {"VELTFTPDefaultPassivePortGet()", entry("0x11B0000A", from, to)};
}

Lines everyEntry() {
    return Lines{entry("0x11B00012", "21", "2121")} + rangeEntry("55536 - 55899", "50000 - 50100") +
           Lines{entry("0x11B00020", "ON"),
                 entry("0x11B00019", "Enabled"),
                 entry("0x11B00009", "0 KB/s", "200 KB/s"),
                 entry("0x11B00008", "0 KB/s", "100 KB/s"),
                 entry("0x11B00022", "5"),
                 entry("0x11B00021", "On")};
}

} // namespace

TEST_F(FTPChangeLogTest, WritesTheEntriesInTheirOrderAndNoneForOtherFields) {
    changeEverything();
    EXPECT_EQ(changes(1, 1), everyEntry());
}

TEST_F(FTPChangeLogTest, FramesTheEntriesWhenFtpIsSwitchedOn) {
    changeEverything();
    EXPECT_EQ(changes(0, 1), Lines{entry("0x11B00002")} + everyEntry() + entry("0x11B00013"));
}

TEST_F(FTPChangeLogTest, WritesOneEntryAloneWhenFtpIsSwitchedOff) {
    changeEverything();
    EXPECT_EQ(changes(1, 0), Lines{entry("0x11B00006")});
}

TEST_F(FTPChangeLogTest, WritesNothingWhileFtpIsOff) {
    changeEverything();
    EXPECT_EQ(changes(0, 0), Lines{});
}

TEST_F(FTPChangeLogTest, WritesNothingWithoutAChange) {
    EXPECT_EQ(changes(1, 1), Lines{});
    EXPECT_EQ(changes(0, 0), Lines{});
}

TEST_F(FTPChangeLogTest, WritesTheSwitchingAloneWithoutAnotherChange) {
    EXPECT_EQ(changes(0, 1), (Lines{entry("0x11B00002"), entry("0x11B00013")}));
    EXPECT_EQ(changes(1, 0), Lines{entry("0x11B00006")});
}

TEST_F(FTPChangeLogTest, ComparesTheControlPortAsText) {
    EXPECT_EQ(portChanges("21", "2121"), Lines{entry("0x11B00012", "21", "2121")});
    EXPECT_EQ(portChanges("21", "021"), Lines{entry("0x11B00012", "21", "021")});
    EXPECT_EQ(portChanges("ftp", "FTP"), Lines{entry("0x11B00012", "ftp", "FTP")});
    EXPECT_EQ(portChanges("", "1234567"), Lines{entry("0x11B00012", "", "1234567")});
    EXPECT_EQ(portChanges("2121", "2121"), Lines{});
}

TEST_F(FTPChangeLogTest, DoesNotLookAtTheBytesAfterTheControlPort) {
    oldConf.portnum[5] = 'x';
    EXPECT_EQ(changes(1, 1), Lines{});
}

TEST_F(FTPChangeLogTest, PutsTheDefaultInPlaceOfEachPassivePortThatIsZero) {
    EXPECT_EQ(rangeChanges(0, 0, 50000, 50100), rangeEntry("55536 - 55899", "50000 - 50100"));
    EXPECT_EQ(rangeChanges(50000, 50100, 0, 0), rangeEntry("50000 - 50100", "55536 - 55899"));
    EXPECT_EQ(rangeChanges(50000, 0, 0, 50100), rangeEntry("50000 - 55899", "55536 - 50100"));
    EXPECT_EQ(rangeChanges(0, 50100, 50000, 0), rangeEntry("55536 - 50100", "50000 - 55899"));
    EXPECT_EQ(rangeChanges(50000, 50100, 50001, 50100), rangeEntry("50000 - 50100", "50001 - 50100"));
    EXPECT_EQ(rangeChanges(50000, 50100, 50000, 50101), rangeEntry("50000 - 50100", "50000 - 50101"));
    EXPECT_EQ(rangeChanges(-1, INT_MIN, INT_MAX, INT_MIN),
              rangeEntry("-1 - -2147483648", "2147483647 - -2147483648"));
    EXPECT_EQ(rangeChanges(0, 0, 0, 0), Lines{});
    EXPECT_EQ(rangeChanges(50000, 50100, 50000, 50100), Lines{});
}

TEST_F(FTPChangeLogTest, TheDefaultRangeIsNotCheckedForAnError) {
    platform.fail("VELTFTPDefaultPassivePortGet");
    EXPECT_EQ(rangeChanges(50000, 50100, 50001, 50101), rangeEntry("50000 - 50100", "50001 - 50101"));
}

TEST_F(FTPChangeLogTest, TellsTheNewStateOfTheExternalAddress) {
    EXPECT_EQ(numberChanges(&Conf::use_ext_ip, 0, 1), Lines{entry("0x11B00020", "ON")});
    EXPECT_EQ(numberChanges(&Conf::use_ext_ip, 1, 0), Lines{entry("0x11B00020", "OFF")});
    EXPECT_EQ(numberChanges(&Conf::use_ext_ip, 1, 2), Lines{entry("0x11B00020", "ON")});
    EXPECT_EQ(numberChanges(&Conf::use_ext_ip, 2, 2), Lines{});
}

TEST_F(FTPChangeLogTest, LooksAtPlainFtpAloneOfTheServices) {
    const struct {
        int from, to;
        const char* text;
    } rows[] = {{1, 3, "Enabled"},  {1, 2, "Enabled"},  {1, 0, "Enabled"},  {1, 5, "Enabled"},
                {3, 1, "Disabled"}, {2, 1, "Disabled"}, {0, 1, "Disabled"}, {5, 1, "Disabled"},
                {2, 3, nullptr},    {3, 2, nullptr},    {0, 3, nullptr},    {3, 0, nullptr},
                {5, 7, nullptr},    {1, 1, nullptr},    {0, 0, nullptr},    {-1, 3, nullptr}};
    for (const auto& row : rows) {
        SCOPED_TRACE(std::to_string(row.from) + " to " + std::to_string(row.to));
        EXPECT_EQ(numberChanges(&Conf::service_flags, row.from, row.to),
                  row.text == nullptr ? Lines{} : Lines{entry("0x11B00019", row.text)});
    }
}

TEST_F(FTPChangeLogTest, TellsTheRatesBeforeAndAfter) {
    const struct {
        int32_t Conf::*field;
        const char* event;
    } rows[] = {{&Conf::maxdownloadrate, "0x11B00009"}, {&Conf::maxuploadrate, "0x11B00008"}};
    for (const auto& [field, event] : rows) {
        EXPECT_EQ(numberChanges(field, 0, 100), Lines{entry(event, "0 KB/s", "100 KB/s")});
        EXPECT_EQ(numberChanges(field, 100, 0), Lines{entry(event, "100 KB/s", "0 KB/s")});
        EXPECT_EQ(numberChanges(field, INT_MIN, INT_MAX),
                  Lines{entry(event, "-2147483648 KB/s", "2147483647 KB/s")});
        EXPECT_EQ(numberChanges(field, 100, 100), Lines{});
    }
}

TEST_F(FTPChangeLogTest, TellsTheNewConnectionLimit) {
    EXPECT_EQ(numberChanges(&Conf::max_conn_per_ip, 10, 0), Lines{entry("0x11B00022", "Off")});
    EXPECT_EQ(numberChanges(&Conf::max_conn_per_ip, 0, 8), Lines{entry("0x11B00022", "8")});
    EXPECT_EQ(numberChanges(&Conf::max_conn_per_ip, 8, -1), Lines{entry("0x11B00022", "-1")});
    EXPECT_EQ(numberChanges(&Conf::max_conn_per_ip, 0, INT_MIN), Lines{entry("0x11B00022", "-2147483648")});
    EXPECT_EQ(numberChanges(&Conf::max_conn_per_ip, 8, 8), Lines{});
}

TEST_F(FTPChangeLogTest, TellsTheNewStateOfUtf8Support) {
    EXPECT_EQ(numberChanges(&Conf::support_utf8, 0, 1), Lines{entry("0x11B00021", "On")});
    EXPECT_EQ(numberChanges(&Conf::support_utf8, 1, 0), Lines{entry("0x11B00021", "Off")});
    EXPECT_EQ(numberChanges(&Conf::support_utf8, 1, -1), Lines{entry("0x11B00021", "On")});
    EXPECT_EQ(numberChanges(&Conf::support_utf8, 1, 1), Lines{});
}

TEST_F(FTPChangeLogTest, AFailureToWriteAnEntryIsNoError) {
    changeEverything();
    platform.fail("VELTLogSet1", fake::Platform::everyCall);
    EXPECT_EQ(changes(0, 1), Lines{entry("0x11B00002")} + everyEntry() + entry("0x11B00013"));
}

TEST_F(FTPChangeLogTest, ARequestThatSwitchesFtpOnTellsItsNewPort) {
    run(FTPSet, request(R"("portnum":2121)", true, false));
    EXPECT_EQ(platform.callsTo("VELTLogSet1"), (Lines{entry("0x11B00002"), entry("0x11B00012", "21", "2121"),
                                                      entry("0x11B00019", "Disabled"), entry("0x11B00013")}));
}

TEST_F(FTPChangeLogTest, ARequestThatSwitchesFtpOffTellsThatAlone) {
    platform.services["ftpd-ssl"] = 1;
    platform.conf.service_flags = 2;
    run(FTPSet, request(R"("portnum":2121,"enable_fxp":true)"));
    EXPECT_EQ(platform.callsTo("VELTLogSet1"), Lines{entry("0x11B00006")});
}

TEST_F(FTPChangeLogTest, ANegativeAnswerOfTheControllerCountsAsEnabled) {
    for (const char* const service : {"ftpd", "ftpd-ssl"}) {
        SCOPED_TRACE(service);
        startAfresh();
        platform.services[service] = -1;
        run(FTPSet, request(R"("enable_fxp":true)"));
        EXPECT_EQ(platform.callsTo("VELTLogSet1"), Lines{entry("0x11B00006")});
    }
}

TEST_F(FTPChangeLogTest, ATextThatWasCutTheSameIsNoNewPort) {
    platform.services["ftpd"] = 1;
    platform.conf.service_flags = 1;
    setPort(platform.conf, "1234567");
    run(FTPSet, request(R"("portnum":12345678)", true, false));
    EXPECT_EQ(platform.count("VELTFwRuleHup"), 1);
    EXPECT_EQ(platform.count("VELTLogSet1"), 0);
}

TEST_F(FTPChangeLogTest, SettingsOutsideTheRecordHaveNoEntry) {
    platform.services["ftpd"] = 1;
    platform.conf.service_flags = 1;
    platform.conf.support_utf8 = 1;
    run(FTPSetV3, request(R"("timeout":5,"ext_ip":"203.0.113.7","utf8_mode":2,"enable_fips":true,)"
                          R"("enable_ascii":true,"enable_flow_ctrl":true,"enable_fxp":true)",
                          true, false));
    EXPECT_TRUE(answer().success);
    EXPECT_EQ(platform.count("VELTFTPConfSet"), 1);
    EXPECT_EQ(platform.count("VELTLogSet1"), 0);
}
