#include "standalone/core/effects.h"
#include "standalone/core/scratch_folder.h"
#include "standalone/core/state_root.h"
#include "standalone/daemons/proftpd/proftpd_plan.h"
#include "standalone/process/last_words.h"
#include "standalone/standalone.h"
#include "tests/standalone/daemons/proftpd/example.h"
#include "tests/support/result.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <filesystem>

namespace velt::test {
namespace {

class FtpCandidate : public testing::Test {
protected:
    void SetUp() override {
        if (!std::filesystem::exists("/usr/sbin/proftpd")) {
            GTEST_SKIP() << "ProFTPD is not installed";
        }
        setenv("VELT_LIBEXEC_DIR", VELT_BUILT_FOLDER, 1);
        setStateRoot(root_.path());
    }
    void TearDown() override { setStateRoot("/"); }

    TemporaryFolder root_;
};

TEST_F(FtpCandidate, isTakenWithAllServicesOn) {
    FtpSettings settings = plainSettings();
    settings.record.service_flags = VELT_FTP_SERVICE_PLAIN | VELT_FTP_SERVICE_TLS;
    EXPECT_EQ(messageOf(testFtpCandidate(settings)), "");
}

TEST_F(FtpCandidate, leavesNothingOfTheTestBehind) {
    ASSERT_EQ(messageOf(testFtpCandidate(plainSettings())), "");
    EXPECT_TRUE(std::filesystem::is_empty(root_.path() / "run/velt"));
}

TEST_F(FtpCandidate, isTestedWithAThrowAwayCertificateWhereNothingMayBeStored) {
    setEffectHook([](Effect, std::string_view) { return EffectDecision(Result<>()); });
    FtpSettings settings = plainSettings();
    settings.record.service_flags = VELT_FTP_SERVICE_TLS;
    EXPECT_EQ(messageOf(testFtpCandidate(settings)), "");
    setEffectHook({});
    EXPECT_FALSE(std::filesystem::exists(root_.path() / "var/lib/velt/tls"));
    EXPECT_TRUE(std::filesystem::is_empty(root_.path() / "run/velt"));
}

TEST_F(FtpCandidate, isRefusedInTheDaemonsOwnWords) {
    FtpSettings settings = plainSettings();
    settings.timeout = -1;
    const std::string refusal = messageOf(testFtpCandidate(settings));
    EXPECT_TRUE(refusal.starts_with("The FTP daemon refuses its configuration: TimeoutIdle: ")) << refusal;
}

TEST_F(FtpCandidate, isRefusedForACertificateThatIsNone) {
    root_.write("etc/velt/tls/server.crt", "nonsense");
    root_.write("etc/velt/tls/server.key", "nonsense");
    FtpSettings settings = plainSettings();
    EXPECT_EQ(messageOf(testFtpCandidate(settings)), "") << "without FTPS nobody asks for it";
    settings.record.service_flags = VELT_FTP_SERVICE_TLS;
    const std::string refusal = messageOf(testFtpCandidate(settings));
    EXPECT_NE(refusal.find("server.crt does not contain a PEM certificate"), std::string::npos) << refusal;
}

TEST_F(FtpCandidate, isRefusedBelowARootThatTheConfigurationCannotName) {
    setStateRoot(root_.path() / "100%u");
    const std::string refusal = messageOf(testFtpCandidate(plainSettings()));
    EXPECT_NE(refusal.find("its path may not contain"), std::string::npos) << refusal;
}

TEST_F(FtpCandidate, whatAKilledProcessLeftIsSweptAndWhatIsInUseStays) {
    root_.write("run/velt/test.Killed/key", "private");
    root_.write("run/velt/ftp/proftpd.conf", "in use");
    const auto used = ScratchFolder::make();
    ASSERT_EQ(messageOf(used), "");
    ASSERT_EQ(messageOf(openState(root_.path())), "");
    EXPECT_FALSE(std::filesystem::exists(root_.path() / "run/velt/test.Killed"));
    EXPECT_TRUE(std::filesystem::exists(used->path()));
    EXPECT_EQ(root_.read("run/velt/ftp/proftpd.conf"), "in use");
}

TEST(LastWords, areWhatExplainsTheFailure) {
    EXPECT_EQ(lastWords("2026-01-31 12:00:00,123 host proftpd[42] host: fatal: Port: no on line 3 of 'x'\n"),
              "Port: no on line 3 of 'x'");
    EXPECT_EQ(lastWords("2026-01-31 12:00:00,123 host proftpd[42] ::: one\n"
                        "2026-01-31 12:00:00,123 host proftpd[42] host: mod_x: two.\n\n"),
              "mod_x: two");
    EXPECT_EQ(lastWords("/x line 1: Bad option\r\n"), "/x line 1: Bad option");
    EXPECT_EQ(lastWords("2026-01-31 12:00:00,123 host proftpd[42] ::: Failed binding to ::, port 21: in use\n"
                        "2026-01-31 12:00:00,123 host proftpd[42] ::: Check to see if inetd is running.\n"),
              "Failed binding to ::, port 21: in use");
    EXPECT_EQ(lastWords("Bind to port 22 on 0.0.0.0 failed: Address already in use.\r\n"
                        "Cannot bind any address.\r\n"),
              "Bind to port 22 on 0.0.0.0 failed: Address already in use");
    EXPECT_EQ(lastWords(""), "");
}

} // namespace
} // namespace velt::test
