// The files in which public keys of users are stored: for each user one below "/etc/velt/keys".
//
//     {"version": 1, "user": "anna", "uid": 1001,
//      "keys": [{"key": "ssh-ed25519 AAAA... anna@desk", "added": "2026-11-23T04:00:00.000Z", "by": "root"}]}
//
// The file belongs to one account: a later one of the same name has another number, and gets nothing of it.
#ifndef VELT_STANDALONE_KEYS_KEY_STORE_H
#define VELT_STANDALONE_KEYS_KEY_STORE_H

#include "base/result.h"
#include "standalone/keys/public_key.h"

#include <sys/types.h>

#include <filesystem>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace velt {

struct KeyEntry {
    PublicKey key;
    std::string added; ///< when, "2026-11-23T04:00:00.000Z"
    std::string by;    ///< who did

    bool operator==(const KeyEntry&) const = default;
};

struct KeyFile {
    std::string user;
    uid_t uid = 0;
    std::vector<KeyEntry> keys; ///< no two with one fingerprint

    bool operator==(const KeyFile&) const = default;
};

inline constexpr std::size_t mostKeys = 100; ///< of one user

/// Where the keys of this user are; a name has a place of its own in the folder, whatever it contains. An
/// error (notFound) for one that is empty or too long for that.
Result<std::filesystem::path> keyFileOf(const std::string& user);

/// The text of the user's file; nothing where there is none. An error for a file that another user than root,
/// or this process's, could have written.
Result<std::optional<std::string>> readKeyFile(const std::string& user);

/// Reads this text. The error of a damaged one names the file and what is wrong in it: it gives no key at
/// all.
Result<KeyFile> parseKeyFile(const std::string& user, std::string_view text);

/// Both together.
Result<std::optional<KeyFile>> loadKeyFile(const std::string& user);

/// Puts it in the place of the former one. To be called under the StateLock.
Result<> storeKeyFile(const KeyFile& file);

/// The users who have a file, sorted; a file whose name is nobody's is passed over.
Result<std::vector<std::string>> usersWithKeys();

/// The lines of the keys for the daemon, where the file is of the account with this number; else "".
std::string keysForDaemon(const KeyFile& file, uid_t uid);

} // namespace velt

#endif
