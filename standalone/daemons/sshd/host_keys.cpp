#include "standalone/daemons/sshd/host_keys.h"
#include "base/file.h"

#include "standalone/core/effects.h"
#include "standalone/core/error_number.h"
#include "standalone/core/paths.h"
#include "standalone/core/scratch_folder.h"
#include "standalone/core/state_lock.h"
#include "standalone/core/state_root.h"
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

Result<> storeCopy(const std::filesystem::path& from, const std::filesystem::path& to, mode_t mode) {
    const auto text = readFile(from);
    return text ? replaceFile(to, *text, mode) : text.error();
}

// ssh-keygen writes in place, so the key is made aside and stored whole; the public half comes first, so
// that a private key is never there without it.
Result<> makeKey(const std::string& kind, const std::filesystem::path& place) {
    const auto scratch = ScratchFolder::make();
    if (!scratch) {
        return scratch.error();
    }
    const auto made = scratch->path() / "key";
    const auto result =
        runProcess({"/usr/bin/ssh-keygen", "-q", "-t", kind, "-N", "", "-C", "", "-f", made.string()}, {},
                   std::chrono::seconds(60));
    if (result.exitCode != 0) {
        return Error(ErrorNumber::daemon,
                     "Cannot make a host key for SFTP: " + lastWords(result.errors) + ".");
    }
    const auto stored = storeCopy(made.string() + ".pub", place.string() + ".pub", 0644);
    return stored ? storeCopy(made, place, 0600) : stored;
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

Result<> makeMissing(const std::vector<std::filesystem::path>& keys) {
    for (std::size_t i = 0; i < keys.size(); i++) {
        if (isThere(keys[i])) {
            continue;
        }
        if (auto made = makeKey(std::string(kinds[i]), keys[i]); !made) {
            return made;
        }
    }
    return {};
}

// A configuration under test names keys also where none may be stored.
Result<HostKeys> throwAwayKeys() {
    auto folder = ScratchFolder::make();
    if (!folder) {
        return folder.error();
    }
    HostKeys keys{keysIn(folder->path()), std::make_shared<ScratchFolder>(std::move(*folder))};
    const auto made = makeMissing(keys.files);
    return made ? Result<HostKeys>(std::move(keys)) : made.error();
}

} // namespace

Result<HostKeys> hostKeys() {
    const auto lock = StateLock::take();
    if (!lock) {
        return lock.error();
    }
    HostKeys keys{keysIn(statePath(paths::hostKeys)), nullptr};
    if (std::ranges::all_of(keys.files, isThere)) {
        return keys;
    }
    const auto stored = perform(Effect::store, "host keys", [&] { return makeMissing(keys.files); });
    if (!stored) {
        return stored.error();
    }
    return std::ranges::all_of(keys.files, isThere) ? Result<HostKeys>(std::move(keys)) : throwAwayKeys();
}

} // namespace velt
