#include "standalone/daemons/sshd/host_keys.h"

#include "base/file.h"
#include "standalone/core/boundary.h"
#include "standalone/core/effects.h"
#include "standalone/core/last_error.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_lock.h"
#include "standalone/core/state_root.h"
#include "standalone/daemons/configuration_test.h"
#include "standalone/process/last_words.h"
#include "standalone/process/run_program.h"

#include <algorithm>
#include <array>
#include <memory>
#include <string>
#include <string_view>

namespace velt {
namespace {

constexpr std::array<std::string_view, 2> kinds{"ed25519", "rsa"};

// ssh-keygen writes in place, so the key is made aside and stored whole; the public half comes first, so
// that a private key never stands alone.
int makeKey(const std::string& kind, const std::filesystem::path& place) {
    const ScratchFolder scratch;
    if (!scratch) {
        return -1;
    }
    const auto made = scratch.path() / "key";
    const auto result =
        runProcess({"/usr/bin/ssh-keygen", "-q", "-t", kind, "-N", "", "-C", "", "-f", made.string()}, {},
                   std::chrono::seconds(60));
    const auto key = readFile(made);
    const auto publicKey = readFile(made.string() + ".pub");
    if (result.exitCode != 0 || !key || !publicKey) {
        return fail(ErrorNumber::daemon,
                    "No host key can be made for SFTP: " + lastWords(result.errors) + ".");
    }
    const auto stored = replaceFile(place.string() + ".pub", *publicKey, 0644);
    return toContract(stored ? replaceFile(place, *key, 0600) : stored);
}

std::vector<std::filesystem::path> keysIn(const std::filesystem::path& folder) {
    std::vector<std::filesystem::path> keys;
    keys.reserve(kinds.size());
    for (const std::string_view kind : kinds) {
        keys.push_back(folder / ("host_" + std::string(kind) + "_key"));
    }
    return keys;
}

bool isThere(const std::filesystem::path& path) {
    std::error_code error;
    return std::filesystem::exists(path, error);
}

int makeMissing(const std::vector<std::filesystem::path>& keys) {
    for (std::size_t i = 0; i < keys.size(); i++) {
        if (!isThere(keys[i]) && makeKey(std::string(kinds[i]), keys[i]) < 0) {
            return -1;
        }
    }
    return 0;
}

// Something has to stand in the configuration that a daemon is to test, also where nothing may be stored.
std::optional<std::vector<std::filesystem::path>> throwAwayKeys() {
    thread_local std::unique_ptr<ScratchFolder> folder;
    folder = std::make_unique<ScratchFolder>();
    if (!*folder) {
        return std::nullopt;
    }
    auto keys = keysIn(folder->path());
    return makeMissing(keys) == 0 ? std::optional(std::move(keys)) : std::nullopt;
}

} // namespace

std::optional<std::vector<std::filesystem::path>> hostKeys() {
    const StateLock lock;
    if (!lock) {
        return std::nullopt;
    }
    auto keys = keysIn(statePath(paths::hostKeys));
    if (std::ranges::all_of(keys, isThere)) {
        return keys;
    }
    if (perform(Effect::store, "host keys", [&] { return makeMissing(keys); }) < 0) {
        return std::nullopt;
    }
    return std::ranges::all_of(keys, isThere) ? std::optional(std::move(keys)) : throwAwayKeys();
}

} // namespace velt
