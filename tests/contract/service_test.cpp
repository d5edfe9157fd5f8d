// Which services are enabled, by the stored settings. Starting one is for the tests that have daemons.
#include "platform/service.h"
#include "platform/sftp.h"
#include "tests/contract/contract_test.h"

namespace contract {
namespace {

class ServiceContract : public ContractTest {
protected:
    static bool isEnabled(const char* service) { return VLIBServiceIsEnabled(service) != 0; }

    static void storeFlags(int flags) {
        auto record = ftpRecord();
        record.service_flags = flags;
        ASSERT_GE(VELTFTPConfSet(record), 0) << lastError();
    }
};

TEST_F(ServiceContract, NoneIsEnabledAtFirst) {
    for (const char* service : {"ftpd", "ftpd-pure", "ftpd-ssl", "sftp", "no such service"}) {
        EXPECT_FALSE(isEnabled(service)) << service;
    }
}

TEST_F(ServiceContract, AStoredFlagEnablesItsService) {
    for (const int flags : {1, 2, 3, 0, 3, 4, 5}) {
        storeFlags(flags);
        EXPECT_EQ(isEnabled("ftpd"), (flags & VELT_FTP_SERVICE_PLAIN) != 0) << flags;
        EXPECT_EQ(isEnabled("ftpd-ssl"), (flags & VELT_FTP_SERVICE_TLS) != 0) << flags;
        EXPECT_FALSE(isEnabled("sftp")) << flags;
    }
}

TEST_F(ServiceContract, TheSftpFlagEnablesSftp) {
    for (const int enable : {1, 0}) {
        ASSERT_GE(VELTSFTPConfigSet(enable, 2222), 0) << lastError();
        EXPECT_EQ(isEnabled("sftp"), enable != 0);
        EXPECT_FALSE(isEnabled("ftpd"));
        EXPECT_FALSE(isEnabled("ftpd-ssl"));
    }
}

TEST_F(ServiceContract, NeitherAStopNorARunKeyChangesWhatIsEnabled) {
    storeFlags(VELT_FTP_SERVICE_PLAIN);
    ASSERT_GE(VELTSFTPConfigSet(1, 2222), 0) << lastError();
    ASSERT_GE(VLIBServicecfgRunKeySet("ftpd", 2), 0) << lastError();
    ASSERT_GE(VLIBServicecfgRunKeySet("ftpd-ssl", 1), 0) << lastError();
    ASSERT_GE(VLIBServicectlStop("ftpd", 0), 0) << lastError();
    ASSERT_GE(VLIBServiceStop("sftp", 0), 0) << lastError();
    EXPECT_TRUE(isEnabled("ftpd"));
    EXPECT_FALSE(isEnabled("ftpd-ssl"));
    EXPECT_TRUE(isEnabled("sftp"));
    EXPECT_EQ(VELTSFTPIsAlive(), 0);
}

} // namespace
} // namespace contract
