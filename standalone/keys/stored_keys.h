// The keys of users as administrators see and change them. Each call reads the files anew. Thread-safe.
#ifndef VELT_STANDALONE_KEYS_STORED_KEYS_H
#define VELT_STANDALONE_KEYS_STORED_KEYS_H

#include "base/result.h"
#include "standalone/keys/key_store.h"

#include <optional>
#include <string>
#include <vector>

namespace velt {

struct StoredKey {
    std::string user;
    KeyEntry entry;
    bool ofAccount = true; ///< false: of a former account, so it opens nothing
};

struct StoredKeys {
    std::vector<StoredKey> keys;      ///< by user, in the order in which they were added
    std::vector<std::string> damaged; ///< for each file that cannot be used, a sentence that says why
};

/// All keys, or those of one user. An error (notFound) for a user with neither an account nor keys.
Result<StoredKeys> storedKeys();
Result<StoredKeys> storedKeys(const std::string& user);

enum class KeyChange {
    make,
    tryOut, ///< stores nothing
};

struct AddedKey {
    StoredKey key;
    bool isNew = true; ///< false: the same key was there, and stays as it was
};

/// Adds the key on behalf of the calling thread's actor. An error of the kind `invalid` says which user was
/// expected instead, to stand behind "expected".
Result<AddedKey> addKey(const std::string& user, const PublicKey& key, KeyChange change);

/// Removes the key with this fingerprint, also where the account is gone. Nothing when there is none.
Result<std::optional<StoredKey>> removeKey(const std::string& user, const std::string& fingerprint,
                                           KeyChange change);

} // namespace velt

#endif
