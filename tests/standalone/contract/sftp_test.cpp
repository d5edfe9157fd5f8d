#include "platform/core.h"
#include "platform/sftp.h"
#include "tests/standalone/settings/settings_fixture.h"

#include <cstring>

namespace velt {
namespace {

class SftpContract : public test::SettingsTest {};

TEST_F(SftpContract, FillsTheWholeRecord) {
    _tag_VELT_SFTP_CONFIG_ conf;
    std::memset(&conf, '?', sizeof(conf));
    ASSERT_GE(VELTSFTPConfigGet(1, &conf), 0);
    const _tag_VELT_SFTP_CONFIG_ expected{0, {}, 22, {}};
    EXPECT_EQ(std::memcmp(&conf, &expected, sizeof(conf)), 0);
}

TEST_F(SftpContract, StoresFlagAndPort) {
    ASSERT_GE(VELTSFTPConfigSet(1, 2222), 0) << lastErrorSentence();
    _tag_VELT_SFTP_CONFIG_ conf{};
    ASSERT_GE(VELTSFTPConfigGet(1, &conf), 0);
    EXPECT_EQ(conf.enable, 1);
    EXPECT_EQ(conf.port, 2222);
    ASSERT_EQ(test::fakeCandidate().sftp.size(), 1U);
    EXPECT_EQ(test::fakeCandidate().sftp[0].port, 2222);
}

TEST_F(SftpContract, RefusesWhatSshdWouldRefuse) {
    for (const int port : {-1, 0, 65536})
        EXPECT_LT(VELTSFTPConfigSet(1, port), 0);
    EXPECT_EQ(lastErrorSentence(), "The SFTP setting portnum is 65536; expected a number from 1 to 65535.");
    test::fakeCandidate().refuses = true;
    EXPECT_LT(VELTSFTPConfigSet(1, 22), 0);
    EXPECT_EQ(lastErrorSentence(), "The daemon does not take it.");
    EXPECT_FALSE(std::filesystem::exists(place("/etc")));
}

TEST_F(SftpContract, ADaemonThatRefusesEverythingCanBeSwitchedOff) {
    ASSERT_GE(VELTSFTPConfigSet(1, 2222), 0);
    test::fakeCandidate().refuses = true;
    EXPECT_GE(VELTSFTPConfigSet(0, 2222), 0) << lastErrorSentence();
    EXPECT_LT(VELTSFTPConfigSet(0, 65536), 0) << "numbers are checked all the same";
    EXPECT_LT(VELTSFTPConfigSet(1, 2222), 0);
    _tag_VELT_SFTP_CONFIG_ conf{};
    ASSERT_GE(VELTSFTPConfigGet(1, &conf), 0);
    EXPECT_EQ(conf.enable, 0);
}

TEST_F(SftpContract, KnowsOneRecordOnly) {
    _tag_VELT_SFTP_CONFIG_ conf{};
    EXPECT_LT(VELTSFTPConfigGet(0, &conf), 0);
    EXPECT_LT(VELTSFTPConfigGet(2, &conf), 0);
    EXPECT_LT(VELTSFTPConfigGet(1, nullptr), 0);
    EXPECT_EQ(VLIBCErrGet(), 0x0100);
}

TEST_F(SftpContract, ADamagedFileIsNamedAndKept) {
    root_.write("etc/velt/sftp.conf", "version = 1\nenabled = 1\nport = 22a\n");
    _tag_VELT_SFTP_CONFIG_ conf{};
    EXPECT_LT(VELTSFTPConfigGet(1, &conf), 0);
    EXPECT_EQ(lastErrorSentence(), "Cannot read " + place("/etc/velt/sftp.conf") +
                                       ", line 3: port: expected a number from 1 to 65535.");
    EXPECT_LT(VELTSFTPConfigSet(1, 22), 0);
    EXPECT_EQ(root_.read("etc/velt/sftp.conf"), "version = 1\nenabled = 1\nport = 22a\n");
}

} // namespace
} // namespace velt
