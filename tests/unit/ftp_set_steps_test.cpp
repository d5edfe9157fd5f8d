// The settings one by one: when a value counts as different, and what is stored.

#include "ftp/ftp.h"
#include "module/entry_functions.h"
#include "tests/unit/ftp_journal.h"

#include <climits>
#include <optional>

using namespace ftptest;

namespace {

using Conf = _tag_VELT_FTP_CONF_;

class FTPSetStepTest : public FTPTest {
protected:
    /// A request that differs: `steps` are its calls before the store.
    void expectApplied(const std::string& more, const Lines& steps, const std::string& differences) {
        EXPECT_EQ(run(FTPSet, request(more)), Lines{getParams()} + applied(steps, differences)) << more;
    }

    void expectNoChange(const std::string& more, const Lines& steps) {
        EXPECT_EQ(run(FTPSet, request(more)), Lines{getParams()} + reads() + steps + succeeded()) << more;
    }

    /// A boolean with an operation of its own: the name of its operations, and its state.
    void expectSetBesideTheRecord(const std::string& key, const std::string& name, int fake::State::*state) {
        const std::string get = name + "Get()";
        const struct {
            int current;
            bool requested, differs;
        } rows[] = {{0, true, true},  {0, false, false}, {1, true, false},  {1, false, true},
                    {7, true, false}, {7, false, true},  {-1, true, false}, {-1, false, true}};
        for (const auto& row : rows) {
            SCOPED_TRACE(key + " is " + std::to_string(row.current));
            startAfresh();
            platform.*state = row.current;
            const std::string more = "\"" + key + "\":" + (row.requested ? "true" : "false");
            const Lines asks = Lines{useUtf8Get} + get;
            if (row.differs) {
                expectApplied(more, asks + (name + "Set(" + (row.requested ? "1" : "0") + ")"), "");
            } else {
                expectNoChange(more, asks);
            }
        }
    }
};

std::string text(const std::string& value) {
    return "\"" + value + "\"";
}

} // namespace

TEST_F(FTPSetStepTest, TheServiceFlagsAreFlippedOneByOne) {
    const struct {
        int stored;
        bool plain, tls;
        const char* differences;
    } rows[] = {{0, true, false, "service_flags: 1"},    {0, false, true, "service_flags: 2"},
                {0, true, true, "service_flags: 3"},     {3, false, true, "service_flags: 2"},
                {3, true, false, "service_flags: 1"},    {1, false, true, "service_flags: 2"},
                {-1, false, false, "service_flags: -4"}, {INT_MIN, true, true, "service_flags: -2147483645"},
                {12, false, true, "service_flags: 14"}};
    for (const auto& row : rows) {
        SCOPED_TRACE(std::to_string(row.stored) + " to " + row.differences);
        platform.conf.service_flags = row.stored;
        run(FTPSet, request("", row.plain, row.tls));
        EXPECT_EQ(platform.callsTo("VELTFTPConfSet"), Lines{stores(row.differences)});
        EXPECT_EQ(platform.callsTo("VELTFwRuleHup"), Lines{});
    }
}

TEST_F(FTPSetStepTest, TheBooleansOfTheRecordAreStoredAs0Or1) {
    const struct {
        const char* key;
        int32_t Conf::*field;
    } fields[] = {{"use_ext_ip", &Conf::use_ext_ip},
                  {"enable_fxp", &Conf::enable_fxp},
                  {"enable_flow_ctrl", &Conf::enable_flow_ctrl}};
    const struct {
        int stored;
        const char* requested;
        const char* stores;
    } rows[] = {{0, "true", "1"},       {0, "false", nullptr}, {1, "true", nullptr},  {1, "false", "0"},
                {256, "true", nullptr}, {256, "false", "0"},   {-1, "true", nullptr}, {-1, "false", "0"}};
    for (const auto& [key, field] : fields) {
        for (const auto& row : rows) {
            SCOPED_TRACE(std::string(key) + " is " + std::to_string(row.stored));
            startAfresh();
            platform.conf.*field = row.stored;
            const std::string more = "\"" + std::string(key) + "\":" + row.requested;
            if (row.stores != nullptr) {
                expectApplied(more, {useUtf8Get}, std::string(key) + ": " + row.stores);
            } else {
                expectNoChange(more, {useUtf8Get});
            }
        }
    }
}

