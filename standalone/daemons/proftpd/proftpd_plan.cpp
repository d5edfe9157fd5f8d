#include "standalone/daemons/proftpd/proftpd_plan.h"

#include "base/file.h"
#include "base/sha256.h"
#include "standalone/core/scratch_folder.h"
#include "standalone/core/state_lock.h"
#include "standalone/daemons/daemon_configuration.h"
#include "standalone/daemons/proftpd/proftpd_surroundings.h"
#include "standalone/daemons/proftpd/session_rights.h"
#include "standalone/daemons/tested_configurations.h"

#include <sys/stat.h>

#include <utility>
#include <vector>

namespace velt {
namespace {

constexpr const char* program = "/usr/sbin/proftpd";

Result<> makeDaemonFolder(const ProftpdPlaces& places) {
    const auto folder = places.runFolder / daemonFolder;
    VELT_RETURN_IF_ERROR(makeFolder(folder));
    return ::chmod(folder.c_str(), 0700) == 0 ? Result<>() : cannot("make the folder", folder);
}

// The same text, but for the files that the daemon would write: its test writes some of them, too.
Result<> runTest(const FtpSettings& settings, ProftpdPlaces places) {
    VELT_ASSIGN_OR_RETURN(const auto scratch, ScratchFolder::make());
    places.runFolder = scratch.path();
    VELT_RETURN_IF_ERROR(makeDaemonFolder(places));
    const auto configuration = scratch.path() / "proftpd.conf";
    VELT_RETURN_IF_ERROR(replaceFile(configuration, renderProftpd(settings, places), 0600));
    return runConfigurationTest("FTP", {program, "-t", "-c", configuration.string()});
}

// Sessions walk through it as the user who logged in; nobody else may write there.
Result<> makePassableFolder(const std::filesystem::path& path) {
    VELT_RETURN_IF_ERROR(makeFolder(path));
    return ::chmod(path.c_str(), 0755) == 0 ? Result<>() : cannot("make the folder", path);
}

bool confinesAnonymous(const FtpSettings& settings) {
    return settings.record.anonymous != 0 && settings.record.anonymous_chroot != 0;
}

/// The files beside the configuration of which a daemon is made.
std::vector<std::filesystem::path> filesOf(const ProftpdPlaces& places) {
    return {program, places.moduleFolder / "mod_velt_login.so", "/usr/lib/proftpd/mod_tls.so"};
}

/// Stands for all that a daemon reads at its start and nowhere else.
std::string hashOf(const FtpSettings& settings, const FtpSurroundings& found) {
    std::string all = renderProftpd(settings, found.places);
    const std::string share = confinesAnonymous(settings) ? settings.record.anonymous_chroot_share : "";
    for (const std::string& part : {share, found.certificateFingerprint, identityOf(filesOf(found.places))}) {
        all += '\0' + part;
    }
    return sha256(all);
}

/// Returns the rendering's hash.
Result<std::string> testRendering(const FtpSettings& settings, const FtpSurroundings& found) {
    std::string hash = hashOf(settings, found);
    std::vector<std::filesystem::path> accounts; // which the daemon reads at each login, and its test now
    if (const auto& files = found.places.accountFiles) {
        accounts = {files->users, files->groups};
    }
    VELT_RETURN_IF_ERROR(
        testOnce(hash + identityOf(accounts), [&] { return runTest(settings, found.places); }));
    return hash;
}

Result<> writeSurroundings(const FtpSettings& settings, const ProftpdPlaces& places) {
    for (const auto& folder : {places.runFolder, places.loginRoot, places.anonymousShare.parent_path()}) {
        VELT_RETURN_IF_ERROR(makePassableFolder(folder));
    }
    VELT_RETURN_IF_ERROR(makeDaemonFolder(places));
    return confinesAnonymous(settings)
               ? replaceFile(places.anonymousShare, settings.record.anonymous_chroot_share, 0600)
               : Result<>();
}

Result<DaemonPlan> writePlan(const FtpSettings& settings, FtpSurroundings found, const std::string& hash) {
    const auto folder = found.places.runFolder / "configurations" / hash;
    found.places.anonymousShare = folder / "anonymous";
    found.places.configuration = hash;
    VELT_RETURN_IF_ERROR(writeSurroundings(settings, found.places));
    const auto configuration = folder / "proftpd.conf";
    VELT_RETURN_IF_ERROR(replaceFile(configuration, renderProftpd(settings, found.places), 0600));
    VELT_RETURN_IF_ERROR(storePlanSettings(folder, settings));
    // In the foreground, and with "-q" left out: the reason of a failed start then comes on standard error.
    DaemonOrder order{
        hash, {controlPort(settings.record)}, {program, "-n", "-c", configuration.string()}, true};
    return DaemonPlan{std::move(order), folder};
}

} // namespace

Result<std::string> testFtpCandidate(const FtpSettings& settings) {
    VELT_ASSIGN_OR_RETURN(const auto found, surveyFtp(settings));
    return testRendering(settings, found);
}

Result<std::optional<DaemonPlan>> planFtpDaemon() {
    VELT_ASSIGN_OR_RETURN(const auto lock, StateLock::take());
    VELT_ASSIGN_OR_RETURN(const auto settings, loadFtpSettings());
    if (!enablesFtp(settings.record)) {
        return std::nullopt;
    }
    VELT_RETURN_IF_ERROR(checkFtpSettings(settings));
    VELT_ASSIGN_OR_RETURN(const auto found, surveyFtp(settings));
    VELT_ASSIGN_OR_RETURN(const auto hash, testRendering(settings, found));
    VELT_ASSIGN_OR_RETURN(auto plan, writePlan(settings, found, hash));
    return plan;
}

} // namespace velt
