#include "platform/sftp.h"
#include "tests/contract/contract_test.h"

#include <cstring>

namespace contract {
namespace {

class SftpSettingsContract : public ContractTest {
protected:
    static _tag_VELT_SFTP_CONFIG_ record() {
        _tag_VELT_SFTP_CONFIG_ read;
        std::memset(&read, '?', sizeof read);
        EXPECT_GE(VELTSFTPConfigGet(1, &read), 0) << lastError();
        return read;
    }
};

TEST_F(SftpSettingsContract, IsOffWithAPortBeforeTheFirstStore) {
    EXPECT_EQ(record().enable, 0);
    EXPECT_GE(record().port, 1);
    EXPECT_LE(record().port, 65535);
}

TEST_F(SftpSettingsContract, FlagAndPortAreStoredTogether) {
    ASSERT_GE(VELTSFTPConfigSet(1, 2222), 0) << lastError();
    EXPECT_NE(record().enable, 0);
    EXPECT_EQ(record().port, 2222);
    ASSERT_GE(VELTSFTPConfigSet(0, 65535), 0) << lastError();
    EXPECT_EQ(record().enable, 0);
    EXPECT_EQ(record().port, 65535);
}

TEST_F(SftpSettingsContract, ReadingChangesNothing) {
    ASSERT_GE(VELTSFTPConfigSet(1, 2222), 0) << lastError();
    const auto first = record();
    const auto second = record();
    EXPECT_EQ(std::memcmp(&first, &second, sizeof first), 0);
}

TEST_F(SftpSettingsContract, IsNotAliveByBeingEnabled) {
    ASSERT_GE(VELTSFTPConfigSet(1, 2222), 0) << lastError();
    EXPECT_EQ(VELTSFTPIsAlive(), 0);
}

} // namespace
} // namespace contract
