// What is found about the certificate of FTPS.
#include "base/file.h"
#include "standalone/core/paths.h"
#include "standalone/daemons/tls/certificate.h"
#include "standalone/daemons/tls/self_signed.h"
#include "standalone/settings/settings_store.h"
#include "tests/standalone/health/health_test.h"
#include "tests/standalone/support/state_folder.h"
#include "tests/support/result.h"
#include "tests/support/run_program.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

namespace velt::test {
namespace {

using std::chrono::days;
using Clock = std::chrono::system_clock;

class CertificateHealth : public testing::Test {
protected:
    void SetUp() override { store(VELT_FTP_SERVICE_TLS); }

    static void store(int flags) {
        FtpSettings settings = defaultFtpSettings();
        settings.record.service_flags = flags;
        ASSERT_EQ(messageOf(storeFtpSettings(settings)), "");
    }

    /// Puts the administrator's certificate in place, and a key that belongs to it or to another one.
    void give(const SelfSigned& certificate, const SelfSigned& key) const {
        root_.write("etc/velt/tls/server.crt", certificate.certificate);
        const auto file = root_.write("etc/velt/tls/server.key", key.key);
        ::chmod(file.c_str(), 0600);
    }

    static SelfSigned made(const CertificateNames& names = {"files.example", {}}) {
        return *makeSelfSigned(names);
    }

    static Findings found(days later = days(0)) { return certificateFindings(Clock::now() + later); }

    StateFolder root_;
};

TEST_F(CertificateHealth, NothingIsWrongWithOneThatFits) {
    EXPECT_EQ(found(), Findings()) << "none yet: it is made when the service starts";
    const auto one = made();
    give(one, one);
    EXPECT_EQ(found(), Findings());
}

TEST_F(CertificateHealth, AKeyOfAnotherCertificateIsNamed) {
    give(made(), made());
    const std::string folder = (root_.path() / "etc/velt/tls/").string();
    EXPECT_EQ(found(),
              (Findings{{"certificate-key-mismatch", Severity::error, "ftp",
                         "The key " + folder + "server.key does not belong to the certificate " + folder +
                             "server.crt.",
                         "Put the key of this certificate in place, then run: veltctl restart ftp"}}));
    store(VELT_FTP_SERVICE_PLAIN);
    EXPECT_EQ(found(), Findings()) << "nobody needs it";
}

TEST_F(CertificateHealth, FilesThatAreNoCertificateOrKeyAreNamed) {
    const auto one = made();
    give(one, one);
    root_.write("etc/velt/tls/server.crt", "nonsense");
    EXPECT_EQ(summary(found()), "error certificate-unusable");
    EXPECT_NE(found()[0].sentence.find("does not contain a PEM certificate"), std::string::npos);
    give(one, one);
    ::chmod((root_.path() / "etc/velt/tls/server.key").c_str(), 0644);
    EXPECT_EQ(summary(found()), "error certificate-unusable");
    EXPECT_NE(found()[0].sentence.find("is open to other users"), std::string::npos);
}

TEST_F(CertificateHealth, ExpiryIsToldThreeWeeksAhead) {
    const auto one = made();
    give(one, one);
    constexpr days valid{3650};
    EXPECT_EQ(summary(found(valid - days(22))), "");
    EXPECT_EQ(summary(found(valid - days(20))), "warning certificate-expires");
    EXPECT_EQ(summary(found(valid - days(1))), "warning certificate-expires");
    EXPECT_EQ(summary(found(valid + days(1))), "error certificate-expired");
    EXPECT_EQ(found(valid + days(1))[0].mend, "Renew the certificate, then run: veltctl restart ftp");
    EXPECT_EQ(summary(found(days(-2))), "error certificate-not-yet-valid");
}

TEST_F(CertificateHealth, OneOfOurOwnIsMadeAgain) {
    ASSERT_TRUE(serverCertificate());
    EXPECT_EQ(found(), Findings());
    EXPECT_EQ(found(days(4000))[0].mend,
              "rm " + (root_.path() / "var/lib/velt/tls/server.crt").string() + " && veltctl restart ftp");
}

TEST_F(CertificateHealth, OneOfOurOwnThatCannotBeUsedIsMendedByARestart) {
    ASSERT_TRUE(serverCertificate());
    const std::string key = (root_.path() / "var/lib/velt/tls/server.key").string();
    ::chmod(key.c_str(), 0644);
    const std::string close = "chmod 640 " + key;
    EXPECT_EQ(found(), (Findings{{"certificate-unusable", Severity::error, "ftp",
                                  key + " is open to other users; mend it with: " + close + ".",
                                  close + " && veltctl restart ftp"}}));
    ::chmod(key.c_str(), 0600);
    root_.write("var/lib/velt/tls/server.crt", made().certificate);
    EXPECT_EQ(found(), (Findings{{"certificate-unusable", Severity::error, "ftp",
                                  key + " does not match the certificate.", "veltctl restart ftp"}}));
    ASSERT_TRUE(serverCertificate());
    EXPECT_EQ(found(), Findings());
}

TEST_F(CertificateHealth, NamesThatVerifyNothingAreTold) {
    const auto nameless = made({"not a name", {}});
    give(nameless, nameless);
    EXPECT_EQ(summary(found()), "warning certificate-without-names");
}

TEST_F(CertificateHealth, OneOfOurOwnForAnotherHostIsTold) {
    const auto other = made({"another.example", {}});
    root_.write("var/lib/velt/tls/server.crt", other.certificate);
    ::chmod(root_.write("var/lib/velt/tls/server.key", other.key).c_str(), 0600);
    EXPECT_EQ(summary(found()), "notice certificate-other-name");
}

} // namespace
} // namespace velt::test
