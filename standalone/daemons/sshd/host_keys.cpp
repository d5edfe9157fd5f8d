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

#include <array>
#include <memory>
#include <string>
#include <string_view>

namespace velt {
namespace {

constexpr std::array<std::string_view, 2> kinds{"ed25519", "rsa"};

Result<> storeCopy(const std::filesystem::path& from, const std::filesystem::path& to, mode_t mode) {
    VELT_ASSIGN_OR_RETURN(const auto text, readFile(from));
    return replaceFile(to, text, mode);
}

// ssh-keygen writes in place, so the key is made aside and stored whole; the public half comes first, so
// that a private key is never there without it.
Result<> makeKey(const std::string& kind, const std::filesystem::path& place) {
    VELT_ASSIGN_OR_RETURN(const auto scratch, ScratchFolder::make());
    const auto made = scratch.path() / "key";
    const auto result =
        runProcess({"/usr/bin/ssh-keygen", "-q", "-t", kind, "-N", "", "-C", "", "-f", made.string()}, {},
                   std::chrono::seconds(60));
    if (!result || result->exitCode != 0) {
        return Error(ErrorNumber::daemon, "Cannot make a host key for SFTP: " + reasonOfEnd(result) + ".");
    }
    VELT_RETURN_IF_ERROR(storeCopy(made.string() + ".pub", place.string() + ".pub", 0644));
    return storeCopy(made, place, 0600);
}

std::vector<std::filesystem::path> keysIn(const std::filesystem::path& folder) {
    std::vector<std::filesystem::path> keys;
    keys.reserve(kinds.size());
    for (const std::string_view kind : kinds) {
        keys.push_back(folder / ("host_" + std::string(kind) + "_key"));
    }
    return keys;
}

Result<> makeMissing(const std::vector<std::filesystem::path>& keys) {
    for (std::size_t i = 0; i < keys.size(); i++) {
        VELT_ASSIGN_OR_RETURN(const bool there, isThere(keys[i]));
        if (there) {
            continue;
        }
        VELT_RETURN_IF_ERROR(makeKey(std::string(kinds[i]), keys[i]));
    }
    return {};
}

Result<bool> allAreThere(const std::vector<std::filesystem::path>& keys) {
    for (const auto& key : keys) {
        VELT_ASSIGN_OR_RETURN(const bool there, isThere(key));
        if (!there) {
            return false;
        }
    }
    return true;
}

// A configuration under test needs keys even where none may be stored.
Result<HostKeys> throwAwayKeys() {
    VELT_ASSIGN_OR_RETURN(auto folder, ScratchFolder::make());
    HostKeys keys{keysIn(folder.path()), std::make_shared<ScratchFolder>(std::move(folder))};
    VELT_RETURN_IF_ERROR(makeMissing(keys.files));
    return keys;
}

} // namespace

Result<HostKeys> hostKeys() {
    VELT_ASSIGN_OR_RETURN(const auto lock, StateLock::take());
    HostKeys keys{keysIn(statePath(paths::hostKeys)), nullptr};
    VELT_ASSIGN_OR_RETURN(bool complete, allAreThere(keys.files));
    if (!complete) {
        VELT_RETURN_IF_ERROR(perform(Effect::store, "host keys", [&] { return makeMissing(keys.files); }));
        VELT_ASSIGN_OR_RETURN(complete, allAreThere(keys.files));
    }
    return complete ? Result<HostKeys>(std::move(keys)) : throwAwayKeys();
}

} // namespace velt
