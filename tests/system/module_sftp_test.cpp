// The SFTP settings through the module, with real clients.
#include "tests/support/files.h"
#include "tests/support/text.h"
#include "tests/system/support/daemon_process.h"
#include "tests/system/support/module_service.h"

#include <chrono>
#include <filesystem>
#include <thread>

namespace velt::test {
namespace {
namespace fs = std::filesystem;

constexpr int sftpPortConflict = 1951;

class ModuleSftp : public ModuleService {
protected:
    void SetUp() override {
        ModuleService::SetUp();
        if (IsSkipped() || HasFatalFailure()) {
            return;
        }
        furnishSftp();
    }

    /// Waits until a part of the file has come.
    static bool hasBegun(const fs::path& file) {
        std::error_code error;
        for (int i = 0; i < 1000; i++) {
            if (fs::file_size(file, error) > 0 && !error) {
                return true;
            }
            std::this_thread::sleep_for(std::chrono::milliseconds(5));
        }
        return false;
    }
};

TEST_F(ModuleSftp, isSwitchedOnAndOff) {
    EXPECT_EQ(getSftp()["enable"], false);
    const ModuleAnswer answer = setSftp(R"({"enable": true, "portnum": 2222})");
    EXPECT_EQ(answer.code, 0) << answer.sentence;
    EXPECT_TRUE(servesSftp(2222));
    EXPECT_EQ(getSftp()["enable"], true);
    EXPECT_EQ(getSftp()["portnum"], 2222U);
    EXPECT_EQ(setSftp(R"({"enable": false})").code, 0);
    EXPECT_FALSE(isListening(2222));
    EXPECT_EQ(getSftp()["enable"], false);
    EXPECT_EQ(getSftp()["portnum"], 2222U);
}

TEST_F(ModuleSftp, movesUnderARunningTransferWhichFinishes) {
    ASSERT_EQ(setSftp(R"({"enable": true, "portnum": 2222})").code, 0);
    ProcessResult transfer;
    std::thread client([&transfer] { transfer = sftp(2222, "get large /mnt/srv/slow\n", "2400"); });
    EXPECT_TRUE(hasBegun("/mnt/srv/slow"));
    const ModuleAnswer answer = setSftp(R"({"enable": true, "portnum": 2223})");
    EXPECT_EQ(answer.code, 0) << answer.sentence;
    EXPECT_LT(fs::file_size("/mnt/srv/slow"), largeSize) << "the move came too late to show anything";
    EXPECT_TRUE(servesSftp(2223));
    EXPECT_FALSE(isListening(2222));
    client.join();
    EXPECT_EQ(transfer.exitCode, 0) << transfer.errors;
    EXPECT_EQ(contentsOf("/mnt/srv/slow"), std::string(largeSize, 'x'));
}

TEST_F(ModuleSftp, endsItsSessionsWhenSwitchedOff) {
    ASSERT_EQ(setSftp(R"({"enable": true, "portnum": 2222})").code, 0);
    ProcessResult transfer;
    std::thread client([&transfer] { transfer = sftp(2222, "get large /mnt/srv/slow\n", "2400"); });
    EXPECT_TRUE(hasBegun("/mnt/srv/slow"));
    const ModuleAnswer answer = setSftp(R"({"enable": false})");
    EXPECT_EQ(answer.code, 0) << answer.sentence;
    client.join();
    EXPECT_NE(transfer.exitCode, 0);
    EXPECT_LT(fs::file_size("/mnt/srv/slow"), largeSize);
}

TEST_F(ModuleSftp, leavesThePortsOfOthersAlone) {
    ASSERT_EQ(setFtp().code, 0);
    ASSERT_EQ(setSftp(R"({"enable": true, "portnum": 2222})").code, 0);
    const UniqueFd other = listenOn(2300);
    const ModuleAnswer taken = setSftp(R"({"enable": true, "portnum": 2300})");
    EXPECT_EQ(taken.code, sftpPortConflict);
    EXPECT_TRUE(contains(taken.sentence, "Port 2300 is taken by ")) << taken.sentence;
    EXPECT_EQ(lastPortConflict().port, 2300);
    EXPECT_EQ(setSftp(R"({"enable": true, "portnum": 2121})").code, sftpPortConflict);
    EXPECT_EQ(setSftp(R"({"enable": true, "portnum": 55600})").code, sftpPortConflict);
    EXPECT_TRUE(servesSftp(2222));

    ASSERT_EQ(setSftp(R"({"enable": false, "portnum": 2223})").code, 0);
    const UniqueFd holder = listenOn(2223);
    const ModuleAnswer failed = setSftp(R"({"enable": true})");
    EXPECT_EQ(failed.code, operationFailed);
    EXPECT_TRUE(contains(failed.sentence, "Port 2223 is in use by ")) << failed.sentence;
    EXPECT_EQ(getSftp()["enable"], false);
}

} // namespace
} // namespace velt::test
