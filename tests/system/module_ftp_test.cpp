// The FTP settings through the module: ports, addresses and encryption.
#include "tests/system/support/daemon_process.h"
#include "tests/system/support/module_service.h"

namespace velt::test {
namespace {

class EachVersion : public ModuleService, public testing::WithParamInterface<int> {};

TEST_P(EachVersion, opensAndClosesThePort) {
    EXPECT_EQ(getFtp(GetParam())["enable_ftp"], false);
    const ModuleAnswer opened = setFtp("{}", GetParam());
    EXPECT_EQ(opened.code, 0) << opened.sentence;
    EXPECT_TRUE(opened.data.isNull());
    EXPECT_EQ(fetchHome(), "alice");
    const Json::Value settings = getFtp(GetParam());
    EXPECT_EQ(settings["enable_ftp"], true);
    EXPECT_EQ(settings["enable_ftps"], false);
    EXPECT_EQ(settings["portnum"], port);
    EXPECT_EQ(setFtp(R"({"enable_ftp": false})", GetParam()).code, 0);
    EXPECT_FALSE(isListening(port));
    EXPECT_EQ(getFtp(GetParam())["enable_ftp"], false);
}

INSTANTIATE_TEST_SUITE_P(Module, EachVersion, testing::Values(1, 2, 3));

TEST_F(ModuleService, offersPlainFtpAndFtpsEachForItselfAndBoth) {
    ASSERT_EQ(setFtp(R"({"enable_ftp": false, "enable_ftps": true})").code, 0);
    EXPECT_EQ(fetchHome(), "") << "no password in clear text";
    EXPECT_TRUE(fetchesUnderTls());
    EXPECT_EQ(getFtp()["enable_ftps"], true);
    ASSERT_EQ(setFtp(R"({"enable_ftps": true})").code, 0);
    EXPECT_EQ(fetchHome(), "alice");
    EXPECT_TRUE(fetchesUnderTls());
    ASSERT_EQ(setFtp(R"({"enable_ftps": false})").code, 0);
    EXPECT_EQ(fetchHome(), "alice");
    EXPECT_FALSE(fetchesUnderTls());
}

TEST_F(ModuleService, movesTheControlPort) {
    ASSERT_EQ(setFtp().code, 0);
    EXPECT_EQ(fetchHome(), "alice");
    ASSERT_EQ(setFtp(R"({"portnum": 2122})").code, 0);
    EXPECT_EQ(fetchHome(2122), "alice");
    EXPECT_FALSE(isListening(port));
    EXPECT_EQ(getFtp()["portnum"], 2122);
}

TEST_F(ModuleService, movesThePassiveRangeAndTakesTheDefaultOneAgain) {
    ASSERT_EQ(setFtp(R"({"custom_port_range": true, "custom_port": "30000:30003"})").code, 0);
    EXPECT_EQ(getFtp()["custom_port"], "30000:30003");
    {
        FtpSession session = aliceAt();
        for (int i = 0; i < 10; i++) {
            const int dataPort = session.passive().value_or(DataAddress{}).port;
            EXPECT_TRUE(dataPort >= 30000 && dataPort <= 30003) << dataPort;
        }
        EXPECT_EQ(session.receive("RETR home-of"), "alice");
    }
    ASSERT_EQ(setFtp(R"({"custom_port_range": false})").code, 0);
    EXPECT_EQ(getFtp()["custom_port"], "55536:55899");
    FtpSession session = aliceAt();
    const int dataPort = session.passive().value_or(DataAddress{}).port;
    EXPECT_TRUE(dataPort >= 55536 && dataPort <= 55899) << dataPort;
}

TEST_F(ModuleService, announcesTheExternalAddressWhenAsked) {
    ASSERT_EQ(setFtp(R"({"use_ext_ip": true, "ext_ip": "203.0.113.7"})").code, 0);
    EXPECT_EQ(getFtp()["ext_ip"], "203.0.113.7");
    EXPECT_EQ(aliceAt().passive().value_or(DataAddress{}).host, "203.0.113.7");
    ASSERT_EQ(setFtp(R"({"ext_ip": "198.51.100.9"})").code, 0);
    EXPECT_EQ(aliceAt().passive().value_or(DataAddress{}).host, "198.51.100.9");
    ASSERT_EQ(setFtp(R"({"use_ext_ip": false})").code, 0);
    EXPECT_EQ(aliceAt().passive().value_or(DataAddress{}).host, "127.0.0.1");
}

TEST_F(ModuleService, letsDataGoElsewhereWithFxpOnly) {
    ASSERT_EQ(setFtp(R"({"enable_fxp": true})").code, 0);
    EXPECT_EQ(getFtp()["enable_fxp"], true);
    EXPECT_EQ(aliceAt().command("PORT 192,0,2,9,200,1").code, 200);
    ASSERT_EQ(setFtp(R"({"enable_fxp": false})").code, 0);
    EXPECT_EQ(aliceAt().command("PORT 192,0,2,9,200,1").code, 500);
}

TEST_F(ModuleService, narrowsTheAlgorithmsWithFips) {
    ASSERT_EQ(setFtp(R"({"enable_ftps": true, "enable_fips": true})").code, 0);
    EXPECT_EQ(getFtp()["enable_fips"], true);
    EXPECT_TRUE(handshakes({"-tls1_3", "-ciphersuites", "TLS_AES_256_GCM_SHA384", "-groups", "P-384"}));
    EXPECT_FALSE(handshakes({"-tls1_3", "-ciphersuites", "TLS_CHACHA20_POLY1305_SHA256"}));
    EXPECT_FALSE(handshakes({"-tls1_3", "-groups", "X25519"}));
    ASSERT_EQ(setFtp(R"({"enable_ftps": true, "enable_fips": false})").code, 0);
    EXPECT_TRUE(handshakes({"-tls1_3", "-ciphersuites", "TLS_CHACHA20_POLY1305_SHA256"}));
    EXPECT_TRUE(handshakes({"-tls1_3", "-groups", "X25519"}));
}

TEST_F(ModuleService, leavesSessionsAloneWhenNothingChanges) {
    ASSERT_EQ(setFtp().code, 0);
    FtpSession session = aliceAt();
    Json::Value same = getFtp();
    same.removeMember("ext_ip"); // naming it asks for a restart
    EXPECT_EQ(setFtp(same.toStyledString()).code, 0);
    EXPECT_EQ(session.command("NOOP").code, 200);
    EXPECT_EQ(setFtp(R"({"maxuploadrate": 77})").code, 0);
    EXPECT_NE(session.command("NOOP").code, 200) << "a change restarts the service";
}

} // namespace
} // namespace velt::test
