// The check of the FTP settings, before anything is changed.

#include "ftp/ftp.h"
#include "module/entry_functions.h"
#include "tests/unit/ftp_journal.h"

#include <climits>
#include <vector>

using namespace ftptest;

namespace {

class FTPCheckTest : public FTPTest {
protected:
    /// What a "set" does whose check fails before it asks for port conflicts.
    static Lines refused(int code, const std::string& message, const std::string& params,
                         const Lines& portChecks = {}) {
        return Lines{getParams()} + portChecks + log(message) + failed("ftp", code, params);
    }

    void expectRefused(VELT::APIEntryFunction entry, const std::string& params, const std::string& message) {
        SCOPED_TRACE(params);
        EXPECT_EQ(run(entry, params), refused(1901, message, params));
    }

    /// The parameters pass, and the port checks are the only calls.
    void expectPasses(VELT::APIEntryFunction entry, const std::string& params, const Lines& portChecks = {}) {
        SCOPED_TRACE(params);
        fake::Request request(json(params));
        fake::Response response;
        platform.journal.clear();
        EXPECT_TRUE(FTPServiceHandler(&request, &response, versionOf(entry)).CheckData(request.params));
        EXPECT_EQ(platform.journal, portChecks);
        EXPECT_TRUE(response.answers.empty());
    }

private:
    static int versionOf(VELT::APIEntryFunction entry) {
        const VELT::APIEntryFunction inOrder[] = {setVersion0, FTPSet, FTPSetV2, FTPSetV3, setVersion4};
        int version = 0;
        while (inOrder[version] != entry) {
            ++version;
        }
        return version;
    }
};

const char* const nullInput = "Null input.";
const char* const invalidType = "Invalid type of input.";
const char* const wrongMode = "Wrong UTF-8 webapi parameter";
const char* const emptyText = "Empty string input is not allowed.";
const char* const portConflict = "Port conflict.";

std::string conflictCheck(const std::string& range) {
    return R"(WebUtils::IsPortConflict("ftp", )" + range + ")";
}

std::string pair(const std::string& key, const std::string& value) {
    return "\"" + key + "\":" + value;
}

Lines noBools() {
    return {"0", "1", "1.5", R"("true")", R"("")", "[]", "{}"};
}

Lines noInts() {
    return {"true", "false", "1.5", R"("21")", "[]", "{}", "2147483648", "-2147483649", "1e10"};
}

Lines noTexts() {
    return {"true", "0", "1.5", "[]", "{}", R"(["a"])"};
}

} // namespace

TEST_F(FTPCheckTest, PassesWithTheTwoServiceSwitchesAlone) {
    for (const VELT::APIEntryFunction entry : {FTPSet, FTPSetV2, FTPSetV3}) {
        expectPasses(entry, request("", false, false));
        expectPasses(entry, request("", true, true));
    }
}

TEST_F(FTPCheckTest, RefusesWithoutEitherServiceSwitch) {
    for (const char* const params :
         {"{}", R"({"enable_ftp":true})", R"({"enable_ftps":true})",
          R"({"enable_ftp":null,"enable_ftps":true})", R"({"enable_ftp":true,"enable_ftps":null})", "null"}) {
        expectRefused(FTPSet, params, nullInput);
    }
}

TEST_F(FTPCheckTest, RefusesServiceSwitchesThatAreNoBool) {
    for (const std::string& value : noBools()) {
        expectRefused(FTPSet, R"({"enable_ftp":)" + value + R"(,"enable_ftps":true})", invalidType);
        expectRefused(FTPSet, R"({"enable_ftp":true,"enable_ftps":)" + value + "}", invalidType);
    }
}

TEST_F(FTPCheckTest, RefusesOptionalKeysOfTheWrongType) {
    const struct {
        const char* key;
        Lines values;
    } rows[] = {
        {"timeout", noInts()},           {"portnum", noInts()},       {"custom_port_range", noBools()},
        {"custom_port", noTexts()},      {"use_ext_ip", noBools()},   {"ext_ip", noTexts()},
        {"enable_fxp", noBools()},       {"enable_fips", noBools()},  {"enable_ascii", noBools()},
        {"enable_flow_ctrl", noBools()}, {"maxuploadrate", noInts()}, {"maxdownloadrate", noInts()},
        {"max_conn_per_ip", noInts()}};
    for (const auto& row : rows) {
        for (const std::string& value : row.values) {
            const std::string params = request(pair(row.key, value));
            expectRefused(FTPSet, params, invalidType);
        }
    }
}

