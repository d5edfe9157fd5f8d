#include "standalone/daemons/daemon_configuration.h"
#include "tests/standalone/daemons/proftpd/example.h"

#include <gtest/gtest.h>

namespace velt::test {
namespace {

const std::string attempts[] = {
    "1.2.3.4\nServerIdent on PWNED",
    "1.2.3.4 ServerIdent",
    "\"\nAllowOverwrite off",
    "%{env:PATH}",
    "%u",
    "../../etc",
    "-x",
    "eth0",
    "localhost",
    "999.1.1.1",
    "1.2.3",
    "::1",
    "\xff\xfe",
    std::string("1.2.3.4\0x", 9),
    std::string(5000, 'a') + "\nServerIdent on PWNED",
};

TEST(Injection, externalAddressThatIsNoneLeavesNoTrace) {
    FtpSettings settings = plainSettings();
    settings.record.use_ext_ip = 1;
    const std::string expected = renderProftpd(settings, places());
    for (const auto& text : attempts) {
        settings.externalAddress = text;
        EXPECT_EQ(renderProftpd(settings, places()), expected) << testing::PrintToString(text);
    }
}

TEST(Injection, nameOfTheAnonymousShareLeavesNoTrace) {
    FtpSettings settings = plainSettings();
    settings.record.anonymous = settings.record.anonymous_chroot = 1;
    const std::string expected = renderProftpd(settings, places());
    for (const auto& text : attempts) {
        std::snprintf(settings.record.anonymous_chroot_share, sizeof settings.record.anonymous_chroot_share,
                      "%s", text.c_str());
        EXPECT_EQ(renderProftpd(settings, places()), expected) << testing::PrintToString(text);
    }
}

TEST(Injection, portIsWrittenAsANumber) {
    FtpSettings settings = plainSettings();
    std::strcpy(settings.record.portnum, "21\nX y");
    // No port at all; the check of the settings does not let such a record come here.
    std::string expected = renderProftpd(plainSettings(), places());
    expected.replace(expected.find("\nPort 21\n"), 9, "\nPort 0\n");
    EXPECT_EQ(renderProftpd(settings, places()), expected);
}

TEST(Injection, noLineOfTheConfigurationReachesTheDaemonsLimit) {
    ProftpdPlaces here = places();
    const std::filesystem::path deep = '/' + std::string(900, 'd');
    here.loginProgram = deep / "program";
    here.stateRoot = deep;
    here.loginRoot = deep / "root";
    here.anonymousShare = deep / "anonymous";
    FtpSettings settings = plainSettings();
    settings.record.user_chroot = 0;
    settings.record.anonymous = 1;
    settings.record.anonymous_chroot = 1;
    const std::string text = renderProftpd(settings, here);
    for (std::size_t start = 0; start < text.size(); start = text.find('\n', start) + 1) {
        EXPECT_LT(text.find('\n', start) - start, 4000U);
    }
}

TEST(Injection, placesWithMeaningfulCharactersAreRefused) {
    EXPECT_TRUE(isRenderable("/srv/a b/ä#'$<>;~"));
    for (const char* path : {"relative", "", "/a\"b", "/a\\b", "/a\nb", "/a%ub", "/a*b", "/a\tb", "/a\x7f"}) {
        EXPECT_FALSE(isRenderable(path)) << path;
    }
    EXPECT_FALSE(isRenderable('/' + std::string(1024, 'x')));
}

} // namespace
} // namespace velt::test
