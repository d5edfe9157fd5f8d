// What a change of the settings takes from open sessions.
#ifndef VELT_STANDALONE_SETTINGS_LOST_RIGHTS_H
#define VELT_STANDALONE_SETTINGS_LOST_RIGHTS_H

#include "standalone/settings/confinement_settings.h"
#include "standalone/settings/settings.h"

namespace velt {

/// Whether sessions that began with the former settings may do, or be, what the next ones would not let them:
/// FTP or FTPS is off, weak algorithms or transfers between servers are, anonymous users are, or the folder
/// that users are confined to or the umask of their files is another one. Limits, time-outs, ports, addresses
/// and forms of names are no rights. A pure function.
bool takesRights(const FtpSettings& former, const FtpSettings& next);

/// What the configuration of SFTP follows from, beside its own settings.
struct SftpTerms {
    FtpSettings ftp;
    ConfinementSettings confinement;
};

/// The same for sessions of SFTP: they are confined from now on, and were not; or are confined still, and the
/// folder is another one; or weak algorithms are off, or the umask is another one. A pure function.
bool takesRights(const SftpTerms& former, const SftpTerms& next);

} // namespace velt

#endif
