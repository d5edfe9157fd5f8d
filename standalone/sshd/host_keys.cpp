#include "standalone/sshd/host_keys.h"

#include "standalone/core/file_store.h"
#include "standalone/core/last_error.h"
#include "standalone/core/process.h"
#include "standalone/core/state_root.h"
#include "standalone/daemon_test.h"
#include "standalone/supervise/last_words.h"

#include <string>

namespace velt {
namespace {

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
    const auto key = result.exitCode == 0 ? readFile(made) : std::nullopt;
    const auto publicKey = key ? readFile(made.string() + ".pub") : std::nullopt;
    if (!publicKey) {
        return fail(ErrorNumber::daemon,
                    "No host key can be made for SFTP: " + lastWords(result.errors) + ".");
    }
    if (replaceFile(place.string() + ".pub", *publicKey, 0644) < 0) {
        return -1;
    }
    return replaceFile(place, *key, 0600);
}

} // namespace

std::optional<std::vector<std::filesystem::path>> hostKeys() {
    const StateLock lock;
    if (!lock) {
        return std::nullopt;
    }
    std::vector<std::filesystem::path> keys;
    for (const std::string kind : {"ed25519", "rsa"}) {
        const auto place = statePath("/var/lib/velt/ssh/host_" + kind + "_key");
        std::error_code error;
        if (!std::filesystem::exists(place, error) && makeKey(kind, place) < 0) {
            return std::nullopt;
        }
        keys.push_back(place);
    }
    return keys;
}

} // namespace velt
