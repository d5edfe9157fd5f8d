// Finds failed logins in what the daemons write.
//
// The names in these messages were chosen by whoever failed to log in, and may hold anything, also what looks
// like a message of its own. So a message is what the daemon wrote at once, line breaks in the middle
// included; where it begins and ends is the daemon's, and only from there it is read.
#ifndef VELT_STANDALONE_BANS_FAILED_LOGIN_H
#define VELT_STANDALONE_BANS_FAILED_LOGIN_H

#include "base/ip_network.h"

#include <optional>
#include <string>
#include <string_view>

namespace velt {

/// The address from which a password was refused, when this message of the SFTP daemon says that. A key that
/// is refused is no guess: clients try all that they have.
std::optional<IpNetwork> failedSftpLogin(std::string_view message);

/// The name that was given with it: of the client's choosing, up to the end of what the daemon writes of it;
/// "" where there is none. The words "invalid user" before it are the daemon's.
std::string userOfFailedSftpLogin(std::string_view message);

/// As failedSftpLogin for a message of the FTP daemon, which has it from our login module.
std::optional<IpNetwork> failedFtpLogin(std::string_view message);

} // namespace velt

#endif
