// Ports, addresses and encryption.
#include "tests/system/support/ftp_service.h"

#include "standalone/contract/last_error.h"
#include "standalone/core/state_root.h"
#include "standalone/daemons/proftpd/proftpd_plan.h"
#include "tests/support/files.h"
#include "tests/support/result.h"
#include "tests/support/text.h"
#include <cstring>

namespace velt::test {
namespace {

const std::string certificate = worldRoot / "var/lib/velt/tls/server.crt";

ProcessResult tlsClient(std::vector<std::string> arguments) {
    arguments.insert(arguments.begin(), {"openssl", "s_client", "-connect", "127.0.0.1:2121", "-starttls",
                                         "ftp", "-CAfile", certificate});
    return runProcess(arguments, "QUIT\r\n", std::chrono::seconds(20));
}

// Whether a TLS client with these further arguments gets a session on the control connection.
bool handshakes(const std::vector<std::string>& arguments) {
    const auto result = tlsClient(arguments);
    return contains(result.output, "Verify return code: 0 (ok)") &&
           !contains(result.output, "Cipher is (NONE)");
}

// What such a client says of a session that the server refuses; a client that does not even ask says
// something else.
std::string refusalOf(const std::vector<std::string>& arguments) {
    return tlsClient(arguments).errors;
}

TEST_F(FtpService, plainOnlyServesPlainSessionsAndOffersNoTls) {
    start();
    FtpSession session(port);
    EXPECT_EQ(session.greeting().code, 220);
    EXPECT_EQ(session.command("AUTH TLS").code, 500);
    EXPECT_FALSE(contains(session.command("FEAT").text, "AUTH"));
    const auto listing = curl({"--user", "alice:alice-secret", "ftp://127.0.0.1:2121/"});
    EXPECT_EQ(listing.exitCode, 0) << listing.errors;
    EXPECT_TRUE(contains(listing.output, "home-of")) << listing.output;
}

TEST_F(FtpService, greetingTellsNeitherVersionNorAddress) {
    start();
    EXPECT_EQ(FtpSession(port).greeting().text, "220 FTP server ready.\n");
}

TEST_F(FtpService, tlsOnlyRefusesPlainSessionsBeforeThePassword) {
    offerTls(false);
    start();
    FtpSession session(port);
    EXPECT_EQ(session.command("USER alice").code, 550);
    EXPECT_NE(session.command("PASS alice-secret").code, 230);
    const std::vector<std::string> secure = {"--ssl-reqd",         "--cacert",
                                             certificate,          "--user",
                                             "alice:alice-secret", "ftp://127.0.0.1:2121/home-of"};
    const auto file = curl(secure);
    EXPECT_EQ(file.exitCode, 0) << file.errors;
    EXPECT_EQ(file.output, "alice");
    const auto clearData = runProcess(
        {"openssl", "s_client", "-connect", "127.0.0.1:2121", "-starttls", "ftp", "-quiet", "-crlf"},
        "USER alice\nPASS alice-secret\nPBSZ 0\nPROT C\nNLST\nQUIT\n", std::chrono::seconds(20));
    EXPECT_TRUE(contains(clearData.output, "230 ")) << clearData.output;
    EXPECT_TRUE(contains(clearData.output, "522 ")) << "data must be encrypted, too: " << clearData.output;
}

TEST_F(FtpService, bothServicesShareOnePort) {
    offerTls(true);
    start();
    const std::vector<std::string> rest = {"--user", "bob:bob-secret", "ftp://127.0.0.1:2121/home-of"};
    EXPECT_EQ(curl(rest).output, "bob");
    auto secure = rest;
    secure.insert(secure.begin(), {"--ssl-reqd", "--cacert", certificate});
    EXPECT_EQ(curl(secure).output, "bob");
}

TEST_F(FtpService, clientsThatResumeNoTlsSessionGetTheirData) {
    offerTls(false);
    start();
    const auto file = curl({"--no-sessionid", "--ssl-reqd", "--cacert", certificate, "--user",
                            "alice:alice-secret", "ftp://127.0.0.1:2121/home-of"});
    EXPECT_EQ(file.output, "alice") << file.errors;
}

TEST_F(FtpService, lftpTransfersUnderTls) {
    offerTls(false);
    start();
    const auto result = runProcess(
        {"lftp", "-c",
         "set ssl:ca-file " + certificate +
             "; set ftp:ssl-force true; set ftp:ssl-protect-data true; set net:max-retries 1;"
             " open -u alice,alice-secret ftp://127.0.0.1:2121; cat home-of; put /etc/hostname -o sent; ls"},
        {}, std::chrono::seconds(30));
    EXPECT_EQ(result.exitCode, 0) << result.errors;
    EXPECT_TRUE(contains(result.output, "alice")) << result.output;
    EXPECT_EQ(contentsOf("/mnt/home/alice/sent"), contentsOf("/etc/hostname"));
}

TEST_F(FtpService, oldTlsVersionsAreRefused) {
    offerTls(false);
    start();
    EXPECT_TRUE(handshakes({"-tls1_3"}));
    EXPECT_TRUE(handshakes({"-tls1_2"}));
    EXPECT_TRUE(contains(refusalOf({"-tls1_1", "-cipher", "ALL:@SECLEVEL=0"}), "alert protocol version"));
    EXPECT_TRUE(contains(refusalOf({"-tls1", "-cipher", "ALL:@SECLEVEL=0"}), "alert protocol version"));
}

TEST_F(FtpService, withoutFipsOtherAlgorithmsAreTaken) {
    offerTls(false);
    start();
    EXPECT_TRUE(handshakes({"-tls1_2", "-cipher", "ECDHE-ECDSA-CHACHA20-POLY1305"}));
    EXPECT_TRUE(handshakes({"-tls1_3", "-ciphersuites", "TLS_CHACHA20_POLY1305_SHA256"}));
    EXPECT_TRUE(handshakes({"-tls1_3", "-groups", "X25519"}));
}

TEST_F(FtpService, withFipsOnlyApprovedAlgorithmsAreTaken) {
    offerTls(false);
    ASSERT_EQ(VELTFTPFIPSEnabledSet(1), 0) << lastErrorSentence();
    start();
    EXPECT_TRUE(handshakes({"-tls1_2", "-cipher", "ECDHE-ECDSA-AES128-GCM-SHA256"}));
    EXPECT_TRUE(handshakes({"-tls1_3", "-ciphersuites", "TLS_AES_256_GCM_SHA384", "-groups", "P-384"}));
    EXPECT_FALSE(handshakes({"-tls1_2", "-cipher", "ECDHE-ECDSA-CHACHA20-POLY1305"}));
    EXPECT_FALSE(handshakes({"-tls1_2", "-cipher", "ECDHE-ECDSA-AES128-SHA"}));
    EXPECT_FALSE(handshakes({"-tls1_3", "-ciphersuites", "TLS_CHACHA20_POLY1305_SHA256"}));
    EXPECT_FALSE(handshakes({"-tls1_3", "-groups", "X25519"}));
}

TEST_F(FtpService, certificateOfTheAdministratorIsServed) {
    offerTls(false);
    const auto folder = worldRoot / "etc/velt/tls";
    std::filesystem::create_directories(folder);
    const auto made =
        runProcess({"openssl", "req", "-x509", "-newkey", "rsa:2048", "-nodes", "-days", "2", "-subj",
                    "/CN=given", "-addext", "subjectAltName=IP:127.0.0.1", "-keyout",
                    (folder / "server.key").string(), "-out", (folder / "server.crt").string()});
    ASSERT_EQ(made.exitCode, 0) << made.errors;
    start();
    const auto file = curl({"--ssl-reqd", "--cacert", (folder / "server.crt").string(), "--user",
                            "alice:alice-secret", "ftp://127.0.0.1:2121/home-of"});
    EXPECT_EQ(file.exitCode, 0) << file.errors;
    EXPECT_EQ(file.output, "alice");
    std::filesystem::permissions(folder / "server.key", std::filesystem::perms(0644));
    EXPECT_TRUE(contains(messageOf(planFtpDaemon()), "server.key is open to other users"));
}

TEST_F(FtpService, controlPortFollowsTheSetting) {
    start();
    std::strcpy(record.portnum, "2122");
    start();
    EXPECT_EQ(FtpSession(2122).greeting().code, 220);
    EXPECT_FALSE(isListening(2121));
}

TEST_F(FtpService, bothAddressFamiliesAreServed) {
    start();
    const auto file = curl({"--user", "alice:alice-secret", "ftp://[::1]:2121/home-of"});
    EXPECT_EQ(file.exitCode, 0) << file.errors;
    EXPECT_EQ(file.output, "alice");
}

TEST_F(FtpService, staysOnTheLoopbackWhereTheAdministratorSaysSo) {
    start();
    EXPECT_EQ(FtpSession(port, "127.0.0.2").greeting().code, 220);
    std::filesystem::create_directories(worldRoot / "etc/velt");
    writeFile(worldRoot / "etc/velt/network.conf", "version = 1\nloopback_only = 1\n");
    start();
    const auto file = curl({"--user", "alice:alice-secret", "ftp://127.0.0.1:2121/home-of"});
    EXPECT_EQ(file.output, "alice") << file.errors;
    EXPECT_FALSE(connectTo("127.0.0.2", port)) << "it listens on other addresses, too";
}

TEST_F(FtpService, passivePortsLieInTheDefaultRange) {
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    for (int i = 0; i < 20; i++) {
        const auto address = session.passive();
        ASSERT_TRUE(address);
        EXPECT_GE(address->port, 55536);
        EXPECT_LE(address->port, 55899);
    }
}

TEST_F(FtpService, passivePortsLieInTheCustomRange) {
    record.passive_port_min = 30000;
    record.passive_port_max = 30003;
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    for (int i = 0; i < 20; i++) {
        const auto address = session.passive();
        ASSERT_TRUE(address);
        EXPECT_GE(address->port, 30000);
        EXPECT_LE(address->port, 30003);
    }
    EXPECT_EQ(session.receive("RETR home-of"), "alice");
}

TEST_F(FtpService, externalAddressIsAnnouncedOnlyWhenAsked) {
    ASSERT_EQ(VLIBCINFOSetKeyValue("ftp_ext_ip", "203.0.113.7"), 0) << lastErrorSentence();
    start();
    {
        FtpSession session(port);
        ASSERT_EQ(session.logIn("alice"), 230);
        EXPECT_EQ(session.passive().value_or(DataAddress{}).host, "127.0.0.1");
    }
    record.use_ext_ip = 1;
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    EXPECT_EQ(session.passive().value_or(DataAddress{}).host, "203.0.113.7");
    EXPECT_TRUE(contains(session.command("EPSV").text, "(|||"));
}

TEST_F(FtpService, fxpOffBindsDataToTheClientsAddress) {
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    EXPECT_EQ(session.command("PORT 127,0,0,2,200,1").code, 500);
    const auto address = session.passive();
    ASSERT_TRUE(address);
    const UniqueFd stranger = connectTo("127.0.0.1", address->port, "127.0.0.2");
    session.command("RETR home-of");
    EXPECT_EQ(readToEnd(stranger.get()), "");
}

TEST_F(FtpService, fxpOnLetsDataGoElsewhere) {
    record.enable_fxp = 1;
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    EXPECT_EQ(session.command("PORT 198,51,100,9,200,1").code, 200);
    const auto address = session.passive();
    ASSERT_TRUE(address);
    const UniqueFd stranger = connectTo("127.0.0.1", address->port, "127.0.0.2");
    EXPECT_EQ(session.command("RETR home-of").code, 150);
    EXPECT_EQ(readToEnd(stranger.get()), "alice");
}

TEST_F(FtpService, fxpOnLetsNoDataGoToTheInside) {
    for (const char* own : {"198.51.100.7/32", "2001:db8::7/128", "192.0.2.1/28"}) {
        ASSERT_EQ(runProcess({"ip", "address", "replace", own, "dev", "lo"}).exitCode, 0);
    }
    ASSERT_EQ(VLIBCINFOSetKeyValue("ftp_ext_ip", "203.0.113.7"), 0) << lastErrorSentence();
    record.use_ext_ip = 1;
    record.enable_fxp = 1;
    start();
    FtpSession session(port);
    ASSERT_EQ(session.logIn("alice"), 230);
    for (const char* address :
         {"127,0,0,2", "127,255,255,255", "0,0,0,1", "169,254,1,1", "224,0,0,1", "255,255,255,255",
          "198,51,100,7", "203,0,113,7", "192,0,2,9", "4294967423,0,0,2", "+127,0,0,2", "0127,0,0,2"}) {
        EXPECT_EQ(session.command(std::string("PORT ") + address + ",200,1").code, 501) << address;
    }
    for (const char* address :
         {"|1|127.0.0.2|", "|1|169.254.1.1|", "|1|198.51.100.7|", "|2|::1|", "|2|::|", "|2|::ffff:127.0.0.2|",
          "|2|::ffff:7f00:2|", "|2|::127.0.0.2|", "|2|::ffff:198.51.100.7|", "|2|2001:db8::7|", "|2|fe80::1|",
          "|2|ff02::1|", "!1!127.0.0.2!", "|01|127.0.0.2|", "|2|64:ff9b::cb00:7107|", "|2|64:ff9b:1::7f00:1|",
          "|1|192.0.2.9|"}) {
        EXPECT_EQ(session.command(std::string("EPRT ") + address + "51201|").code, 501) << address;
    }
    for (const char* command : {"PORT 127,0,0,1,200,1", "PORT 198,51,100,9,200,1", "EPRT |1|127.0.0.1|51201|",
                                "EPRT |2|::ffff:127.0.0.1|51201|", "EPRT |2|2001:db8::9|51201|"}) {
        EXPECT_EQ(session.command(command).code, 200) << command << ": the client's own, or another host's";
    }
    const auto file = curl({"--ftp-port", "::1", "--user", "alice:alice-secret", "ftp://[::1]:2121/home-of"});
    EXPECT_EQ(file.output, "alice") << file.errors;
}

} // namespace
} // namespace velt::test
