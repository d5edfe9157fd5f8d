// The stored settings of the services.
#ifndef VELT_STANDALONE_SETTINGS_SETTINGS_H
#define VELT_STANDALONE_SETTINGS_SETTINGS_H

#include "base/result.h"
#include "ftp/ftp_library.h"
#include "schema/settings_table.h"

#include <string>

namespace velt {

/// Everything that the configuration of the FTP daemon follows from. The defaults are those of the tables in
/// schema/settings_table.h, see defaultFtpSettings.
struct FtpSettings {
    _tag_VELT_FTP_CONF_ record{};
    int timeout = 0; ///< seconds; 0: never
    bool useUtf8 = false;
    bool fipsOnly = false;
    bool ascii = false;
    bool umask = false;
    std::string externalAddress{}; ///< dotted IPv4, or empty
};

/// What the SFTP daemon's configuration follows from.
struct SftpSettings {
    bool enabled = false;
    int port = 0;
};

/// Where the services may be reached, which an administrator says in a file; the API has no setting for it.
struct NetworkSettings {
    bool loopbackOnly = false; ///< the services listen on 127.0.0.1 and nowhere else
};

/// The passive range in force without a custom one.
inline constexpr VELT_FTP_PORT_RANGE defaultPassiveRange{schema::firstPassivePort, schema::lastPassivePort};

/// What is in force before the first store.
FtpSettings defaultFtpSettings();
SftpSettings defaultSftpSettings();

/// Writes the default settings into the files that are not there yet; leaves the others alone, even damaged
/// ones.
Result<> writeMissingSettings();

/// The control port of the record; 0 when its text is not a number from 1 to 65535.
int controlPort(const _tag_VELT_FTP_CONF_& record);

/// Whether the record enables FTP or FTPS.
bool enablesFtp(const _tag_VELT_FTP_CONF_& record);

/// The passive range in force: the custom one where both its ends are set, else the default.
VELT_FTP_PORT_RANGE passiveRange(const _tag_VELT_FTP_CONF_& record);

/// The stored settings, the defaults before the first store. Errors name the file and, where it is damaged,
/// the line.
Result<FtpSettings> loadFtpSettings();
Result<SftpSettings> loadSftpSettings();

/// The settings of /etc/velt/network.conf below the state root, the defaults where there is none:
///
///     version = 1
///     loopback_only = 1
///
/// Thread-safe.
Result<NetworkSettings> loadNetworkSettings();

/// Whether a daemon would take these settings; errors name the setting, the value and what is allowed. Looks
/// at numbers and texts only, starts nothing.
Result<> checkFtpSettings(const FtpSettings& settings);
Result<> checkSftpSettings(const SftpSettings& settings);

/// Whether clients could ever reach this server at the address, an IPv4 one or "" for none: not at a
/// loopback, link-local, multicast or broadcast one, nor at 0.x.x.x. For new addresses only: a service runs
/// with the one that is stored.
Result<> checkExternalAddress(const std::string& address);

} // namespace velt

#endif
