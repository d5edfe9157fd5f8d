#include "platform/sftp.h"
#include "platform/webapi.h"
#include "tests/contract/contract_test.h"

#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cstdio>

namespace contract {
namespace {

using WebUtils::IsPortConflict;

constexpr int ftpPort = 2121;
constexpr int sftpPort = 2222;

/// A port on which nobody listens.
int freePort() {
    const int socket = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    socklen_t size = sizeof address;
    auto* const generic = reinterpret_cast<sockaddr*>(&address);
    const bool found = ::bind(socket, generic, size) == 0 && ::getsockname(socket, generic, &size) == 0;
    ::close(socket);
    return found ? ntohs(address.sin_port) : 0;
}

class PortContract : public ContractTest {
protected:
    void SetUp() override {
        ContractTest::SetUp();
        auto record = ftpRecord();
        std::snprintf(record.portnum, sizeof record.portnum, "%d", ftpPort);
        record.passive_port_min = 30000;
        record.passive_port_max = 30010;
        ASSERT_GE(VELTFTPConfSet(record), 0) << lastError();
        ASSERT_GE(VELTSFTPConfigSet(0, sftpPort), 0) << lastError();
    }
};

TEST_F(PortContract, AServicesOwnPortsAreNoConflict) {
    EXPECT_EQ(IsPortConflict("ftp", ftpPort, ftpPort), 0);
    EXPECT_EQ(IsPortConflict("ftp", 30000, 30010), 0);
    EXPECT_EQ(IsPortConflict("ssh", sftpPort, sftpPort), 0);
}

TEST_F(PortContract, TheOtherServicesPortsAre) {
    EXPECT_NE(IsPortConflict("ssh", ftpPort, ftpPort), 0);
    EXPECT_NE(IsPortConflict("ssh", 30005, 30005), 0);
    EXPECT_NE(IsPortConflict("ftp", sftpPort, sftpPort), 0);
}

TEST_F(PortContract, ARangeConflictsByAnyPortInIt) {
    EXPECT_NE(IsPortConflict("ftp", sftpPort - 3, sftpPort + 3), 0);
    EXPECT_NE(IsPortConflict("ftp", sftpPort - 3, sftpPort), 0);
    EXPECT_NE(IsPortConflict("ftp", sftpPort, sftpPort + 3), 0);
}

TEST_F(PortContract, APortThatNobodyHasIsNoConflict) {
    const int port = freePort();
    ASSERT_GT(port, 0);
    EXPECT_EQ(IsPortConflict("ftp", port, port), 0);
    EXPECT_EQ(IsPortConflict("ssh", port, port), 0);
}

TEST_F(PortContract, AnotherPortOnceStoredIsTheServicesOwn) {
    const int former = sftpPort;
    const int port = freePort();
    ASSERT_GT(port, 0);
    ASSERT_GE(VELTSFTPConfigSet(0, port), 0) << lastError();
    EXPECT_EQ(IsPortConflict("ssh", port, port), 0);
    EXPECT_NE(IsPortConflict("ftp", port, port), 0);
    EXPECT_EQ(IsPortConflict("ftp", former, former), 0);
}

} // namespace
} // namespace contract
