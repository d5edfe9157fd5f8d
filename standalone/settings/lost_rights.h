// What a change of the settings takes from open sessions.
#ifndef VELT_STANDALONE_SETTINGS_LOST_RIGHTS_H
#define VELT_STANDALONE_SETTINGS_LOST_RIGHTS_H

#include "standalone/settings/settings.h"

namespace velt {

/// Whether sessions that began with the former settings may do, or be, what the next ones would not let them:
/// FTP or FTPS is off, weak algorithms or transfers between servers are, anonymous users are, or the folder
/// that users are confined to or the umask of their files is another one. Limits, time-outs, ports, addresses
/// and forms of names are no rights. A pure function.
bool takesRights(const FtpSettings& former, const FtpSettings& next);

} // namespace velt

#endif
