// The text of the FTP daemon's configuration.
#ifndef VELT_STANDALONE_PROFTPD_RENDER_H
#define VELT_STANDALONE_PROFTPD_RENDER_H

#include "standalone/settings/settings.h"

#include <filesystem>
#include <optional>
#include <string>

namespace velt {

/// Accounts from files of their own in place of the server's users: for a daemon without root's rights.
struct AccountFiles {
    std::filesystem::path users;
    std::filesystem::path groups;
};

/// What the configuration needs to know beside the settings. All of it is made by the platform; none of it is
/// text that reached the platform through a request.
struct ProftpdPlaces {
    std::filesystem::path moduleFolder; ///< holds mod_velt_chroot.so
    std::filesystem::path runFolder;    ///< for the daemon's own run-time files
    std::filesystem::path chrootRules;
    std::filesystem::path shareMap;
    std::filesystem::path shareRoot;     ///< holds "users" and "anonymous", in the daemon's own name space
    std::filesystem::path anonymousLink; ///< leads to the share that anonymous users are confined to
    std::filesystem::path certificate;   ///< needed where FTPS is on
    std::filesystem::path certificateKey;
    bool certificateIsRsa = false; ///< else it is an elliptic curve's
    std::string user = "proftpd";
    std::string group = "nogroup";
    bool ipv6 = true;
    bool loopbackOnly = false; ///< clients of this machine only, over IPv4
    bool anonymousMayWrite = false;
    std::optional<AccountFiles> accountFiles; ///< absent: the server's users, through PAM
};

/// Whether the path can stand in the configuration: absolute, of at most 1024 bytes, and without the
/// characters that mean something to the daemon even between quotes.
bool isRenderable(const std::filesystem::path& path);

/// The whole configuration. The settings have passed checkFtpSettings, the places isRenderable. A pure
/// function.
std::string renderProftpd(const FtpSettings& settings, const ProftpdPlaces& places);

/// Whether local users without a rule see the shares under one root instead of their homes, or anonymous
/// users do: the daemon then needs the share root.
bool needsShareRoot(const FtpSettings& settings);

} // namespace velt

#endif
