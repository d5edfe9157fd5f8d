// Reading the FTP settings.

#include "ftp/ftp.h"
#include "module/entry_functions.h"
#include "tests/support/fake_platform/text.h"
#include "tests/unit/ftp_journal.h"

#include <climits>
#include <vector>

using namespace ftptest;

namespace {

class FTPGetTest : public FTPTest {};

/// What a version-1 request answers over the platform's default state.
Json::Value defaults() {
    return json(R"({"enable_ftp":false,"enable_ftps":false,"timeout":300,"portnum":21,
        "custom_port_range":false,"custom_port":"55536:55899","use_ext_ip":false,"ext_ip":"",
        "enable_utf8":false,"enable_fxp":false,"enable_ascii":false,"enable_fips":false,
        "enable_flow_ctrl":false,"maxuploadrate":0,"maxdownloadrate":0,"max_conn_per_ip":0})");
}

/// The same with the UTF-8 key of another version.
Json::Value defaultsWith(const char* utf8Key, const Json::Value& value) {
    Json::Value settings = defaults();
    settings.removeMember("enable_utf8");
    settings[utf8Key] = value;
    return settings;
}

Lines readsRecordAndServices() {
    return {"VELTFTPConfGet()", R"(VLIBServiceIsEnabled("ftpd"))", R"(VLIBServiceIsEnabled("ftpd-ssl"))",
            "VELTFTPTimeOutGet()"};
}

Lines readsAsciiAndFips() {
    return {"VELTFTPASCIIEnabledGet()", "VELTFTPFIPSEnabledGet()"};
}

const char* const readsDefaultRange = "VELTFTPDefaultPassivePortGet()";

std::string answers(const Json::Value& settings) {
    return succeeded(fake::render(settings));
}

/// A setting of the platform, and what it makes of one key of the answer.
struct Row {
    void (*set)(fake::Platform& platform);
    const char* key;
    Json::Value value;
};

} // namespace

TEST_F(FTPGetTest, ReadsEverySettingForVersion1) {
    EXPECT_EQ(run(FTPGet), readsRecordAndServices() + readsDefaultRange + readsAddress() +
                               readsAsciiAndFips() + answers(defaults()));
}

TEST_F(FTPGetTest, ReadsEverySettingForVersion2) {
    EXPECT_EQ(run(FTPGetV2), readsRecordAndServices() + readsDefaultRange + readsAddress() + useUtf8Get +
                                 readsAsciiAndFips() + answers(defaultsWith("use_utf8", false)));
}

TEST_F(FTPGetTest, ReadsEverySettingForVersion3) {
    platform.conf.support_utf8 = 1;
    EXPECT_EQ(run(FTPGetV3), readsRecordAndServices() + readsDefaultRange + readsAddress() + useUtf8Get +
                                 readsAsciiAndFips() + answers(defaultsWith("utf8_mode", 1)));
}

TEST_F(FTPGetTest, Version3DoesNotAskForTheSwitchWithoutUtf8Support) {
    platform.useUtf8 = 1;
    EXPECT_EQ(run(FTPGetV3), readsRecordAndServices() + readsDefaultRange + readsAddress() +
                                 readsAsciiAndFips() + answers(defaultsWith("utf8_mode", 0)));
}

TEST_F(FTPGetTest, DoesNotAskForTheDefaultRangeWhenThereIsACustomOne) {
    platform.conf.passive_port_min = 50000;
    platform.conf.passive_port_max = 50100;
    Json::Value settings = defaults();
    settings["custom_port_range"] = true;
    settings["custom_port"] = "50000:50100";
    EXPECT_EQ(run(FTPGet),
              readsRecordAndServices() + readsAddress() + readsAsciiAndFips() + answers(settings));
}