TEST_F(FTPSetStepTest, TheNumbersOfTheRecordAreStoredAsTheyCome) {
    const struct {
        const char* key;
        int32_t Conf::*field;
    } fields[] = {{"maxuploadrate", &Conf::maxuploadrate},
                  {"maxdownloadrate", &Conf::maxdownloadrate},
                  {"max_conn_per_ip", &Conf::max_conn_per_ip}};
    const struct {
        int stored;
        const char* requested;
        const char* stores;
    } rows[] = {{0, "0", nullptr},
                {0, "5", "5"},
                {5, "0", "0"},
                {5, "5", nullptr},
                {5, "5.0", nullptr},
                {5, "6.0", "6"},
                {-1, "0", "0"},
                {0, "-1", "-1"},
                {0, "2147483647", "2147483647"},
                {INT_MAX, "2147483647", nullptr},
                {INT_MAX, "-2147483648", "-2147483648"},
                {INT_MIN, "-2147483648", nullptr}};
    for (const auto& [key, field] : fields) {
        for (const auto& row : rows) {
            SCOPED_TRACE(std::string(key) + " is " + std::to_string(row.stored));
            startAfresh();
            platform.conf.*field = row.stored;
            const std::string more = "\"" + std::string(key) + "\":" + row.requested;
            if (row.stores != nullptr) {
                expectApplied(more, {useUtf8Get}, std::string(key) + ": " + row.stores);
            } else {
                expectNoChange(more, {useUtf8Get});
            }
        }
    }
}

TEST_F(FTPSetStepTest, TheTimeoutIsSetAtOnceWhenItDiffers) {
    const struct {
        const char* requested;
        int current;
        bool differs;
    } rows[] = {{"300", 300, false},       {"301", 300, true}, {"0", 300, true},
                {"-1", -1, false},         {"0", -1, true},    {"0", 0, false},
                {"300.0", 300, false},     {"-5", 300, true},  {"2147483647", 300, true},
                {"-2147483648", 300, true}};
    for (const auto& row : rows) {
        SCOPED_TRACE(std::to_string(row.current));
        startAfresh();
        platform.timeout = row.current;
        const std::string requested = row.requested;
        const Lines asks = {"VELTFTPTimeOutGet()"};
        if (row.differs) {
            expectApplied(R"("timeout":)" + requested,
                          asks + ("VELTFTPTimeOutSet(" + requested + ")") + useUtf8Get, "");
        } else {
            expectNoChange(R"("timeout":)" + requested, asks + useUtf8Get);
        }
    }
}

TEST_F(FTPSetStepTest, TheControlPortIsStoredAsTextOfAtMostSevenBytes) {
    const struct {
        const char* stored = nullptr;
        const char* requested = nullptr;
        std::optional<std::string> differences;
    } rows[] = {{"21", "21", std::nullopt},
                {"0021", "21", std::nullopt},
                {"ftp", "0", std::nullopt},
                {"", "0", std::nullopt},
                {"22x", "22", std::nullopt},
                {"21", "2121", R"(portnum: "2121")"},
                {"2121", "21", R"(portnum: "21")"},
                {"ftp", "21", R"(portnum: "21")"},
                {"21", "0", R"(portnum: "0")"},
                {"21", "-1", R"(portnum: "-1")"},
                {"21", "9999999", R"(portnum: "9999999")"},
                {"21", "10000000", R"(portnum: "1000000")"},
                {"21", "12345678", R"(portnum: "1234567")"},
                {"21", "2147483647", R"(portnum: "2147483")"},
                {"21", "-2147483648", R"(portnum: "-214748")"},
                {"1234567", "12345678", ""},
                {"21", "21.0", ""}};
    for (const auto& row : rows) {
        SCOPED_TRACE(std::string(row.stored) + " to " + row.requested);
        startAfresh();
        setPort(platform.conf, row.stored);
        Lines journal = run(FTPSet, request(R"("portnum":)" + std::string(row.requested)));
        ASSERT_GE(journal.size(), 2U);
        EXPECT_EQ(fake::Platform::operationOf(journal[1]), "WebUtils::IsPortConflict");
        journal.erase(journal.begin() + 1);
        EXPECT_EQ(journal,
                  Lines{getParams()} + (row.differences ? applied({useUtf8Get}, *row.differences, true)
                                                        : reads() + useUtf8Get + succeeded()));
    }
}

