#include "standalone/login/access_report.h"

#include "base/text.h"
#include "standalone/accounts/user_directory.h"
#include "standalone/core/error_number.h"
#include "standalone/core/installed_files.h"
#include "standalone/core/state_root.h"
#include "standalone/core/systemd.h"
#include "standalone/process/last_words.h"
#include "standalone/process/run_program.h"

#include <unistd.h>

#include <vector>

namespace velt {
namespace {

constexpr std::chrono::seconds limit{20};

/// Under systemd this process sees mounts that are read-only for it alone, and may not open files the way
/// that the program does; a unit of its own sees what the services see.
std::vector<std::string> asTheServices() {
    if (geteuid() != 0 || !systemdKeepsSupervisors()) {
        return {};
    }
    return {"systemd-run", "--quiet", "--pipe", "--wait", "--collect", "--service-type=exec"};
}

} // namespace

Result<std::string> reportAccess(const std::string& user, const std::string& path) {
    if (!path.empty() && path.front() != '/') {
        return Error(ErrorNumber::invalid, "The path must be absolute.");
    }
    VELT_ASSIGN_OR_RETURN(const auto account, findUser(user));
    auto arguments = asTheServices();
    arguments.insert(arguments.end(),
                     {installedFile("velt-access").string(), statePath("/").string(), account.name});
    if (!path.empty()) {
        arguments.push_back(path);
    }
    auto result = runProcess(arguments, {}, limit);
    if (!result || result->exitCode != 0) {
        const bool said = result && !result->ranTooLong && !trimmed(result->errors).empty();
        return Error(ErrorNumber::invalid,
                     said ? std::string(trimmed(result->errors))
                          : "Cannot tell what " + account.name + " may see: " + reasonOfEnd(result) + ".");
    }
    return std::move(result->output);
}

} // namespace velt
