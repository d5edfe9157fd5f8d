// The text of the FTP daemon's configuration.
#ifndef VELT_STANDALONE_DAEMONS_PROFTPD_PROFTPD_CONFIGURATION_H
#define VELT_STANDALONE_DAEMONS_PROFTPD_PROFTPD_CONFIGURATION_H

#include "base/ip_network.h"
#include "standalone/settings/settings.h"

#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace velt {

/// Accounts from files of their own in place of the server's users: for a daemon without root's rights.
struct AccountFiles {
    std::filesystem::path users;
    std::filesystem::path groups;
};

/// The folder in the run folder for the files that the daemon writes. They tell who is logged in, from where
/// and what for, and the daemon lets everybody read them: nobody else may enter the folder.
inline constexpr const char* daemonFolder = "daemon";

/// What the configuration needs to know beside the settings. All of it is made by the platform; none of it is
/// text that reached the platform through a request.
struct ProftpdPlaces {
    std::filesystem::path moduleFolder; ///< holds mod_velt_login.so
    std::filesystem::path runFolder;    ///< for what is made at the daemon's start
    std::filesystem::path loginProgram; ///< velt-login-view
    std::filesystem::path stateRoot;
    std::filesystem::path loginRoot; ///< an empty folder, on which the program shows what a login may see
    std::filesystem::path anonymousShare; ///< a file: names the share that anonymous users are confined to
    std::string configuration; ///< the hash of this text without it, for the sessions to tell; "": left out
    std::filesystem::path certificate; ///< needed where FTPS is on
    std::filesystem::path certificateKey;
    bool certificateIsRsa = false; ///< else it is an elliptic curve's
    std::string user = "proftpd";
    std::string group = "nogroup";
    bool ipv6 = true;
    bool loopbackOnly = false;                ///< clients of this machine only, over IPv4
    std::optional<AccountFiles> accountFiles; ///< absent: the server's users, through PAM
    std::vector<IpNetwork> spared;            ///< may have any number of connections that are not logged in
};

/// The whole configuration. The settings have passed checkFtpSettings, the places isRenderable. A pure
/// function.
std::string renderProftpd(const FtpSettings& settings, const ProftpdPlaces& places);

} // namespace velt

#endif
