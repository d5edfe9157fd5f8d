#include "standalone/daemons/proftpd/proftpd_configuration.h"

#include "base/ipv4.h"

#include <algorithm>
#include <array>
#include <string_view>
#include <type_traits>
#include <utility>

namespace velt {
namespace {

constexpr std::string_view codepage = "ISO-8859-1";
// Built into the daemon of one release of Debian, modules to be loaded in the next.
constexpr std::array<std::string_view, 3> neededModules{"mod_delay.c", "mod_ls.c", "mod_xfer.c"};

std::string quoted(const std::filesystem::path& path) {
    return '"' + path.string() + '"';
}

// One directive a line; its words are our own, numbers, and paths.
class Text {
public:
    template<typename... Words> void line(const Words&... words) {
        (append(words), ...);
        text_.back() = '\n';
    }
    std::string take() { return std::move(text_); }

private:
    template<typename Word> void append(const Word& word) {
        if constexpr (std::is_same_v<Word, std::filesystem::path>) {
            text_ += quoted(word);
        } else if constexpr (std::is_integral_v<Word>) {
            text_ += std::to_string(word);
        } else {
            text_ += word;
        }
        text_ += ' ';
    }

    std::string text_;
};

void renderServer(Text& text, const ProftpdPlaces& places) {
    text.line("ServerType standalone");
    text.line("ServerName \"File server\"");
    text.line("ServerIdent on \"FTP server ready.\"");
    text.line("User", places.user);
    text.line("Group", places.group);
    text.line("PidFile", places.runFolder / daemonFolder / "proftpd.pid");
    text.line("ScoreboardFile", places.runFolder / daemonFolder / "proftpd.scoreboard");
    text.line("DelayTable", places.runFolder / daemonFolder / "proftpd.delay");
    text.line("TransferLog none");
    text.line("WtmpLog off");
    text.line("UseReverseDNS off");
    // Otherwise anybody who may write to a folder makes rules for all who use it, in a file .ftpaccess.
    text.line("AllowOverride off");
    text.line("AllowOverwrite on");
    // Without it neither APPE nor the resumption of a broken upload is allowed.
    text.line("AllowStoreRestart on");
    text.line("ControlsEngine off");
    // Each connection is a process, also before a login.
    text.line("MaxInstances 2000");
    text.line("TimeoutLogin 30");
}

void renderModules(Text& text, const FtpSettings& settings, const ProftpdPlaces& places) {
    const std::filesystem::path packageModules = "/usr/lib/proftpd";
    text.line("ModulePath", packageModules);
    for (const std::string_view module : neededModules) {
        text.line("<IfModule", "!" + std::string(module) + ">");
        text.line("  LoadModule", module);
        text.line("</IfModule>");
    }
    text.line("ModulePath", places.moduleFolder);
    text.line("LoadModule mod_velt_login.c");
    if ((settings.record.service_flags & VELT_FTP_SERVICE_TLS) != 0) {
        text.line("ModulePath", packageModules);
        text.line("LoadModule mod_tls.c");
    }
}

void renderAddresses(Text& text, const FtpSettings& settings, const ProftpdPlaces& places) {
    const auto& record = settings.record;
    const bool ipv6 = places.ipv6 && !places.loopbackOnly;
    text.line("UseIPv6", ipv6 ? "on" : "off");
    // Without an address of its own the daemon resolves the host's name, and does not start where that fails.
    text.line("DefaultAddress", ipv6 ? "::" : places.loopbackOnly ? "127.0.0.1" : "0.0.0.0");
    text.line("SocketBindTight on");
    text.line("Port", controlPort(record));
    // So a daemon with other settings listens before this one ends. Of a session's own sockets, with which
    // two could take the same data port, mod_velt_login takes it back.
    text.line("SocketOptions reuseport on");
    // The firewall opens this range and no other, so it is never left to the kernel.
    const VELT_FTP_PORT_RANGE passive = passiveRange(record);
    text.line("PassivePorts", passive.first, passive.last);
    // The directive would also take host and interface names, and announce what these resolve to.
    const auto external = record.use_ext_ip != 0 ? parseIPv4(settings.externalAddress) : std::nullopt;
    if (external) {
        text.line("MasqueradeAddress", toText(*external));
    }
    // Absent, it guards the active side only.
    text.line("AllowForeignAddress", record.enable_fxp != 0 ? "on" : "off");
}

void renderFipsAlgorithms(Text& text) {
    text.line("TLSCipherSuite ECDHE-ECDSA-AES256-GCM-SHA384:ECDHE-RSA-AES256-GCM-SHA384:"
              "ECDHE-ECDSA-AES128-GCM-SHA256:ECDHE-RSA-AES128-GCM-SHA256:"
              "DHE-RSA-AES256-GCM-SHA384:DHE-RSA-AES128-GCM-SHA256");
    text.line("TLSCipherSuite TLSv1.3 TLS_AES_256_GCM_SHA384:TLS_AES_128_GCM_SHA256");
    text.line("TLSECDHCurve prime256v1:secp384r1:secp521r1");
}

void renderTls(Text& text, const FtpSettings& settings, const ProftpdPlaces& places) {
    const int flags = settings.record.service_flags;
    if ((flags & VELT_FTP_SERVICE_TLS) == 0) {
        return;
    }
    text.line("TLSEngine on");
    text.line("TLSRequired", (flags & VELT_FTP_SERVICE_PLAIN) != 0 ? "off" : "on");
    text.line("TLSProtocol TLSv1.2 TLSv1.3");
    const char* certificate = places.certificateIsRsa ? "TLSRSACertificateFile" : "TLSECCertificateFile";
    const char* key = places.certificateIsRsa ? "TLSRSACertificateKeyFile" : "TLSECCertificateKeyFile";
    text.line(certificate, places.certificate);
    text.line(key, places.certificateKey);
    text.line("TLSCertificateChainFile", places.certificate);
    // Many clients do not resume the control connection's session for data and would get "425". By the
    // variables sessions know their version and cipher.
    text.line("TLSOptions NoSessionReuseRequired StdEnvVars");
    if (settings.fipsOnly) {
        renderFipsAlgorithms(text);
    }
}

void renderLimits(Text& text, const FtpSettings& settings, const ProftpdPlaces& places) {
    const auto& record = settings.record;
    text.line("TimeoutIdle", settings.timeout);
    // Its default of five minutes would end sessions before a longer idle time does.
    text.line("TimeoutNoTransfer 0");
    text.line("TimeoutStalled", settings.timeout);
    if (record.enable_flow_ctrl != 0 && record.maxdownloadrate > 0) {
        text.line("TransferRate RETR", record.maxdownloadrate);
    }
    if (record.enable_flow_ctrl != 0 && record.maxuploadrate > 0) {
        text.line("TransferRate STOR,APPE,STOU", record.maxuploadrate);
    }
    if (record.max_conn_per_ip > 0) {
        text.line("MaxConnectionsPerHost", record.max_conn_per_ip);
    }
    for (const IpNetwork& network : places.spared) {
        text.line("VeltSpared", toText(network));
    }
}

void renderNames(Text& text, const FtpSettings& settings) {
    if (settings.record.support_utf8 == 0) {
        text.line("UseEncoding UTF-8", codepage);
        text.line("LangOptions PreferServerEncoding");
    } else if (!settings.useUtf8) {
        text.line("UseEncoding UTF-8", codepage);
    } else {
        text.line("UseEncoding UTF-8 UTF-8");
        text.line("LangOptions PreferServerEncoding");
    }
}

void renderFiles(Text& text, const FtpSettings& settings) {
    if (!settings.ascii) {
        text.line("TransferOptions IgnoreASCII");
    }
    // Absent, it means 022.
    text.line("Umask", settings.umask ? "022 022" : "000 000");
}

void renderLoginView(Text& text, const FtpSettings& settings, const ProftpdPlaces& places) {
    const auto& record = settings.record;
    const char* others = places.accountFiles ? "server" : "shares";
    const char* kind = record.user_chroot != 0 ? "home" : others;
    if (record.anonymous != 0 && record.anonymous_chroot != 0) {
        text.line("VeltLoginView", places.loginProgram, places.stateRoot, kind, places.anonymousShare);
    } else {
        text.line("VeltLoginView", places.loginProgram, places.stateRoot, kind);
    }
    if (!places.configuration.empty()) {
        text.line("VeltConfiguration", places.configuration);
    }
    // A daemon without root's rights cannot change the root directory: where it must, it refuses the login.
    if (!places.accountFiles || record.user_chroot != 0) {
        text.line("DefaultRoot", places.loginRoot);
        // The home's path means nothing below another root.
        text.line("DefaultChdir /");
    }
}

void renderLogin(Text& text, const FtpSettings& settings, const ProftpdPlaces& places) {
    if (places.accountFiles) {
        text.line("AuthPAM off");
        text.line("AuthUserFile", places.accountFiles->users);
        text.line("AuthGroupFile", places.accountFiles->groups);
        text.line("AuthOrder mod_auth_file.c");
    } else {
        text.line("AuthPAM on");
        text.line("AuthPAMConfig proftpd");
        text.line("AuthOrder mod_auth_pam.c* mod_auth_unix.c");
    }
    text.line("RequireValidShell off");
    text.line("PersistentPasswd off");
    renderLoginView(text, settings, places);
}

void renderAnonymous(Text& text, const FtpSettings& settings, const ProftpdPlaces& places) {
    if (settings.record.anonymous == 0) {
        return;
    }
    text.line("<Anonymous", places.loginRoot, ">");
    text.line("  User ftp");
    text.line("  Group nogroup");
    text.line("  UserAlias anonymous ftp");
    text.line("  RequireValidShell off");
    // What one guest leaves is open to all of them, and stays as the server made it.
    text.line("  <Limit SITE_CHMOD MFF>");
    text.line("    DenyAll");
    text.line("  </Limit>");
    text.line("</Anonymous>");
}

} // namespace

std::string renderProftpd(const FtpSettings& settings, const ProftpdPlaces& places) {
    Text text;
    text.line("# Made from the stored settings; changes here are lost.");
    renderModules(text, settings, places);
    renderServer(text, places);
    renderAddresses(text, settings, places);
    renderTls(text, settings, places);
    renderLimits(text, settings, places);
    renderNames(text, settings);
    renderFiles(text, settings);
    renderLogin(text, settings, places);
    renderAnonymous(text, settings, places);
    return text.take();
}

} // namespace velt