TEST_F(FTPGetTest, EachSettingHasItsKey) {
    using P = fake::Platform;
    const std::vector<Row> rows = {
        {[](P& p) { p.services["ftpd"] = 1; }, "enable_ftp", true},
        {[](P& p) { p.services["ftpd-ssl"] = 1; }, "enable_ftps", true},
        {[](P& p) { p.timeout = 900; }, "timeout", 900},
        {[](P& p) { setPort(p.conf, "2121"); }, "portnum", 2121},
        {[](P& p) {
             p.defaultRange = {1, 2};
         },
         "custom_port", "1:2"},
        {[](P& p) { p.conf.use_ext_ip = 1; }, "use_ext_ip", true},
        {[](P& p) { p.extIp = "203.0.113.7"; }, "ext_ip", "203.0.113.7"},
        {[](P& p) { p.conf.support_utf8 = 1; }, "enable_utf8", true},
        {[](P& p) { p.conf.enable_fxp = 1; }, "enable_fxp", true},
        {[](P& p) { p.ascii = 1; }, "enable_ascii", true},
        {[](P& p) { p.fips = 1; }, "enable_fips", true},
        {[](P& p) { p.conf.enable_flow_ctrl = 1; }, "enable_flow_ctrl", true},
        {[](P& p) { p.conf.maxuploadrate = 100; }, "maxuploadrate", 100},
        {[](P& p) { p.conf.maxdownloadrate = 200; }, "maxdownloadrate", 200},
        {[](P& p) { p.conf.max_conn_per_ip = 5; }, "max_conn_per_ip", 5},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.key);
        startAfresh();
        row.set(platform);
        run(FTPGet);
        Json::Value settings = defaults();
        settings[row.key] = row.value;
        EXPECT_EQ(answer().data, settings);
    }
}

TEST_F(FTPGetTest, ExtremeAndOddValuesArePassedOnOrReadAsOn) {
    using P = fake::Platform;
    const std::vector<Row> rows = {
        {[](P& p) { p.services["ftpd"] = -1; }, "enable_ftp", true},
        {[](P& p) { p.services["ftpd-ssl"] = -1; }, "enable_ftps", true},
        {[](P& p) { p.timeout = -1; }, "timeout", -1},
        {[](P& p) { p.timeout = INT_MAX; }, "timeout", INT_MAX},
        {[](P& p) { p.timeout = INT_MIN; }, "timeout", INT_MIN},
        {[](P& p) { setPort(p.conf, "0021"); }, "portnum", 21},
        {[](P& p) { setPort(p.conf, "0x15"); }, "portnum", 0},
        {[](P& p) { setPort(p.conf, "ftp"); }, "portnum", 0},
        {[](P& p) { setPort(p.conf, ""); }, "portnum", 0},
        {[](P& p) { setPort(p.conf, "22x"); }, "portnum", 22},
        {[](P& p) { setPort(p.conf, "9999999"); }, "portnum", 9999999},
        {[](P& p) { p.conf.use_ext_ip = -1; }, "use_ext_ip", true},
        {[](P& p) { p.extIp = ""; }, "ext_ip", ""},
        {[](P& p) { p.extIp = "123.123.123.123"; }, "ext_ip", "123.123.123.123"},
        {[](P& p) { p.extIp = "123.123.123.1234"; }, "ext_ip", "123.123.123.123"},
        {[](P& p) { p.conf.support_utf8 = -1; }, "enable_utf8", true},
        {[](P& p) { p.conf.enable_fxp = 256; }, "enable_fxp", true},
        {[](P& p) { p.ascii = -1; }, "enable_ascii", true},
        {[](P& p) { p.fips = 2; }, "enable_fips", true},
        {[](P& p) { p.conf.enable_flow_ctrl = 2; }, "enable_flow_ctrl", true},
        {[](P& p) { p.conf.maxuploadrate = INT_MIN; }, "maxuploadrate", INT_MIN},
        {[](P& p) { p.conf.maxdownloadrate = INT_MAX; }, "maxdownloadrate", INT_MAX},
        {[](P& p) { p.conf.max_conn_per_ip = -1; }, "max_conn_per_ip", 0},
        {[](P& p) { p.conf.max_conn_per_ip = INT_MIN; }, "max_conn_per_ip", 0},
        {[](P& p) { p.conf.max_conn_per_ip = INT_MAX; }, "max_conn_per_ip", INT_MAX},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(std::string(row.key) + " " + row.value.toStyledString());
        startAfresh();
        row.set(platform);
        run(FTPGet);
        Json::Value settings = defaults();
        settings[row.key] = row.value;
        EXPECT_EQ(answer().data, settings);
    }
}

