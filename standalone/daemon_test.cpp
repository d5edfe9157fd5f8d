#include "standalone/daemon_test.h"

#include "standalone/core/last_error.h"
#include "standalone/core/process.h"
#include "standalone/core/state_root.h"
#include "standalone/supervise/last_words.h"

#include <cerrno>
#include <cstdlib>
#include <cstring>

namespace velt {

ScratchFolder::ScratchFolder() {
    const auto parent = statePath("/run/velt");
    std::error_code error;
    std::filesystem::create_directories(parent, error);
    std::string pattern = (parent / "test.XXXXXX").string();
    if (mkdtemp(pattern.data()) == nullptr) {
        fail(ErrorNumber::store,
             "No folder can be made in " + parent.string() + ": " + std::strerror(errno) + ".");
        return;
    }
    path_ = pattern;
}

ScratchFolder::~ScratchFolder() {
    if (!path_.empty()) {
        std::error_code error;
        std::filesystem::remove_all(path_, error);
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