TEST_F(FTPCheckTest, TakesANullAsAnAbsentKey) {
    for (const char* const key :
         {"timeout", "portnum", "custom_port_range", "custom_port", "use_ext_ip", "ext_ip", "enable_fxp",
          "enable_fips", "enable_ascii", "enable_flow_ctrl", "maxuploadrate", "maxdownloadrate",
          "max_conn_per_ip", "enable_utf8", "use_utf8", "utf8_mode"}) {
        for (const VELT::APIEntryFunction entry : {FTPSet, FTPSetV2, FTPSetV3}) {
            expectPasses(entry, request(pair(key, "null")));
        }
    }
}

TEST_F(FTPCheckTest, HasNoBoundsForNumbers) {
    for (const char* const key : {"timeout", "maxuploadrate", "maxdownloadrate", "max_conn_per_ip"}) {
        for (const char* const value : {"-5", "0", "2147483647", "-2147483648"}) {
            expectPasses(FTPSet, request(pair(key, value)));
        }
    }
    for (const char* const port : {"-1", "0", "65535", "65536", "2147483647", "-2147483648"}) {
        expectPasses(FTPSet, request(pair("portnum", port)),
                     {conflictCheck(std::string(port) + ", " + port)});
    }
}

TEST_F(FTPCheckTest, RefusesAUtf8KeyOfTheWrongType) {
    for (const std::string& value : noBools()) {
        expectRefused(setVersion0, request(pair("enable_utf8", value)), invalidType);
        expectRefused(FTPSet, request(pair("enable_utf8", value)), invalidType);
        expectRefused(FTPSetV2, request(pair("use_utf8", value)), invalidType);
    }
    for (const char* const value : {"true", "1.5", R"("2")", "[]", "{}", "2147483648"}) {
        expectRefused(FTPSetV3, request(pair("utf8_mode", value)), invalidType);
        expectRefused(setVersion4, request(pair("utf8_mode", value)), invalidType);
    }
}

TEST_F(FTPCheckTest, TakesTheUtf8ModesZeroToTwoAlone) {
    for (const VELT::APIEntryFunction entry : {FTPSetV3, setVersion4}) {
        for (const char* const mode : {"0", "1", "2"}) {
            expectPasses(entry, request(pair("utf8_mode", mode)));
        }
        for (const char* const mode : {"3", "-1", "2147483647", "-2147483648"}) {
            expectRefused(entry, request(pair("utf8_mode", mode)), wrongMode);
        }
    }
}

TEST_F(FTPCheckTest, DoesNotLookAtTheUtf8KeysOfOtherVersions) {
    for (const char* const mode : {R"("utf8_mode":9)", R"("utf8_mode":"x")"}) {
        expectPasses(setVersion0, request(std::string(R"("use_utf8":5,)") + mode));
        expectPasses(FTPSet, request(std::string(R"("use_utf8":5,)") + mode));
        expectPasses(FTPSetV2, request(std::string(R"("enable_utf8":"x",)") + mode));
    }
    expectPasses(FTPSetV3, request(R"("enable_utf8":"x","use_utf8":5)"));
    expectPasses(setVersion4, request(R"("enable_utf8":"x","use_utf8":5)"));
}

TEST_F(FTPCheckTest, RefusesEmptyTexts) {
    for (const char* const more : {R"("custom_port":"")", R"("custom_port_range":false,"custom_port":"")",
                                   R"("custom_port_range":true,"custom_port":"")", R"("ext_ip":"")",
                                   R"("use_ext_ip":false,"ext_ip":"")"}) {
        expectRefused(FTPSet, request(more), emptyText);
    }
}

TEST_F(FTPCheckTest, ATextThatBeginsWithNulIsNotEmpty) {
    expectPasses(FTPSet, request(R"("custom_port":"\u0000","ext_ip":"\u0000")"));
    expectPasses(FTPSet, request(R"("custom_port":"\u00001:2","custom_port_range":true)"),
                 {conflictCheck("0, 0")});
}

TEST_F(FTPCheckTest, DoesNotCheckTheFormOfTheAddress) {
    expectPasses(FTPSet, request(R"("ext_ip":" ")"));
    expectPasses(FTPSet, request(R"("ext_ip":"not an address, and a long text at that")"));
}

TEST_F(FTPCheckTest, RefusesAControlPortOfAnotherService) {
    platform.takenPorts["ssh"] = {2222};
    const std::string params = request(R"("portnum":2222)");
    EXPECT_EQ(run(FTPSet, params), refused(1903, portConflict, params, {conflictCheck("2222, 2222")}));
    expectPasses(FTPSet, request(R"("portnum":2221)"), {conflictCheck("2221, 2221")});
}

TEST_F(FTPCheckTest, RefusesAPassiveRangeOfAnotherService) {
    platform.takenPorts["ssh"] = {50050};
    const std::string params = request(R"("custom_port":"50000:50100","custom_port_range":true)");
    EXPECT_EQ(run(FTPSet, params), refused(1904, portConflict, params, {conflictCheck("50000, 50100")}));
}

