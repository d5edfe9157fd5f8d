// The keys with which a user may log in over SFTP.
#ifndef VELT_STANDALONE_LOGIN_AUTHORIZED_KEYS_H
#define VELT_STANDALONE_LOGIN_AUTHORIZED_KEYS_H

#include "base/result.h"

#include <sys/types.h>

#include <filesystem>
#include <string>
#include <string_view>

namespace velt {

/// What is left of the text of an authorized_keys file (sshd(8)) for a daemon that gives file transfer to
/// every key, whatever command its line names: a line with a command is left out. A certificate can name one
/// as well; the daemon refuses it where the line of its authority names another, so such a line gets ours.
std::string keysForTransfer(std::string_view text);

/// The text of ".ssh/authorized_keys" and ".ssh/authorized_keys2" in the home, as above; "" without them. An
/// error for a file that another user than its owner or root could have written: it and the folders up to the
/// home belong to one of the two, and nobody else may write to them. Reads with the rights of this process,
/// which should be the owner's. The files hold at most 1 MiB.
Result<std::string> readKeysForTransfer(const std::filesystem::path& home, uid_t owner);

} // namespace velt

#endif
