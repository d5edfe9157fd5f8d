// What the module's requests leave in the administrator log, on the event bus and in the firewall.
#include "tests/standalone/firewall/private_network.h"
#include "tests/system/support/module_service.h"

#include <chrono>

namespace velt::test {
namespace {

using Lines = std::vector<std::string>;

TEST_F(ModuleService, logsAndAnnouncesWhatItDid) {
    ASSERT_EQ(setFtp(R"({"maxuploadrate": 100, "max_conn_per_ip": 5})").code, 0);
    EXPECT_EQ(logSentences(),
              (Lines{"The FTP service was enabled.", "The FTP port was changed from 21 to 2121.",
                     "FTP with encryption (FTPS) was set to \"Disabled\".",
                     "The FTP upload limit was changed from 0 KB/s to 100 KB/s.",
                     "The limit of FTP connections from one address was set to \"5\".",
                     "The FTP service was started."}));
    EXPECT_EQ(serviceActions(), (Lines{"ftpd stop", "ftpd-ssl stop", "ftpd start"}));
    ASSERT_EQ(setFtp(R"({"enable_ftp": false})").code, 0);
    EXPECT_EQ(logSentences().back(), "The FTP service was disabled.");
    EXPECT_EQ(serviceActions(),
              (Lines{"ftpd stop", "ftpd-ssl stop", "ftpd start", "ftpd stop", "ftpd-ssl stop"}));
    for (const LogEntry& entry : logEntries()) {
        EXPECT_EQ(entry.actor, requestActorName);
        EXPECT_EQ(entry.address, requestActorAddress);
        EXPECT_EQ(entry.category, 2);
        EXPECT_EQ(entry.level, 1);
        EXPECT_LT(std::chrono::system_clock::now() - entry.time, std::chrono::minutes(2));
    }
}

TEST_F(ModuleService, logsSecurityChrootAndSftp) {
    makeShares();
    ASSERT_EQ(
        setSecurity(R"({"anonymous": true, "anonymous_chroot": true, "anonymous_chroot_share": "public"})")
            .code,
        0);
    ASSERT_EQ(requestModule("VELT.Core.FileServ.FTP.ChrootUser", 1, "add", json(R"({"id": ["alice"]})")).code,
              0);
    ASSERT_EQ(setSftp(R"({"enable": true, "portnum": 2222})").code, 0);
    EXPECT_EQ(
        logSentences(),
        (Lines{"Anonymous FTP login was allowed.", "Confining anonymous FTP users to one share was started.",
               "The share that anonymous FTP users are confined to was set to \"public\".",
               "User \"alice\" was confined to the home folder in the FTP service.",
               "The SFTP port was changed from 22 to 2222.", "The SFTP service was enabled."}));
    EXPECT_EQ(serviceActions(), Lines{}) << "only the FTP settings announce services";
}

class ModuleFirewall : public ModuleService {
protected:
    void SetUp() override {
        ModuleService::SetUp();
        if (IsSkipped() || HasFatalFailure()) {
            return;
        }
        std::filesystem::create_directories(worldRoot / "etc/velt");
        writeFile(worldRoot / "etc/velt/firewall.conf", "version = 1\nmode = drop\n");
    }

    /// The ports that the rules in force open.
    static std::string openPorts() {
        const std::string table =
            runProcess({"nft", "list", "set", "inet", "velt_fileserv", "tcp_open"}).output;
        const auto begin = table.find("elements = {");
        const auto end = table.find('}', begin);
        if (begin == std::string::npos || end == std::string::npos) {
            return "";
        }
        std::string ports;
        for (const char c : table.substr(begin + 12, end - begin - 12)) {
            ports += std::isspace(static_cast<unsigned char>(c)) != 0 ? "" : std::string(1, c);
        }
        return ports;
    }
};

TEST_F(ModuleFirewall, followsThePortsOfBothServices) {
    const PrivateNetwork network;
    ASSERT_TRUE(network.isThere());
    ASSERT_EQ(setFtp().code, 0);
    EXPECT_EQ(openPorts(), "2121,55536-55899");
    EXPECT_TRUE(network.neighbourReaches(port));
    const UniqueFd other = listenOn(8080);
    EXPECT_FALSE(network.neighbourReaches(8080));
    ASSERT_EQ(setFtp(R"({"portnum": 2122, "custom_port_range": true, "custom_port": "30000:30010"})").code,
              0);
    EXPECT_EQ(openPorts(), "2122,30000-30010");
    EXPECT_TRUE(network.neighbourReaches(2122));
    ASSERT_EQ(setSftp(R"({"enable": true, "portnum": 2222})").code, 0);
    EXPECT_EQ(openPorts(), "2122,2222,30000-30010");
    EXPECT_TRUE(network.neighbourReaches(2222));
    ASSERT_EQ(setSftp(R"({"enable": true, "portnum": 2223})").code, 0);
    EXPECT_EQ(openPorts(), "2122,2223,30000-30010");
    EXPECT_TRUE(network.neighbourReaches(2223));
}

TEST_F(ModuleFirewall, followsAServiceThatIsSwitchedOnAtItsFormerPort) {
    const PrivateNetwork network;
    ASSERT_TRUE(network.isThere());
    ASSERT_EQ(setFtp().code, 0);
    ASSERT_EQ(setFtp(R"({"enable_ftp": false})").code, 0);
    EXPECT_EQ(openPorts(), "");
    ASSERT_EQ(setSftp(R"({"enable": false, "portnum": 2222})").code, 0);
    ASSERT_EQ(setFtp().code, 0);
    ASSERT_EQ(setSftp(R"({"enable": true})").code, 0);
    EXPECT_EQ(openPorts(), "2121,2222,55536-55899");
    EXPECT_TRUE(network.neighbourReaches(port));
    EXPECT_TRUE(network.neighbourReaches(2222));
    ASSERT_EQ(setSftp(R"({"enable": false})").code, 0);
    EXPECT_EQ(openPorts(), "2121,55536-55899");
}

} // namespace
} // namespace velt::test
