#include "ftp/ftp_library.h"
#include "platform/core.h"
#include "tests/standalone/settings/settings_fixture.h"

#include <array>
#include <cstring>
#include <vector>

namespace velt {
namespace {

class FtpContract : public test::SettingsTest {
protected:
    static _tag_VELT_FTP_CONF_ record() {
        _tag_VELT_FTP_CONF_ read;
        std::memset(&read, '?', sizeof(read));
        EXPECT_GE(VELTFTPConfGet(&read), 0) << lastErrorSentence();
        return read;
    }
    static void switchOn() {
        auto conf = record();
        conf.service_flags = VELT_FTP_SERVICE_PLAIN;
        ASSERT_GE(VELTFTPConfSet(conf), 0) << lastErrorSentence();
        test::fakeCandidate().ftp.clear();
    }
    static std::string externalAddress() {
        std::array<char, 16> buffer{};
        const int result = VLIBCFileGetKeyValue("/etc/veltinfo.conf", "ftp_ext_ip", buffer.data(), 16, 0);
        return result > 0 ? buffer.data() : "(absent)";
    }
};

TEST_F(FtpContract, HasDefaultsBeforeTheFirstStore) {
    const auto read = record();
    EXPECT_STREQ(read.portnum, "21");
    EXPECT_EQ(read.service_flags, 0);
    EXPECT_EQ(read.support_utf8, 1);
    EXPECT_EQ(read.passive_port_min, 0);
    EXPECT_EQ(VELTFTPTimeOutGet(), 300);
    EXPECT_EQ(VELTFTPUseUTF8Get(), 1);
    EXPECT_EQ(VELTFTPFIPSEnabledGet(), 0);
    EXPECT_EQ(VELTFTPASCIIEnabledGet(), 0);
    EXPECT_EQ(VELTFTPUmaskEnabledGet(), 1);
    EXPECT_EQ(externalAddress(), "(absent)");
    VELT_FTP_PORT_RANGE range{};
    EXPECT_GE(VELTFTPDefaultPassivePortGet(&range), 0);
    EXPECT_EQ(range.first, 55536);
    EXPECT_EQ(range.last, 55899);
    EXPECT_FALSE(std::filesystem::exists(place("/etc"))) << "reading writes nothing";
}

TEST_F(FtpContract, ARecordStoredAndReadIsTheSame) {
    _tag_VELT_FTP_CONF_ stored;
    std::memset(&stored, 0x5a, sizeof(stored));
    std::memcpy(stored.portnum, "2121\0x\xff", 8);
    stored.anonymous_chroot_share[3] = '\0';
    stored.passive_port_min = 3000;
    stored.passive_port_max = 4000;
    stored.service_flags = -4;
    stored.max_conn_per_ip = -9;
    stored.user_chroot = 5;

    ASSERT_GE(VELTFTPConfSet(stored), 0) << lastErrorSentence();
    const auto read = record();
    EXPECT_EQ(std::memcmp(&read, &stored, sizeof(read)), 0);
}

TEST_F(FtpContract, EachSettingIsStoredAlone) {
    EXPECT_GE(VELTFTPTimeOutSet(60), 0);
    EXPECT_GE(VELTFTPUseUTF8Set(0), 0);
    EXPECT_GE(VELTFTPFIPSEnabledSet(1), 0);
    EXPECT_GE(VELTFTPASCIIEnabledSet(1), 0);
    EXPECT_GE(VELTFTPUmaskEnabledSet(false), 0);
    EXPECT_EQ(VELTFTPTimeOutGet(), 60);
    EXPECT_EQ(VELTFTPUseUTF8Get(), 0);
    EXPECT_EQ(VELTFTPFIPSEnabledGet(), 1);
    EXPECT_EQ(VELTFTPASCIIEnabledGet(), 1);
    EXPECT_EQ(VELTFTPUmaskEnabledGet(), 0);

    auto conf = record();
    conf.enable_fxp = 1;
    EXPECT_GE(VELTFTPConfSet(conf), 0);
    EXPECT_EQ(VELTFTPTimeOutGet(), 60) << "the record leaves the others alone";
    EXPECT_EQ(record().enable_fxp, 1);
}

TEST_F(FtpContract, ARefusedRecordLeavesTheStoredOne) {
    auto conf = record();
    conf.service_flags = VELT_FTP_SERVICE_PLAIN;
    conf.enable_fxp = 1;
    ASSERT_GE(VELTFTPConfSet(conf), 0);
    const std::string before = root_.read("etc/velt/ftp.conf");

    std::strcpy(conf.portnum, "70000");
    EXPECT_LT(VELTFTPConfSet(conf), 0);
    EXPECT_EQ(VLIBCErrGet(), 0x0100);
    EXPECT_LT(VELTFTPTimeOutSet(-1), 0);
    EXPECT_EQ(lastErrorSentence(), "The FTP setting timeout is -1; expected a number from 0 to 86400.");
    EXPECT_EQ(root_.read("etc/velt/ftp.conf"), before);
    EXPECT_EQ(test::fakeCandidate().ftp.size(), 1U) << "the daemon is not asked about what is refused here";
}

TEST_F(FtpContract, TheDaemonIsAskedAboutWhatWouldBeStored) {
    switchOn();
    ASSERT_GE(VLIBCINFOSetKeyValue("ftp_ext_ip", "203.0.113.7"), 0) << lastErrorSentence();
    ASSERT_GE(VELTFTPTimeOutSet(60), 0);
    auto conf = record();
    conf.enable_fxp = 1;
    ASSERT_GE(VELTFTPConfSet(conf), 0);

    ASSERT_EQ(test::fakeCandidate().ftp.size(), 3U);
    EXPECT_EQ(test::fakeCandidate().ftp[0].externalAddress, "203.0.113.7");
    const FtpSettings& asked = test::fakeCandidate().ftp[2];
    EXPECT_EQ(asked.timeout, 60);
    EXPECT_EQ(asked.record.enable_fxp, 1);
    EXPECT_EQ(asked.externalAddress, "203.0.113.7");
}

TEST_F(FtpContract, ABlankTakesTheExternalAddressAway) {
    ASSERT_GE(VLIBCINFOSetKeyValue("ftp_ext_ip", "203.0.113.7"), 0) << lastErrorSentence();
    ASSERT_GE(VLIBCINFOSetKeyValue("ftp_ext_ip", " "), 0) << lastErrorSentence();
    EXPECT_EQ(externalAddress(), "");
    ASSERT_GE(VLIBCINFOSetKeyValue("ftp_ext_ip", ""), 0) << lastErrorSentence();
    EXPECT_EQ(externalAddress(), "");
    EXPECT_LT(VLIBCINFOSetKeyValue("ftp_ext_ip", " 203.0.113.7"), 0);
}

TEST_F(FtpContract, WhatTheDaemonRefusesIsNotStored) {
    switchOn();
    const std::string before = root_.read("etc/velt/ftp.conf");
    test::fakeCandidate().refuses = true;
    EXPECT_LT(VELTFTPConfSet(record()), 0);
    EXPECT_LT(VELTFTPTimeOutSet(1), 0);
    EXPECT_LT(VELTFTPUseUTF8Set(0), 0);
    EXPECT_LT(VELTFTPFIPSEnabledSet(1), 0);
    EXPECT_LT(VELTFTPASCIIEnabledSet(1), 0);
    EXPECT_LT(VELTFTPUmaskEnabledSet(false), 0);
    EXPECT_LT(VLIBCINFOSetKeyValue("ftp_ext_ip", "203.0.113.7"), 0);
    EXPECT_EQ(lastErrorSentence(), "The daemon does not take it.");
    EXPECT_EQ(root_.read("etc/velt/ftp.conf"), before);
    EXPECT_FALSE(std::filesystem::exists(place("/etc/veltinfo.conf")));
}

TEST_F(FtpContract, ADaemonThatRefusesEverythingCanBeSwitchedOffButNotOn) {
    switchOn();
    test::fakeCandidate().refuses = true;
    auto conf = record();
    conf.service_flags = 0;
    EXPECT_GE(VELTFTPConfSet(conf), 0) << lastErrorSentence();
    EXPECT_GE(VELTFTPTimeOutSet(60), 0) << lastErrorSentence();
    EXPECT_GE(VELTFTPFIPSEnabledSet(1), 0) << lastErrorSentence();
    EXPECT_GE(VLIBCINFOSetKeyValue("ftp_ext_ip", "203.0.113.7"), 0) << lastErrorSentence();
    EXPECT_LT(VELTFTPTimeOutSet(-1), 0) << "numbers are checked all the same";
    for (const int flags : {VELT_FTP_SERVICE_PLAIN, VELT_FTP_SERVICE_TLS}) {
        conf.service_flags = flags;
        EXPECT_LT(VELTFTPConfSet(conf), 0);
    }
    EXPECT_EQ(record().service_flags, 0);
}

TEST_F(FtpContract, AnyShareNameIsStoredAsItIs) {
    for (const char* name : {"a\nport = \"1\"", "a\rb", "\"", "\\", "%{env:HOME}", "../../etc", "-rf",
                             "\xff\xfe", "\xc0\x8a", " blanks ", "# x", "名"}) {
        auto conf = record();
        std::memset(conf.anonymous_chroot_share, 0, sizeof(conf.anonymous_chroot_share));
        std::strcpy(conf.anonymous_chroot_share, name);
        ASSERT_GE(VELTFTPConfSet(conf), 0) << lastErrorSentence();
        EXPECT_STREQ(record().anonymous_chroot_share, name);
        EXPECT_STREQ(record().portnum, "21");
    }
    auto conf = record();
    std::memset(conf.anonymous_chroot_share, '\n', 491);
    conf.anonymous_chroot_share[491] = '\0';
    ASSERT_GE(VELTFTPConfSet(conf), 0) << lastErrorSentence();
    EXPECT_EQ(std::string(record().anonymous_chroot_share), std::string(491, '\n'));
}

TEST_F(FtpContract, TheExternalAddressIsCheckedAndSharesItsFile) {
    root_.write("etc/veltinfo.conf", "# of this server\nunique=\"x\"\nftp_ext_ip=\nother = 1\n");
    ASSERT_GE(VLIBCINFOSetKeyValue("ftp_ext_ip", "203.0.113.7"), 0) << lastErrorSentence();
    EXPECT_EQ(externalAddress(), "203.0.113.7");
    for (const char* bad : {"eth0", "1.2.3.4\nx=1", "999.1.1.1", "%{env:HOME}", "1.2.3.4 ", "-1.2.3.4",
                            "\xff", "127.0.0.1", "224.0.0.1"})
        EXPECT_LT(VLIBCINFOSetKeyValue("ftp_ext_ip", bad), 0) << bad;
    EXPECT_EQ(root_.read("etc/veltinfo.conf"),
              "# of this server\nunique=\"x\"\nftp_ext_ip=203.0.113.7\nother = 1\n");
    ASSERT_GE(VLIBCINFOSetKeyValue("ftp_ext_ip", ""), 0);
    EXPECT_EQ(externalAddress(), "");
}

TEST_F(FtpContract, OtherKeysOfTheSystemInformationAreFree) {
    ASSERT_GE(VLIBCINFOSetKeyValue("model", "any text"), 0);
    EXPECT_EQ(root_.read("etc/veltinfo.conf"), "model=any text\n");
    EXPECT_LT(VLIBCINFOSetKeyValue("model", "a\nftp_ext_ip=eth0"), 0);
    EXPECT_LT(VLIBCINFOSetKeyValue("ftp_ext_ip=eth0\nx", "y"), 0);
    EXPECT_LT(VLIBCINFOSetKeyValue(" ftp_ext_ip", "eth0"), 0);
    EXPECT_LT(VLIBCINFOSetKeyValue(nullptr, "y"), 0);
    EXPECT_LT(VLIBCINFOSetKeyValue("model", nullptr), 0);
    EXPECT_EQ(root_.read("etc/veltinfo.conf"), "model=any text\n");
}

TEST_F(FtpContract, EachStoreIsOneNamedEffect) {
    std::vector<std::string> effects;
    setEffectHook([&](Effect effect, std::string_view subject) {
        effects.push_back(std::string(effectName(effect)) + " " + std::string(subject));
        return EffectDecision(Result<>());
    });
    EXPECT_EQ(VELTFTPTimeOutSet(1), 0);
    EXPECT_EQ(VELTFTPConfSet(record()), 0);
    EXPECT_EQ(VLIBCINFOSetKeyValue("ftp_ext_ip", "203.0.113.7"), 0);
    EXPECT_EQ(VLIBCINFOSetKeyValue("model", "x"), 0);

    EXPECT_EQ(effects, (std::vector<std::string>{"store ftp settings", "store ftp settings",
                                                 "store external address", "store system information"}));
    EXPECT_FALSE(std::filesystem::exists(place("/etc")));
}

TEST_F(FtpContract, ADamagedFileFailsEveryOperationAndIsNotOverwritten) {
    root_.write("etc/velt/ftp.conf", "version = 1\nport = oops\n");
    _tag_VELT_FTP_CONF_ conf{};
    EXPECT_LT(VELTFTPConfGet(&conf), 0);
    EXPECT_EQ(VLIBCErrGet(), 0x0301);
    EXPECT_EQ(lastErrorSentence(),
              "Cannot read " + place("/etc/velt/ftp.conf") + ": missing key \"service_flags\".");
    EXPECT_LT(VELTFTPTimeOutGet(), 0);
    EXPECT_LT(VELTFTPUseUTF8Get(), 0);
    EXPECT_LT(VELTFTPFIPSEnabledGet(), 0);
    EXPECT_LT(VELTFTPASCIIEnabledGet(), 0);
    EXPECT_LT(VELTFTPUmaskEnabledGet(), 0);
    std::strcpy(conf.portnum, "21");
    EXPECT_LT(VELTFTPConfSet(conf), 0);
    EXPECT_LT(VELTFTPTimeOutSet(1), 0);
    EXPECT_LT(VLIBCINFOSetKeyValue("ftp_ext_ip", "203.0.113.7"), 0);
    EXPECT_EQ(root_.read("etc/velt/ftp.conf"), "version = 1\nport = oops\n");
}

TEST_F(FtpContract, WithoutAPlaceForTheAnswerItFails) {
    EXPECT_LT(VELTFTPConfGet(nullptr), 0);
    EXPECT_LT(VELTFTPDefaultPassivePortGet(nullptr), 0);
    EXPECT_EQ(lastErrorSentence(), "A record for the default passive range is required.");
}

} // namespace
} // namespace velt