TEST_F(FTPGetTest, TheServicesAreReadFromTheControllerAndNotFromTheRecord) {
    platform.conf.service_flags = 3;
    run(FTPGet);
    EXPECT_EQ(answer().data, defaults());
}

TEST_F(FTPGetTest, ACustomRangeNeedsBothOfItsPorts) {
    const struct {
        int first, last;
        bool custom;
        const char* text;
    } rows[] = {{0, 50100, false, "55536:55899"},
                {50000, 0, false, "55536:55899"},
                {50000, 50100, true, "50000:50100"},
                {50100, 50000, true, "50100:50000"},
                {-1, -1, true, "-1:-1"},
                {1000000, 1000000, true, "1000000:1000000"},
                {10000000, 1000000, true, "10000000:100000"},
                {INT_MIN, INT_MIN, true, "-2147483648:-21"}};
    for (const auto& row : rows) {
        SCOPED_TRACE(std::to_string(row.first) + " " + std::to_string(row.last));
        platform.conf.passive_port_min = row.first;
        platform.conf.passive_port_max = row.last;
        run(FTPGet);
        EXPECT_EQ(answer().data["custom_port_range"], row.custom);
        EXPECT_EQ(answer().data["custom_port"], row.text);
    }
}

TEST_F(FTPGetTest, TheDefaultRangeIsCutLikeACustomOne) {
    platform.defaultRange = {INT_MAX, INT_MAX};
    run(FTPGet);
    EXPECT_EQ(answer().data["custom_port"], "2147483647:2147");
}

TEST_F(FTPGetTest, AFailureToGetTheDefaultRangeIsNoError) {
    platform.fail("VELTFTPDefaultPassivePortGet");
    run(FTPGet);
    EXPECT_TRUE(answer().success);
    EXPECT_EQ(answer().data["custom_port_range"], false);
    EXPECT_TRUE(answer().data["custom_port"].isString());
}

TEST_F(FTPGetTest, EachVersionAnswersWithItsOwnUtf8KeyAlone) {
    const struct {
        VELT::APIEntryFunction entry;
        const char* key;
        Json::Value values[4]; ///< support off and on, switch off; the same, switch on
    } rows[] = {{FTPGet, "enable_utf8", {false, true, false, true}},
                {FTPGetV2, "use_utf8", {false, false, true, true}},
                {FTPGetV3, "utf8_mode", {0, 1, 0, 2}},
                {getVersion0, "enable_utf8", {false, true, false, true}},
                {getVersion4, "utf8_mode", {0, 1, 0, 2}}};
    for (const auto& row : rows) {
        for (int state = 0; state < 4; ++state) {
            SCOPED_TRACE(std::string(row.key) + " " + std::to_string(state));
            platform.conf.support_utf8 = state % 2;
            platform.useUtf8 = state / 2;
            run(row.entry);
            EXPECT_EQ(answer().data, defaultsWith(row.key, row.values[state]));
        }
    }
}

TEST_F(FTPGetTest, ANegativeVersionIsVersion1) {
    const VELT::APIEntryFunction entry = [](VELT::APIRequest* request, VELT::APIResponse* response) {
        FTPServiceHandler(request, response, INT_MIN).Get();
    };
    run(entry);
    EXPECT_EQ(answer().data, defaults());
}

TEST_F(FTPGetTest, AFailureOfTheSwitchReadsAsOn) {
    platform.conf.support_utf8 = -1;
    platform.useUtf8 = -1;
    run(FTPGetV2);
    EXPECT_EQ(answer().data["use_utf8"], true);
    run(FTPGetV3);
    EXPECT_EQ(answer().data["utf8_mode"], 2);
}

TEST_F(FTPGetTest, APositiveAnswerIsNoFailure) {
    for (const char* const operation : {"VELTFTPConfGet", "VLIBCFileGetKeyValue", "VELTFTPFIPSEnabledGet"}) {
        SCOPED_TRACE(operation);
        startAfresh();
        platform.fail(operation, 1, 2);
        run(FTPGet);
        EXPECT_TRUE(answer().success);
        EXPECT_EQ(platform.callsTo("syslog"), Lines{});
    }
}

