#include "standalone/daemons/configuration_test.h"

#include "standalone/core/last_error.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_lock.h"
#include "standalone/core/state_root.h"
#include "standalone/process/last_words.h"
#include "standalone/process/run_program.h"

#include <fcntl.h>
#include <sys/file.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>

namespace velt {

namespace {

constexpr std::string_view scratchPrefix = "test.";

std::filesystem::path scratchParent() {
    return statePath(paths::run);
}

UniqueFd lockedFolder(const std::filesystem::path& path) {
    UniqueFd folder(::open(path.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
    return folder && ::flock(folder.get(), LOCK_EX | LOCK_NB) == 0 ? std::move(folder) : UniqueFd();
}

} // namespace

ScratchFolder::ScratchFolder() {
    // Keeps a sweep away until the folder has its lock.
    const StateLock making;
    if (!making) {
        return;
    }
    const auto parent = scratchParent();
    std::error_code error;
    std::filesystem::create_directories(parent, error);
    std::string pattern = (parent / (std::string(scratchPrefix) + "XXXXXX")).string();
    if (mkdtemp(pattern.data()) == nullptr) {
        fail(ErrorNumber::store,
             "No folder can be made in " + parent.string() + ": " + std::strerror(errno) + ".");
        return;
    }
    path_ = pattern;
    lock_ = lockedFolder(path_);
}

ScratchFolder::~ScratchFolder() {
    if (!path_.empty()) {
        std::error_code error;
        std::filesystem::remove_all(path_, error);
    }
}

void sweepScratchFolders() {
    const StateLock nobodyMakesOne;
    if (!nobodyMakesOne) {
        return;
    }
    std::error_code error;
    std::vector<std::filesystem::path> abandoned;
    for (const auto& entry : std::filesystem::directory_iterator(scratchParent(), error)) {
        if (entry.path().filename().string().starts_with(scratchPrefix) && lockedFolder(entry.path())) {
            abandoned.push_back(entry.path());
        }
    }
    for (const auto& folder : abandoned) {
        std::filesystem::remove_all(folder, error);
    }
}

int runDaemonTest(const std::string& daemon, const std::vector<std::string>& arguments) {
    const auto result = runProcess(arguments);
    if (result.exitCode == 0) {
        return 0;
    }
    std::string words = lastWords(result.errors);
    if (words.empty()) {
        words = "it ended with " + std::to_string(result.exitCode);
    }
    return fail(ErrorNumber::daemon, "The " + daemon + " daemon refuses its configuration: " + words + ".");
}

} // namespace velt