TEST_F(FTPSetStepTest, AControlPortThatIsUnsignedDiffersFromAnEqualOne) {
    Json::Value params = json(request());
    params["portnum"] = Json::Value(21U);
    EXPECT_EQ(runWith(FTPSet, params), Lines{getParams()} + R"(WebUtils::IsPortConflict("ftp", 21, 21))" +
                                           applied({useUtf8Get}, "", true));
}

TEST_F(FTPSetStepTest, ThePassiveRangeIsStoredWhenAnEndDiffers) {
    const struct {
        int first = 0;
        int last = 0;
        const char* range = nullptr; ///< null: the custom range is switched off
        std::optional<std::string> differences;
    } rows[] = {{0, 0, nullptr, std::nullopt},
                {50000, 0, nullptr, std::nullopt},
                {0, 50100, nullptr, std::nullopt},
                {50000, 50100, nullptr, "passive_port_min: 0, passive_port_max: 0"},
                {-1, -1, nullptr, "passive_port_min: 0, passive_port_max: 0"},
                {50000, 50100, "50000:50100", std::nullopt},
                {50000, 50100, "50000:50200", "passive_port_max: 50200"},
                {50000, 50100, "50001:50100", "passive_port_min: 50001"},
                {50000, 50100, "50100:50000", "passive_port_min: 50100, passive_port_max: 50000"},
                {0, 0, "no ports", std::nullopt},
                {0, 0, "50000:", "passive_port_min: 50000"},
                {50000, 0, "50000", std::nullopt},
                {0, 50100, "no ports", "passive_port_max: 0"},
                {50000, 50100, "no ports", "passive_port_min: 0, passive_port_max: 0"},
                {50000, 50100, " ", "passive_port_min: 0, passive_port_max: 0"},
                {50000, 50100, R"(\u00001:2)", "passive_port_min: 0, passive_port_max: 0"},
                {50000, 50100, "50000-50100", "passive_port_max: 0"},
                {0, 0, "-5:2147483647", "passive_port_min: -5, passive_port_max: 2147483647"}};
    for (const auto& row : rows) {
        const std::string more = row.range == nullptr
                                     ? R"("custom_port":"1:2","custom_port_range":false)"
                                     : R"("custom_port":)" + text(row.range) + R"(,"custom_port_range":true)";
        SCOPED_TRACE(std::to_string(row.first) + " " + std::to_string(row.last) + " to " + more);
        startAfresh();
        platform.conf.passive_port_min = row.first;
        platform.conf.passive_port_max = row.last;
        Lines journal = run(FTPSet, request(more));
        journal.erase(journal.begin() + 1, journal.begin() + (row.range == nullptr ? 1 : 2));
        EXPECT_EQ(journal,
                  Lines{getParams()} + (row.differences ? applied({useUtf8Get}, *row.differences, true)
                                                        : reads() + useUtf8Get + succeeded()));
    }
}

TEST_F(FTPSetStepTest, PassivePortsWithoutTheSwitchAreNotStored) {
    platform.conf.passive_port_min = 50000;
    platform.conf.passive_port_max = 50100;
    expectNoChange(R"("custom_port":"1:2")", {useUtf8Get});
}