TEST_F(FTPGetTest, FailsWithoutTheRecord) {
    platform.fail("VELTFTPConfGet");
    EXPECT_EQ(run(FTPGet, R"({"a":"b"})"), Lines{"VELTFTPConfGet()"} + log("Failed to get FTP config.") +
                                               failed("ftp", 1902, R"({"a":"b"})"));
}

TEST_F(FTPGetTest, FailsWithoutTheSystemInformationFile) {
    platform.fail("VLIBCFileGetKeyValue");
    EXPECT_EQ(run(FTPGetV2), readsRecordAndServices() + readsDefaultRange + readsAddress() +
                                 log("Failed to VLIBCFileGetKeyValue.") +
                                 log("Failed to get FTP external IP setting.") + failed("ftp", 1902, "{}"));
}

TEST_F(FTPGetTest, FailsWithoutTheFipsSetting) {
    platform.fips = -1;
    EXPECT_EQ(run(FTPGet), readsRecordAndServices() + readsDefaultRange + readsAddress() +
                               readsAsciiAndFips() + log("Failed to get FTP FIPS Enabled setting") +
                               failed("ftp", 1902, "{}"));
}

TEST_F(FTPGetTest, AFailureLeavesTheResultAsFarAsItWasFilled) {
    const struct {
        const char* failing;
        Lines keys; ///< in the order of their names
    } rows[] = {{"VELTFTPConfGet", {}},
                {"VLIBCFileGetKeyValue",
                 {"custom_port", "custom_port_range", "enable_ftp", "enable_ftps", "portnum", "timeout",
                  "use_ext_ip"}},
                {"VELTFTPFIPSEnabledGet",
                 {"custom_port", "custom_port_range", "enable_ascii", "enable_ftp", "enable_ftps",
                  "enable_fxp", "enable_utf8", "ext_ip", "portnum", "timeout", "use_ext_ip"}}};
    for (const auto& row : rows) {
        SCOPED_TRACE(row.failing);
        startAfresh();
        platform.fail(row.failing);
        fake::Request request;
        fake::Response response;
        Json::Value result;
        EXPECT_FALSE(FTPServiceHandler(&request, &response).GetData(result));
        EXPECT_EQ(result.isNull() ? Lines{} : result.getMemberNames(), row.keys);
        EXPECT_TRUE(response.answers.empty());
    }
}

TEST_F(FTPGetTest, TheAddressBufferIsEmptiedWithoutTheKeyAndNeverOverrun) {
    fake::Request request;
    fake::Response response;
    FTPServiceHandler handler(&request, &response);
    char buffer[16] = "from before";
    EXPECT_TRUE(handler.GetExtIP(buffer, 4));
    EXPECT_STREQ(buffer, "");
    platform.extIp = "203.0.113.7";
    EXPECT_TRUE(handler.GetExtIP(buffer, 4));
    EXPECT_STREQ(buffer, "203");
    EXPECT_EQ(platform.journal.back(), R"(VLIBCFileGetKeyValue("/etc/veltinfo.conf", "ftp_ext_ip", 4, 0))");
}

TEST_F(FTPGetTest, ExceptionsPassThrough) {
    for (const char* const operation :
         {"VELTFTPConfGet", "VLIBServiceIsEnabled", "VELTFTPTimeOutGet", "VELTFTPDefaultPassivePortGet",
          "VLIBCFileGetKeyValue", "VELTFTPASCIIEnabledGet", "VELTFTPFIPSEnabledGet",
          "APIResponse::SetSuccess"}) {
        SCOPED_TRACE(operation);
        startAfresh();
        platform.throwFrom(operation);
        const Lines journal = runThrowing<fake::Thrown>(FTPGet);
        EXPECT_EQ(fake::Platform::operationOf(journal.back()), operation);
        EXPECT_EQ(platform.callsTo("syslog"), Lines{});
    }
}
