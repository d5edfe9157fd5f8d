#include "platform/sftp.h"
#include "platform/webapi.h"
#include "tests/contract/contract_test.h"
#include "tests/support/ports.h"

#include <cstdio>

namespace contract {
namespace {

using velt::test::freePort;
using WebUtils::IsPortConflict;

class PortContract : public ContractTest {
protected:
    void SetUp() override {
        ContractTest::SetUp();
        auto record = ftpRecord();
        std::snprintf(record.portnum, sizeof record.portnum, "%d", ftpPort);
        record.passive_port_min = firstPassive;
        record.passive_port_max = lastPassive;
        ASSERT_GE(VELTFTPConfSet(record), 0) << lastError();
        ASSERT_GE(VELTSFTPConfigSet(0, sftpPort), 0) << lastError();
    }

    const int ftpPort = freePort();
    const int sftpPort = freePort();
    const int firstPassive = velt::test::freePorts(11);
    const int lastPassive = firstPassive + 10;
};

TEST_F(PortContract, AServicesOwnPortsAreNoConflict) {
    EXPECT_EQ(IsPortConflict("ftp", ftpPort, ftpPort), 0);
    EXPECT_EQ(IsPortConflict("ftp", firstPassive, lastPassive), 0);
    EXPECT_EQ(IsPortConflict("ssh", sftpPort, sftpPort), 0);
}

TEST_F(PortContract, TheOtherServicesPortsAre) {
    EXPECT_NE(IsPortConflict("ssh", ftpPort, ftpPort), 0);
    EXPECT_NE(IsPortConflict("ssh", firstPassive + 5, firstPassive + 5), 0);
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