TEST_F(FTPSetStepTest, StagingTheRangeTellsHowMuchCouldBeRead) {
    const struct {
        const char* params;
        int result;
        bool reloads;
    } rows[] = {{R"({"custom_port_range":true,"custom_port":"1:2"})", 2, true},
                {R"({"custom_port_range":true,"custom_port":"50000:50100"})", 2, false},
                {R"({"custom_port_range":true,"custom_port":"1"})", 1, true},
                {R"({"custom_port_range":true,"custom_port":"x"})", 0, true},
                {R"({"custom_port_range":false})", 0, true}};
    fake::Request request;
    fake::Response response;
    FTPServiceHandler handler(&request, &response);
    Conf stored{};
    stored.passive_port_min = 50000;
    stored.passive_port_max = 50100;
    for (const auto& row : rows) {
        SCOPED_TRACE(row.params);
        Conf fresh = stored;
        bool reload = false;
        EXPECT_EQ(handler.SetCustomPortConf(json(row.params), stored, fresh, reload), row.result);
        EXPECT_EQ(reload, row.reloads);
        reload = true;
        handler.SetCustomPortConf(json(row.params), stored, fresh, reload);
        EXPECT_TRUE(reload) << "what the control port asked for stays";
    }
}

TEST_F(FTPSetStepTest, AnAddressAlwaysRestartsAndIsWrittenWhenItDiffers) {
    const struct {
        std::optional<std::string> stored;
        const char* requested = nullptr;
        const char* written = nullptr;
    } rows[] = {{"203.0.113.7", "203.0.113.7", nullptr},
                {"203.0.113.7", "203.0.113.8", "203.0.113.8"},
                {"203.0.113.7", "203.0.113.70", "203.0.113.70"},
                {"203.0.113.70", "203.0.113.7", "203.0.113.7"},
                {std::nullopt, "203.0.113.7", "203.0.113.7"},
                {"", "203.0.113.7", "203.0.113.7"},
                {std::nullopt, "no such key", "no such key"},
                {std::nullopt, " ", " "},
                {"203.0.113.7", R"(\u0000203.0.113.8)", ""},
                {"203.0.113.7", "%s%n", "%s%n"},
                {"1.1.1.1", "255.255.255.255", "255.255.255.255"},
                {"1.1.1.1", "255.255.255.2551", "255.255.255.255"},
                {"255.255.255.255", "255.255.255.2551", "255.255.255.255"},
                {"255.255.255.2551", "255.255.255.255", nullptr},
                {"A.EXAMPLE", "a.example", "a.example"}};
    for (const auto& row : rows) {
        SCOPED_TRACE(row.requested);
        startAfresh();
        platform.extIp = row.stored;
        Lines steps = {readsAddress()};
        if (row.written != nullptr) {
            steps.push_back(R"(VLIBCINFOSetKeyValue("ftp_ext_ip", )" + text(row.written) + ")");
        }
        expectApplied(R"("ext_ip":)" + text(row.requested), steps + useUtf8Get, "");
    }
}

TEST_F(FTPSetStepTest, FipsModeIsSetAtOnceWhenItDiffers) {
    expectSetBesideTheRecord("enable_fips", "VELTFTPFIPSEnabled", &fake::State::fips);
}

TEST_F(FTPSetStepTest, AsciiModeIsSetAtOnceWhenItDiffers) {
    expectSetBesideTheRecord("enable_ascii", "VELTFTPASCIIEnabled", &fake::State::ascii);
}

TEST_F(FTPSetStepTest, ANullIsAnAbsentKey) {
    platform.conf.passive_port_min = 50000;
    platform.conf.passive_port_max = 50100;
    platform.conf.use_ext_ip = platform.conf.enable_fxp = platform.conf.max_conn_per_ip = 1;
    expectNoChange(R"("timeout":null,"portnum":null,"custom_port_range":null,"custom_port":null,)"
                   R"("use_ext_ip":null,"ext_ip":null,"enable_utf8":null,"enable_fxp":null,)"
                   R"("enable_fips":null,"enable_ascii":null,"enable_flow_ctrl":null,"maxuploadrate":null,)"
                   R"("maxdownloadrate":null,"max_conn_per_ip":null)",
                   {useUtf8Get});
}

TEST_F(FTPSetStepTest, AnUnknownKeyIsNotLookedAt) {
    expectNoChange(R"("anonymous":true,"port":22)", {useUtf8Get});
}
