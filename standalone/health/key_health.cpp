#include "standalone/accounts/user_directory.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/health/checks.h"
#include "standalone/health/mends.h"
#include "standalone/health/named_accounts.h"
#include "standalone/keys/key_store.h"

#include <algorithm>
#include <iterator>
#include <vector>

namespace velt {
namespace {

constexpr std::chrono::seconds accountLimit{2};

std::filesystem::path pathOf(const std::string& user) {
    return keyFileOf(user).valueOr({});
}

Finding unusable(const std::string& user, const Error& error) {
    const std::string path = shellWord(pathOf(user).string());
    return {"keys-unusable", Severity::warning, "keys",
            error.message + " None of the keys in it opens anything.",
            "Correct the file or put your copy back, then run: chown root " + path + " && chmod 600 " + path};
}

Finding formerAccount(const KeyFile& file) {
    std::string command;
    for (const KeyEntry& entry : file.keys) {
        command += std::string(command.empty() ? "" : " && ") + "veltctl keys remove " +
                   shellWord(file.user) + " " + entry.key.fingerprint;
    }
    return {"keys-former-account", Severity::warning, "keys",
            "There is no user \"" + file.user + "\" with the number " + std::to_string(file.uid) +
                ", whose keys are stored. They open nothing.",
            command};
}

/// Those of accounts that are gone, or have another number now.
std::vector<KeyFile> ofFormerAccounts(std::vector<KeyFile> files) {
    std::vector<NamedAccount> accounts;
    std::ranges::transform(files, std::back_inserter(accounts), [](const KeyFile& file) {
        return NamedAccount{true, file.user};
    });
    // Another check tells of sources that do not answer in time, or cannot be read.
    if (!unknownAccounts(std::move(accounts), accountLimit) || !usersAreKnown()) {
        return {};
    }
    std::erase_if(files, [](const KeyFile& file) {
        const auto account = userByName(file.user);
        return account && account->uid == file.uid;
    });
    return files;
}

} // namespace

Findings keyFindings() {
    const auto users = usersWithKeys();
    if (!users) {
        return {{"keys-unusable", Severity::warning, "keys", users.error().message,
                 "ls -ld " + shellWord(statePath(paths::userKeys).string())}};
    }
    Findings findings;
    std::vector<KeyFile> files;
    for (const std::string& user : *users) {
        auto file = loadKeyFile(user);
        if (!file) {
            findings.push_back(unusable(user, file.error()));
        } else if (*file && !(*file)->keys.empty()) {
            files.push_back(std::move(**file));
        }
    }
    for (const KeyFile& file : ofFormerAccounts(std::move(files))) {
        findings.push_back(formerAccount(file));
    }
    return findings;
}

} // namespace velt