TEST_F(FTPCheckTest, TakesAnyAnswerButZeroAsAConflict) {
    const std::string params =
        request(R"("custom_port":"50000:50100","custom_port_range":true,"portnum":21)");
    platform.fail("WebUtils::IsPortConflict", 1, -1);
    EXPECT_EQ(run(FTPSet, params), refused(1903, portConflict, params, {conflictCheck("21, 21")}));
    platform.fail("WebUtils::IsPortConflict", 3, -1);
    EXPECT_EQ(run(FTPSet, params),
              refused(1904, portConflict, params, {conflictCheck("21, 21"), conflictCheck("50000, 50100")}));
}

TEST_F(FTPCheckTest, ItsOwnPortsAreNoConflict) {
    platform.takenPorts["ftp"] = {21, 50050};
    expectPasses(FTPSet, request(R"("portnum":21,"custom_port_range":true,"custom_port":"50000:50100")"),
                 {conflictCheck("21, 21"), conflictCheck("50000, 50100")});
}

TEST_F(FTPCheckTest, RefusesACustomRangeWithoutPorts) {
    const char* const message = "Set ftp custom port range but port values are not given.";
    expectRefused(FTPSet, request(R"("custom_port_range":true)"), message);
    expectRefused(FTPSet, request(R"("custom_port":null,"custom_port_range":true)"), message);
}

TEST_F(FTPCheckTest, DoesNotCheckPassivePortsWithoutACustomRange) {
    platform.takenPorts["ssh"] = {22};
    expectPasses(FTPSet, request(R"("custom_port":"22:22")"));
    expectPasses(FTPSet, request(R"("custom_port":"22:22","custom_port_range":false)"));
    expectPasses(FTPSet, request(R"("custom_port":"22:22","custom_port_range":null)"));
    expectPasses(FTPSet, request(R"("custom_port":"no ports","custom_port_range":false)"));
}

TEST_F(FTPCheckTest, LeavesZeroForWhatCannotBeReadOfTheRange) {
    const struct {
        const char* text;
        const char* range;
    } rows[] = {{"50000:50100", "50000, 50100"},
                {"50100:50000", "50100, 50000"},
                {"no ports", "0, 0"},
                {" ", "0, 0"},
                {":", "0, 0"},
                {"50000", "50000, 0"},
                {"50000:", "50000, 0"},
                {"50000-50100", "50000, 0"},
                {"50000 :50100", "50000, 0"},
                {":50100", "0, 0"},
                {"0:50100", "0, 50100"},
                {" 50000: 50100 ", "50000, 50100"},
                {"50000:50100:1", "50000, 50100"},
                {"50000:50100x", "50000, 50100"},
                {"-5:+7", "-5, 7"},
                {"010:0x10", "10, 0"},
                {"2147483647:-2147483648", "2147483647, -2147483648"}};
    for (const auto& row : rows) {
        expectPasses(FTPSet,
                     request(pair("custom_port", "\"" + std::string(row.text) + "\"") +
                             R"(,"custom_port_range":true)"),
                     {conflictCheck(row.range)});
    }
}

TEST_F(FTPCheckTest, TheFirstFailureInTheOrderOfTheStepsCounts) {
    platform.takenPorts["ssh"] = {22};
    // Each of the faults, in the order in which they are found.
    const std::string type = R"("timeout":"x")";
    const std::string mode = R"("utf8_mode":7)";
    const std::string text = R"("ext_ip":"")";
    const std::string port = R"("portnum":22)";
    const std::string range = R"("custom_port_range":true)";
    expectRefused(FTPSetV3, R"({"enable_ftp":"x","timeout":"x"})", nullInput);
    expectRefused(FTPSetV3, request(text + "," + port + "," + type + "," + mode), invalidType);
    expectRefused(FTPSetV3, request(text + "," + port + "," + mode), wrongMode);
    expectRefused(FTPSetV3, request(range + "," + text + "," + port), emptyText);
    const std::string params = request(range + "," + port);
    EXPECT_EQ(run(FTPSetV3, params), refused(1903, portConflict, params, {conflictCheck("22, 22")}));
}

TEST_F(FTPCheckTest, AFailureToGetTheParametersIsNullInput) {
    platform.fail("APIRequest::GetParam", fake::Platform::everyCall);
    EXPECT_EQ(run(FTPSet, request()), refused(1901, nullInput, "null"));
}

TEST_F(FTPCheckTest, ParametersThatAreNoObjectAreTheJsonLibrarysException) {
    EXPECT_EQ(runThrowing<Json::LogicError>(FTPSet, "[]"), Lines{getParams()});
}

TEST_F(FTPCheckTest, ExceptionsPassThrough) {
    platform.throwFrom("WebUtils::IsPortConflict");
    EXPECT_EQ(runThrowing<fake::Thrown>(FTPSet, request(R"("portnum":21)")),
              (Lines{getParams(), conflictCheck("21, 21")}));
}
