// The files and folders of this system, each written down once: arguments of statePath.
#ifndef VELT_STANDALONE_CORE_PATHS_H
#define VELT_STANDALONE_CORE_PATHS_H

#include <string_view>

namespace velt::paths {

// What administrators may edit.
inline constexpr std::string_view ftpSettings = "/etc/velt/ftp.conf";
inline constexpr std::string_view sftpSettings = "/etc/velt/sftp.conf";
inline constexpr std::string_view confinementSettings = "/etc/velt/confinement.conf";
inline constexpr std::string_view networkSettings = "/etc/velt/network.conf";
inline constexpr std::string_view firewallSettings = "/etc/velt/firewall.conf";
inline constexpr std::string_view banSettings = "/etc/velt/bans.conf";
inline constexpr std::string_view activitySettings = "/etc/velt/transfers.conf";
inline constexpr std::string_view logRetention = "/etc/velt/log.conf";
inline constexpr std::string_view knownServices = "/etc/velt/known_services.conf";
inline constexpr std::string_view shares = "/etc/velt/shares.json";
inline constexpr std::string_view chrootRules = "/etc/velt/chroot_rules";
inline constexpr std::string_view ftpPasswd = "/etc/velt/ftp.passwd"; ///< for a daemon without root
inline constexpr std::string_view ftpGroup = "/etc/velt/ftp.group";
inline constexpr std::string_view givenCertificate = "/etc/velt/tls/server.crt";
inline constexpr std::string_view givenKey = "/etc/velt/tls/server.key";
inline constexpr std::string_view userKeys =
    "/etc/velt/keys"; ///< a folder, one file for each user with public keys
inline constexpr std::string_view runKeys = "/etc/velt/run-keys"; ///< a folder, one file for each service
inline constexpr std::string_view systemInformation = "/etc/veltinfo.conf"; ///< shared with other programs

// What this system keeps for itself.
inline constexpr std::string_view stateLock = "/var/lib/velt/lock";
inline constexpr std::string_view initialized = "/var/lib/velt/initialized"; ///< empty, since the first start
inline constexpr std::string_view unfinishedChange = "/var/lib/velt/unfinished-change";
inline constexpr std::string_view logDatabase = "/var/lib/velt/log.db";
inline constexpr std::string_view operationDatabase = "/var/lib/velt/transfers.db";
inline constexpr std::string_view spools =
    "/var/lib/velt/transfers";                                    ///< a folder of what sessions wrote down
inline constexpr std::string_view hostKeys = "/var/lib/velt/ssh"; ///< a folder
inline constexpr std::string_view ownCertificate = "/var/lib/velt/tls/server.crt";
inline constexpr std::string_view ownKey = "/var/lib/velt/tls/server.key";
inline constexpr std::string_view transferLog = "/var/log/velt/xferlog";
inline constexpr std::string_view events = "/var/log/velt/events.jsonl"; ///< and older ones, ".1" to ".4"

// What does not outlive a boot.
inline constexpr std::string_view run = "/run/velt"; ///< a folder; supervisors keep their files in it
inline constexpr std::string_view ftpRun = "/run/velt/ftp";
inline constexpr std::string_view sftpConfigurations = "/run/velt/sftp/configurations"; ///< a folder
inline constexpr std::string_view sessions = "/run/velt/sessions"; ///< a folder, one file for each session
inline constexpr std::string_view lostRecords = "/run/velt/sessions/lost";
inline constexpr std::string_view bans = "/run/velt/bans";
inline constexpr std::string_view loadedRules = "/run/velt/firewall.loaded";
inline constexpr std::string_view listedRules = "/run/velt/firewall.listed";
inline constexpr std::string_view firewallWarning = "/run/velt/firewall.warning";

} // namespace velt::paths

#endif
