// Which changes of the FTP settings end sessions.
#include "standalone/daemons/proftpd/session_rights.h"
#include "standalone/settings/lost_rights.h"

#include "tests/support/result.h"
#include "tests/support/temporary_folder.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <fstream>
#include <functional>
#include <string>

namespace velt::test {
namespace {

constexpr int plain = VELT_FTP_SERVICE_PLAIN;
constexpr int tls = VELT_FTP_SERVICE_TLS;

/// Both services, users confined to their homes, and anonymous users to a share: what most changes act upon.
FtpSettings before() {
    FtpSettings settings = defaultFtpSettings();
    settings.record.service_flags = plain | tls;
    settings.record.user_chroot = 1;
    settings.record.enable_fxp = 1;
    settings.record.anonymous = 1;
    settings.record.anonymous_chroot = 1;
    std::snprintf(settings.record.anonymous_chroot_share, sizeof settings.record.anonymous_chroot_share,
                  "public");
    settings.umask = true;
    settings.fipsOnly = false;
    return settings;
}

struct Case {
    const char* name;
    bool takes;
    std::function<void(FtpSettings& former, FtpSettings& next)> change;
};

void setShare(FtpSettings& settings, const char* name) {
    std::snprintf(settings.record.anonymous_chroot_share, sizeof settings.record.anonymous_chroot_share, "%s",
                  name);
}

const Case cases[] = {
    {"nothing", false, [](auto&, auto&) {}},
    {"ftpOff", true, [](auto&, auto& next) { next.record.service_flags = tls; }},
    {"ftpsOff", true, [](auto&, auto& next) { next.record.service_flags = plain; }},
    {"bothOff", true, [](auto&, auto& next) { next.record.service_flags = 0; }},
    {"ftpsOn", false, [](auto& former, auto&) { former.record.service_flags = plain; }},
    {"ftpOn", false, [](auto& former, auto&) { former.record.service_flags = tls; }},
    {"anonymousOff", true, [](auto&, auto& next) { next.record.anonymous = 0; }},
    {"anonymousOn", false, [](auto& former, auto&) { former.record.anonymous = 0; }},
    {"anonymousConfined", true, [](auto& former, auto&) { former.record.anonymous_chroot = 0; }},
    {"anonymousNotConfined", true, [](auto&, auto& next) { next.record.anonymous_chroot = 0; }},
    {"anotherShareForAnonymous", true, [](auto&, auto& next) { setShare(next, "other"); }},
    {"anotherShareForNobody", false,
     [](auto& former, auto& next) {
         former.record.anonymous = next.record.anonymous = 0;
         setShare(next, "other");
         next.record.anonymous_chroot = 0;
     }},
    {"anotherShareThatDoesNotCount", false,
     [](auto& former, auto& next) {
         former.record.anonymous_chroot = next.record.anonymous_chroot = 0;
         setShare(next, "other");
     }},
    {"usersConfined", true, [](auto& former, auto&) { former.record.user_chroot = 0; }},
    {"usersNotConfined", true, [](auto&, auto& next) { next.record.user_chroot = 0; }},
    {"umaskOff", true, [](auto&, auto& next) { next.umask = false; }},
    {"umaskOn", true, [](auto& former, auto&) { former.umask = false; }},
    {"fipsOn", true, [](auto&, auto& next) { next.fipsOnly = true; }},
    {"fipsOff", false, [](auto& former, auto&) { former.fipsOnly = true; }},
    {"fipsOnWithoutEncryption", false,
     [](auto& former, auto& next) {
         former.record.service_flags = next.record.service_flags = plain;
         next.fipsOnly = true;
     }},
    {"transfersBetweenServersOff", true, [](auto&, auto& next) { next.record.enable_fxp = 0; }},
    {"transfersBetweenServersOn", false, [](auto& former, auto&) { former.record.enable_fxp = 0; }},
    {"port", false, [](auto&, auto& next) { std::snprintf(next.record.portnum, 8, "2199"); }},
    {"passiveRange", false,
     [](auto&, auto& next) {
         next.record.passive_port_min = 50000;
         next.record.passive_port_max = 50100;
     }},
    {"rates", false,
     [](auto&, auto& next) {
         next.record.enable_flow_ctrl = 1;
         next.record.maxuploadrate = next.record.maxdownloadrate = 1;
     }},
    {"connections", false, [](auto&, auto& next) { next.record.max_conn_per_ip = 1; }},
    {"timeout", false, [](auto&, auto& next) { next.timeout = 7; }},
    {"externalAddress", false,
     [](auto&, auto& next) {
         next.record.use_ext_ip = 1;
         next.externalAddress = "192.0.2.1";
     }},
    {"names", false,
     [](auto&, auto& next) {
         next.useUtf8 = !next.useUtf8;
         next.record.support_utf8 = next.record.support_utf8 == 0 ? 1 : 0;
     }},
    {"ascii", false, [](auto&, auto& next) { next.ascii = !next.ascii; }},
};

class SessionRights : public testing::TestWithParam<Case> {};

TEST_P(SessionRights, areTakenOrNot) {
    FtpSettings former = before();
    FtpSettings next = before();
    GetParam().change(former, next);
    EXPECT_EQ(takesRights(former, next), GetParam().takes);
}

INSTANTIATE_TEST_SUITE_P(Changes, SessionRights, testing::ValuesIn(cases),
                         [](const auto& row) { return row.param.name; });

TEST(PlanSettings, areComparedAsTheyWereStored) {
    const TemporaryFolder folder;
    FtpSettings next = before();
    next.record.max_conn_per_ip = 4;
    FtpSettings stricter = before();
    stricter.record.anonymous = 0;
    const auto plan = [&](const char* name, const FtpSettings& settings) {
        EXPECT_EQ(messageOf(storePlanSettings(folder.path() / name, settings)), "");
        return folder.path() / name;
    };
    const auto one = plan("one", before());
    EXPECT_FALSE(takesFtpRights(one, plan("two", next)));
    EXPECT_TRUE(takesFtpRights(one, plan("three", stricter)));
    EXPECT_FALSE(takesFtpRights(plan("three", stricter), one));
}

TEST(PlanSettings, ofAnotherVersionOrNoneCountAsRightsThatAreTaken) {
    const TemporaryFolder folder;
    ASSERT_EQ(messageOf(storePlanSettings(folder.path() / "one", before())), "");
    EXPECT_TRUE(takesFtpRights(folder.path() / "none", folder.path() / "one"));
    std::filesystem::create_directory(folder.path() / "damaged");
    std::ofstream(folder.path() / "damaged/settings") << "version = 1\nnonsense\n";
    EXPECT_TRUE(takesFtpRights(folder.path() / "damaged", folder.path() / "one"));
}

} // namespace
} // namespace velt::test
