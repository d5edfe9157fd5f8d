// The FTP record and the settings beside it.
#include "tests/contract/contract_test.h"

#include <cstdio>
#include <cstring>

namespace contract {
namespace {

class FtpSettingsContract : public ContractTest {
protected:
    static void store(const _tag_VELT_FTP_CONF_& record) {
        ASSERT_GE(VELTFTPConfSet(record), 0) << lastError();
    }

    /// Each field has a value that differs from its default and that a daemon takes.
    static _tag_VELT_FTP_CONF_ fullRecord() {
        _tag_VELT_FTP_CONF_ record{};
        std::snprintf(record.portnum, sizeof record.portnum, "2121");
        std::snprintf(record.anonymous_chroot_share, sizeof record.anonymous_chroot_share, "photos");
        record.use_ext_ip = 1;
        record.enable_flow_ctrl = 1;
        record.maxuploadrate = 1500;
        record.maxdownloadrate = 2500;
        record.anonymous = 1;
        record.anonymous_chroot = 1;
        record.passive_port_min = 50000;
        record.passive_port_max = 50100;
        record.service_flags = VELT_FTP_SERVICE_PLAIN | VELT_FTP_SERVICE_TLS;
        record.support_utf8 = 1;
        record.max_conn_per_ip = 7;
        record.reserved = 0x12345678;
        record.enable_fxp = 1;
        record.user_chroot = 1;
        return record;
    }

    static void expectRoundTrip(const _tag_VELT_FTP_CONF_& record) {
        store(record);
        const auto read = ftpRecord();
        EXPECT_EQ(std::memcmp(&read, &record, sizeof read), 0);
    }
};

TEST_F(FtpSettingsContract, TheWholeRecordIsFilledBeforeTheFirstStore) {
    const auto record = ftpRecord();
    EXPECT_NE(std::memchr(record.portnum, '\0', sizeof record.portnum), nullptr);
    EXPECT_NE(std::memchr(record.anonymous_chroot_share, '\0', sizeof record.anonymous_chroot_share),
              nullptr);
    EXPECT_EQ(record.service_flags, 0) << "no service runs before anybody wanted it";
    EXPECT_EQ(std::memchr(&record.use_ext_ip, '?', sizeof record - offsetof(_tag_VELT_FTP_CONF_, use_ext_ip)),
              nullptr);
}

TEST_F(FtpSettingsContract, TheRecordComesBackByteForByte) {
    expectRoundTrip(fullRecord());
    auto record = fullRecord();
    record.reserved = -2;
    record.service_flags = VELT_FTP_SERVICE_PLAIN | 4 | 0x40000000;
    record.support_utf8 = 0;
    expectRoundTrip(record);
}

TEST_F(FtpSettingsContract, BytesBehindATextStay) {
    auto record = fullRecord();
    record.portnum[6] = 'x';
    record.anonymous_chroot_share[300] = '\xff';
    expectRoundTrip(record);
}

TEST_F(FtpSettingsContract, AShareNameFillsItsField) {
    auto record = fullRecord();
    record.anonymous_chroot = 0;
    std::memset(record.anonymous_chroot_share, 'n', sizeof record.anonymous_chroot_share - 1);
    expectRoundTrip(record);
}

TEST_F(FtpSettingsContract, EachSwitchIsSetAndRead) {
    for (const int wanted : {1, 0, 1}) {
        const bool isOn = wanted != 0;
        EXPECT_GE(VELTFTPUseUTF8Set(wanted), 0) << lastError();
        EXPECT_EQ(VELTFTPUseUTF8Get() != 0, isOn);
        EXPECT_GE(VELTFTPFIPSEnabledSet(wanted), 0) << lastError();
        EXPECT_EQ(VELTFTPFIPSEnabledGet() > 0, isOn);
        EXPECT_GE(VELTFTPFIPSEnabledGet(), 0) << lastError();
        EXPECT_GE(VELTFTPASCIIEnabledSet(wanted), 0) << lastError();
        EXPECT_EQ(VELTFTPASCIIEnabledGet() != 0, isOn);
        EXPECT_GE(VELTFTPUmaskEnabledSet(isOn), 0) << lastError();
        EXPECT_EQ(VELTFTPUmaskEnabledGet() != 0, isOn);
    }
}

TEST_F(FtpSettingsContract, ASwitchLeavesTheOthersAlone) {
    ASSERT_GE(VELTFTPUseUTF8Set(0), 0);
    ASSERT_GE(VELTFTPFIPSEnabledSet(1), 0);
    ASSERT_GE(VELTFTPASCIIEnabledSet(0), 0);
    ASSERT_GE(VELTFTPUmaskEnabledSet(true), 0);
    ASSERT_GE(VELTFTPTimeOutSet(120), 0);
    store(fullRecord());
    EXPECT_EQ(VELTFTPUseUTF8Get(), 0);
    EXPECT_GT(VELTFTPFIPSEnabledGet(), 0);
    EXPECT_EQ(VELTFTPASCIIEnabledGet(), 0);
    EXPECT_NE(VELTFTPUmaskEnabledGet(), 0);
    EXPECT_EQ(VELTFTPTimeOutGet(), 120);
}

TEST_F(FtpSettingsContract, TheTimeOutIsPassedOnAsItIs) {
    for (const int timeout : {60, 1, 3600}) {
        ASSERT_GE(VELTFTPTimeOutSet(timeout), 0) << lastError();
        EXPECT_EQ(VELTFTPTimeOutGet(), timeout);
    }
}

TEST_F(FtpSettingsContract, TheDefaultPassiveRangeStaysWhateverTheCustomOne) {
    for (const bool custom : {false, true}) {
        if (custom) {
            store(fullRecord());
        }
        VELT_FTP_PORT_RANGE range{-1, -1};
        ASSERT_GE(VELTFTPDefaultPassivePortGet(&range), 0);
        EXPECT_EQ(range.first, 55536);
        EXPECT_EQ(range.last, 55899);
    }
}

} // namespace
} // namespace contract
