#include "tests/standalone/daemons/proftpd/example.h"
#include "tests/standalone/support/golden.h"

#include <functional>

namespace velt::test {
namespace {

struct Case {
    const char* name; ///< of the file in golden/
    std::function<void(FtpSettings&, ProftpdPlaces&)> change;
};

void PrintTo(const Case& example, std::ostream* out) {
    *out << example.name;
}

void enableTls(FtpSettings& settings) {
    settings.record.service_flags = VELT_FTP_SERVICE_TLS;
}

void enableAnonymous(FtpSettings& settings, bool confined) {
    settings.record.anonymous = 1;
    settings.record.anonymous_chroot = confined ? 1 : 0;
    std::strcpy(settings.record.anonymous_chroot_share, "public");
}

void everything(FtpSettings& settings, ProftpdPlaces& places) {
    auto& record = settings.record;
    record.service_flags = VELT_FTP_SERVICE_PLAIN | VELT_FTP_SERVICE_TLS;
    std::strcpy(record.portnum, "2121");
    record.passive_port_min = 30000;
    record.passive_port_max = 30099;
    record.use_ext_ip = 1;
    settings.externalAddress = "203.0.113.7";
    settings.timeout = 600;
    record.enable_flow_ctrl = 1;
    record.maxuploadrate = 500;
    record.maxdownloadrate = 1000;
    record.max_conn_per_ip = 4;
    record.enable_fxp = 1;
    settings.fipsOnly = true;
    settings.umask = false;
    settings.ascii = false;
    places.spared = {*parseIpNetwork("192.0.2.0/24"), *parseIpNetwork("2001:db8::1")};
    enableAnonymous(settings, true);
}

class GoldenRendering : public testing::TestWithParam<Case> {};

TEST_P(GoldenRendering, isAsRecorded) {
    FtpSettings settings = plainSettings();
    ProftpdPlaces here = places();
    GetParam().change(settings, here);
    expectGolden(std::string(GOLDEN_FOLDER "/") + GetParam().name + ".conf", renderProftpd(settings, here));
}

const Case cases[] = {
    {"plain", [](auto&, auto&) {}},
    {"tls", [](auto& s, auto&) { enableTls(s); }},
    {"tls_rsa",
     [](auto& s, auto& p) {
         enableTls(s);
         p.certificateIsRsa = true;
     }},
    {"plain_and_tls",
     [](auto& s, auto&) { s.record.service_flags = VELT_FTP_SERVICE_PLAIN | VELT_FTP_SERVICE_TLS; }},
    {"tls_fips",
     [](auto& s, auto&) {
         enableTls(s);
         s.fipsOnly = true;
     }},
    {"plain_fips", [](auto& s, auto&) { s.fipsOnly = true; }},
    {"passive_range",
     [](auto& s, auto&) {
         s.record.passive_port_min = 40000;
         s.record.passive_port_max = 40100;
     }},
    {"passive_range_half", [](auto& s, auto&) { s.record.passive_port_max = 40100; }},
    {"external_address",
     [](auto& s, auto&) {
         s.record.use_ext_ip = 1;
         s.externalAddress = "198.51.100.9";
     }},
    {"external_address_unused", [](auto& s, auto&) { s.externalAddress = "198.51.100.9"; }},
    {"external_address_empty", [](auto& s, auto&) { s.record.use_ext_ip = 1; }},
    {"timeout_never", [](auto& s, auto&) { s.timeout = 0; }},
    {"rates",
     [](auto& s, auto&) {
         s.record.enable_flow_ctrl = 1;
         s.record.maxuploadrate = 10;
         s.record.maxdownloadrate = 20;
     }},
    {"rates_download_only",
     [](auto& s, auto&) {
         s.record.enable_flow_ctrl = 1;
         s.record.maxdownloadrate = 20;
     }},
    {"rates_off",
     [](auto& s, auto&) {
         s.record.maxuploadrate = 10;
         s.record.maxdownloadrate = 20;
     }},
    {"connections", [](auto& s, auto&) { s.record.max_conn_per_ip = 2; }},
    {"fxp", [](auto& s, auto&) { s.record.enable_fxp = 1; }},
    {"utf8_unsupported", [](auto& s, auto&) { s.record.support_utf8 = 0; }},
    {"utf8_on_request", [](auto& s, auto&) { s.useUtf8 = false; }},
    {"ascii_off", [](auto& s, auto&) { s.ascii = false; }},
    {"umask_off", [](auto& s, auto&) { s.umask = false; }},
    {"users_unconfined", [](auto& s, auto&) { s.record.user_chroot = 0; }},
    {"anonymous_share", [](auto& s, auto&) { enableAnonymous(s, true); }},
    {"anonymous_all_shares", [](auto& s, auto&) { enableAnonymous(s, false); }},
    {"ipv4_only", [](auto&, auto& p) { p.ipv6 = false; }},
    {"loopback_only", [](auto&, auto& p) { p.loopbackOnly = true; }},
    {"account_files",
     [](auto& s, auto& p) {
         s.record.user_chroot = 0;
         p.user = p.group = "builder";
         p.accountFiles = AccountFiles{"/etc/velt/ftp.passwd", "/etc/velt/ftp.group"};
     }},
    {"everything", everything},
};

INSTANTIATE_TEST_SUITE_P(Settings, GoldenRendering, testing::ValuesIn(cases),
                         [](const auto& information) { return std::string(information.param.name); });

} // namespace
} // namespace velt::test
