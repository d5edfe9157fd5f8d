#include "standalone/daemons/sshd/sshd_plan.h"

#include "base/file.h"
#include "base/sha256.h"
#include "standalone/accounts/user_directory.h"
#include "standalone/core/error_number.h"
#include "standalone/core/installed_files.h"
#include "standalone/core/paths.h"
#include "standalone/core/scratch_folder.h"
#include "standalone/core/state_lock.h"
#include "standalone/core/state_root.h"
#include "standalone/daemons/daemon_configuration.h"
#include "standalone/daemons/sshd/confinement.h"
#include "standalone/daemons/sshd/host_keys.h"
#include "standalone/daemons/sshd/sshd_configuration.h"
#include "standalone/daemons/tested_configurations.h"
#include "standalone/settings/settings_store.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <iterator>
#include <utility>
#include <vector>

namespace velt {
namespace {

// The daemon starts itself again for each connection and needs its absolute path for that.
constexpr const char* program = "/usr/sbin/sshd";

// The daemon has this folder's place built in, so it does not follow the state root; it only has to be there.
Result<> makeSeparationFolder() {
    if (geteuid() != 0 || mkdir("/run/sshd", 0755) == 0 || errno == EEXIST) {
        return {};
    }
    return Error(ErrorNumber::daemon,
                 std::string("Cannot make the folder /run/sshd: ") + std::strerror(errno) + ".");
}

Result<std::string> ownUser() {
    if (geteuid() == 0) {
        return std::string("root");
    }
    const auto user = userById(geteuid());
    if (!user || !isPlainName(user->name)) {
        return Error(ErrorNumber::invalid, "The SFTP daemon cannot run as the user of this process.");
    }
    return user->name;
}

/// A configuration and what it names.
struct Rendering {
    std::string text;
    HostKeys keys;
    std::vector<std::string> environment; ///< of the daemon, as arguments of env(1)
};

Result<Rendering> render(const SftpSettings& settings, const ConfinementSettings& confined) {
    VELT_RETURN_IF_ERROR(makeSeparationFolder());
    VELT_ASSIGN_OR_RETURN(auto keys, hostKeys());
    VELT_RETURN_IF_ERROR(checkRenderable(keys.files.front(), statePath("/")));
    VELT_RETURN_IF_ERROR(checkRenderable(statePath("/"), statePath("/"))); // the keys may be elsewhere
    const auto keysProgram = installedFile("velt-authorized-keys");
    VELT_RETURN_IF_ERROR(checkRenderable(keysProgram, keysProgram.parent_path()));
    VELT_ASSIGN_OR_RETURN(const auto user, ownUser());
    VELT_ASSIGN_OR_RETURN(const auto network, loadNetworkSettings());
    VELT_ASSIGN_OR_RETURN(const auto ftp, loadFtpFile());
    VELT_ASSIGN_OR_RETURN(auto confinement, prepareConfinement(confined));
    std::string text = renderSshd(settings, {ftp.umask, ftp.fipsOnly},
                                  {keys.files, keysProgram, statePath("/"), user, geteuid() == 0,
                                   network.loopbackOnly, confinement.root});
    return Rendering{std::move(text), std::move(keys), std::move(confinement.environment)};
}

Result<> runTest(const Rendering& rendering) {
    if (!rendering.environment.empty()) {
        VELT_RETURN_IF_ERROR(checkCoverage());
    }
    VELT_ASSIGN_OR_RETURN(const auto scratch, ScratchFolder::make());
    const auto configuration = scratch.path() / "sshd_config";
    VELT_RETURN_IF_ERROR(replaceFile(configuration, rendering.text, 0600));
    return runConfigurationTest("SFTP", {program, "-t", "-f", configuration.string()});
}

/// Stands for all that the daemon reads at its start.
std::string hashOf(const Rendering& rendering) {
    std::vector<std::filesystem::path> files = rendering.keys.files;
    files.emplace_back(program);
    std::string all = rendering.text;
    if (!rendering.environment.empty()) {
        std::ranges::move(filesOfConfinement(), std::back_inserter(files));
    }
    for (const std::string& variable : rendering.environment) {
        all += '\0' + variable;
    }
    return sha256(all + '\0' + identityOf(files));
}

/// Returns the rendering's hash.
Result<std::string> testRendering(const Rendering& rendering) {
    std::string hash = hashOf(rendering);
    VELT_RETURN_IF_ERROR(testOnce(hash, [&] { return runTest(rendering); }));
    return hash;
}

std::vector<std::string> commandLine(const Rendering& rendering, const std::string& hash,
                                     const std::filesystem::path& configuration) {
    std::vector<std::string> words;
    if (!rendering.environment.empty()) {
        words.emplace_back("/usr/bin/env");
        std::ranges::copy(rendering.environment, std::back_inserter(words));
        words.push_back("VELT_SESSION_CONFIGURATION=" + hash);
    }
    words.insert(words.end(), {program, "-D", "-e", "-f", configuration.string()});
    return words;
}

} // namespace

Result<std::string> testSftpCandidate(const SftpSettings& settings, const ConfinementSettings& confinement) {
    VELT_ASSIGN_OR_RETURN(const auto rendering, render(settings, confinement));
    return testRendering(rendering);
}

Result<std::optional<DaemonPlan>> planSftpDaemon() {
    VELT_ASSIGN_OR_RETURN(const auto lock, StateLock::take());
    VELT_ASSIGN_OR_RETURN(const auto settings, loadSftpSettings());
    VELT_RETURN_IF_ERROR(checkSftpSettings(settings));
    VELT_ASSIGN_OR_RETURN(const auto confinement, loadConfinementSettings());
    VELT_ASSIGN_OR_RETURN(const auto rendering, render(settings, confinement));
    VELT_ASSIGN_OR_RETURN(const auto hash, testRendering(rendering));
    const auto folder = statePath(paths::sftpConfigurations) / hash;
    const auto configuration = folder / "sshd_config";
    VELT_RETURN_IF_ERROR(replaceFile(configuration, rendering.text, 0600));
    return DaemonPlan{{hash, {settings.port}, commandLine(rendering, hash, configuration)}, folder};
}

} // namespace velt
