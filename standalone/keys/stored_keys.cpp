#include "standalone/keys/stored_keys.h"

#include "base/plain_text.h"
#include "base/utc_text.h"
#include "standalone/accounts/user_directory.h"
#include "standalone/core/error_number.h"
#include "standalone/core/state_lock.h"
#include "standalone/journal/request_actor.h"

#include <algorithm>

namespace velt {
namespace {

constexpr std::size_t longestActor = 256;

Error expected(std::string what) {
    return {ErrorNumber::invalid, std::move(what)};
}

/// Also where that cannot be told: nobody is to take a key for useless that may open something.
bool isOfAccount(const KeyFile& file) {
    const auto account = userByName(file.user);
    return account ? account->uid == file.uid : !usersAreKnown();
}

void append(const KeyFile& file, std::vector<StoredKey>& keys) {
    const bool ofAccount = isOfAccount(file);
    for (const KeyEntry& entry : file.keys) {
        keys.push_back({file.user, entry, ofAccount});
    }
}

/// The file of the account's keys, without any where there is none.
Result<KeyFile> fileOf(const UserEntry& account) {
    VELT_ASSIGN_OR_RETURN(auto file, loadKeyFile(account.name));
    if (!file || file->keys.empty()) {
        return KeyFile{account.name, account.uid, {}};
    }
    if (file->uid != account.uid) {
        return expected("a user without keys of a former account of this name; remove those first");
    }
    return std::move(*file);
}

Result<UserEntry> accountFor(const std::string& user) {
    auto account = findUser(user);
    if (!account && account.error().number == ErrorNumber::notFound) {
        return expected("a user of this server");
    }
    if (account && account->uid == 0) {
        return expected("a user other than root, who cannot log in over SFTP");
    }
    return account;
}

auto placeOf(std::vector<KeyEntry>& keys, const std::string& fingerprint) {
    return std::ranges::find_if(keys,
                                [&](const KeyEntry& each) { return each.key.fingerprint == fingerprint; });
}

} // namespace

Result<StoredKeys> storedKeys() {
    VELT_ASSIGN_OR_RETURN(const auto users, usersWithKeys());
    StoredKeys stored;
    for (const std::string& user : users) {
        const auto file = loadKeyFile(user);
        if (!file) {
            stored.damaged.push_back(file.error().message);
        } else if (*file) {
            append(**file, stored.keys);
        }
    }
    return stored;
}

Result<StoredKeys> storedKeys(const std::string& user) {
    StoredKeys stored;
    const auto file = loadKeyFile(user);
    if (!file && file.error().number == ErrorNumber::notFound) {
        return file.error();
    }
    if (!file) {
        stored.damaged.push_back(file.error().message);
    } else if (*file) {
        append(**file, stored.keys);
    } else {
        VELT_ASSIGN_OR_RETURN(const auto account, findUser(user));
    }
    return stored;
}

Result<AddedKey> addKey(const std::string& user, const PublicKey& key, KeyChange change) {
    VELT_ASSIGN_OR_RETURN(const auto lock, StateLock::take());
    VELT_ASSIGN_OR_RETURN(const auto account, accountFor(user));
    VELT_ASSIGN_OR_RETURN(auto file, fileOf(account));
    if (const auto same = placeOf(file.keys, key.fingerprint); same != file.keys.end()) {
        return AddedKey{{file.user, *same, true}, false};
    }
    if (file.keys.size() >= mostKeys) {
        return expected("a user with fewer than " + std::to_string(mostKeys) + " keys");
    }
    file.keys.push_back({key, timestamp(), plainText(requestActor().actor, longestActor)});
    if (change == KeyChange::make) {
        VELT_RETURN_IF_ERROR(storeKeyFile(file));
    }
    return AddedKey{{file.user, file.keys.back(), true}, true};
}

Result<std::optional<StoredKey>> removeKey(const std::string& user, const std::string& fingerprint,
                                           KeyChange change) {
    VELT_ASSIGN_OR_RETURN(const auto lock, StateLock::take());
    VELT_ASSIGN_OR_RETURN(auto file, loadKeyFile(user));
    if (!file) {
        return std::nullopt;
    }
    const auto found = placeOf(file->keys, fingerprint);
    if (found == file->keys.end()) {
        return std::nullopt;
    }
    StoredKey removed{file->user, *found, isOfAccount(*file)};
    file->keys.erase(found);
    if (change == KeyChange::make) {
        // Also without a key left: a file that is gone could be back after a crash.
        VELT_RETURN_IF_ERROR(storeKeyFile(*file));
    }
    return std::optional(std::move(removed));
}

} // namespace velt
