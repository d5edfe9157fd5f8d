// Each FTP setting by veltctl and by curl, seen by clients: services, ports, addresses and encryption.
#include "tests/system/support/daemon_process.h"
#include "tests/system/support/setting_table.h"

namespace velt::test {
namespace {

class HostFtp : public SettingTable {
protected:
    void SetUp() override {
        SettingTable::SetUp();
        if (!IsSkipped() && !HasFatalFailure()) {
            done({"ftp", "set", "enable_ftp=on"});
        }
    }

    static int passivePort() { return aliceAt().passive().value_or(DataAddress{}).port; }
    static std::string passiveHost() { return aliceAt().passive().value_or(DataAddress{}).host; }
};

TEST_F(HostFtp, theServicesAndTheirPort) {
    check({
        {"ftp",
         "enable_ftps",
         true,
         false,
         [](const Json::Value& on) { EXPECT_EQ(fetchesUnderTls(), on.asBool()); },
         {},
         {}},
        {"ftp",
         "enable_ftp",
         false,
         true,
         [](const Json::Value& on) {
             EXPECT_EQ(fetchHome(), on.asBool() ? "alice" : "") << "no password in clear text";
             EXPECT_TRUE(fetchesUnderTls());
         },
         {"enable_ftps=on"},
         {}},
        {"ftp",
         "enable_ftps",
         false,
         true,
         [](const Json::Value& on) { EXPECT_EQ(isListening(port), on.asBool()); },
         {"enable_ftp=off"},
         {}},
        {"ftp",
         "portnum",
         2123,
         2124,
         [](const Json::Value& at) {
             EXPECT_EQ(fetchHome(at.asInt()), "alice");
             EXPECT_FALSE(isListening(port));
             EXPECT_FALSE(isListening(at == 2123 ? 2124 : 2123));
         },
         {"enable_ftp=on"},
         {}},
    });
}

TEST_F(HostFtp, thePassiveRange) {
    const auto inRange = [](int first, int last) {
        const int chosen = passivePort();
        EXPECT_TRUE(chosen >= first && chosen <= last) << chosen;
    };
    check({
        {"ftp",
         "custom_port",
         "30000:30003",
         "31000:31003",
         [&](const Json::Value& range) {
             const int first = std::stoi(range.asString());
             inRange(first, first + 3);
         },
         {},
         R"({"custom_port_range": true})"},
    });
    // The range of the switch is the one that veltctl reads beside it.
    done({"ftp", "set", "custom_port_range=off"});
    inRange(55536, 55899);
    EXPECT_EQ(
        curl(
            ftpApi + std::string("set"),
            R"({"enable_ftp": true, "enable_ftps": false, "custom_port_range": true, "custom_port": "32000:32003"})")
            .status,
        204);
    inRange(32000, 32003);
    EXPECT_EQ(curl(ftpApi + std::string("set"),
                   R"({"enable_ftp": true, "enable_ftps": false, "custom_port_range": false})")
                  .status,
              204);
    EXPECT_EQ(jsonOf(done({"ftp", "get", "--json"}))["custom_port_range"], false);
    inRange(55536, 55899);
    done({"ftp", "set", "custom_port_range=on"});
    const Json::Value now = curl(ftpApi + std::string("get")).json;
    EXPECT_EQ(now["custom_port_range"], true);
    EXPECT_EQ(now["custom_port"], "55536:55899");
    inRange(55536, 55899);
}

TEST_F(HostFtp, theExternalAddressAndForeignDataAddresses) {
    check({
        {"ftp",
         "ext_ip",
         "203.0.113.7",
         "198.51.100.9",
         [](const Json::Value& address) { EXPECT_EQ(passiveHost(), address.asString()); },
         {"use_ext_ip=on", "ext_ip=192.0.2.1"},
         {}},
        {"ftp",
         "use_ext_ip",
         false,
         true,
         [](const Json::Value& on) { EXPECT_EQ(passiveHost(), on.asBool() ? "198.51.100.9" : "127.0.0.1"); },
         {},
         {}},
        {"ftp",
         "enable_fxp",
         true,
         false,
         [](const Json::Value& on) {
             EXPECT_EQ(aliceAt().command("PORT 192,0,2,9,200,1").code, on.asBool() ? 200 : 500);
         },
         {},
         {}},
    });
    done({"ftp", "set", "ext_ip=", "use_ext_ip=off"});
    EXPECT_EQ(curl(ftpApi + std::string("get")).json["ext_ip"], "");
}

TEST_F(HostFtp, encryption) {
    check({
        {"ftp",
         "enable_fips",
         true,
         false,
         [](const Json::Value& on) {
             EXPECT_TRUE(
                 handshakes({"-tls1_3", "-ciphersuites", "TLS_AES_256_GCM_SHA384", "-groups", "P-384"}));
             EXPECT_EQ(handshakes({"-tls1_3", "-ciphersuites", "TLS_CHACHA20_POLY1305_SHA256"}),
                       !on.asBool());
             EXPECT_EQ(handshakes({"-tls1_3", "-groups", "X25519"}), !on.asBool());
         },
         {"enable_ftps=on"},
         {}},
    });
}

TEST_F(HostFtp, aSecondClientSeesTheSame) {
    done({"ftp", "set", "enable_ftps=on"});
    const std::string certificate = worldRoot / "var/lib/velt/tls/server.crt";
    const std::string open = "open -u alice,alice-secret 127.0.0.1:" + std::to_string(port) + "; ";
    const ProcessResult result =
        runProcess({"lftp", "--norc", "-c",
                    "set ftp:ssl-force true; set ssl:check-hostname no; set ssl:ca-file " + certificate +
                        "; set net:max-retries 1; set net:timeout 10; " + open + "cat home-of"},
                   {}, std::chrono::seconds(30));
    EXPECT_EQ(result.output, "alice") << result.errors;
}

} // namespace
} // namespace velt::test
