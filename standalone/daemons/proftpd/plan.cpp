#include "standalone/daemons/daemon_plan.h"

#include "base/file.h"
#include "base/sha256.h"
#include "standalone/core/boundary.h"
#include "standalone/core/last_error.h"
#include "standalone/core/state_lock.h"
#include "standalone/daemons/candidate.h"
#include "standalone/daemons/configuration_test.h"
#include "standalone/daemons/proftpd/places.h"
#include "standalone/login/session_mounts.h"
#include "standalone/rules/rule_store.h"

namespace velt {
namespace {

constexpr const char* program = "/usr/sbin/proftpd";

// The same text, but for the files that the daemon would write: its test writes some of them, too.
int testRendering(const FtpSettings& settings, ProftpdPlaces places) {
    const ScratchFolder scratch;
    if (!scratch) {
        return -1;
    }
    places.runFolder = scratch.path();
    const auto configuration = scratch.path() / "proftpd.conf";
    if (toContract(replaceFile(configuration, renderProftpd(settings, places), 0600)) < 0) {
        return -1;
    }
    return runDaemonTest("FTP", {program, "-t", "-c", configuration.string()});
}

int makeFolder(const std::filesystem::path& path) {
    std::error_code error;
    std::filesystem::create_directories(path, error);
    if (!error) {
        // Sessions walk through them as the user who logged in; nobody else may write there.
        std::filesystem::permissions(path, std::filesystem::perms(0755), error);
    }
    return error ? fail(ErrorNumber::store,
                        "The folder " + path.string() + " cannot be made: " + error.message() + ".")
                 : 0;
}

bool confinesAnonymous(const FtpSettings& settings) {
    return settings.record.anonymous != 0 && settings.record.anonymous_chroot != 0;
}

/// Stands for all that a daemon reads at its start and nowhere else.
std::string hashOf(const FtpSettings& settings, const FtpSurroundings& found) {
    std::string all = renderProftpd(settings, found.places);
    const std::string share = confinesAnonymous(settings) ? settings.record.anonymous_chroot_share : "";
    for (const std::string& part : {share, found.certificateFingerprint}) {
        all += '\0' + part;
    }
    return sha256(all);
}

int writeSurroundings(const FtpSettings& settings, const ProftpdPlaces& places) {
    if (makeFolder(places.runFolder) < 0 || makeFolder(places.loginRoot) < 0 ||
        makeFolder(places.anonymousShare.parent_path()) < 0 || toContract(makeRulesFile()) < 0) {
        return -1;
    }
    return confinesAnonymous(settings)
               ? toContract(replaceFile(places.anonymousShare, settings.record.anonymous_chroot_share, 0600))
               : 0;
}

std::optional<DaemonPlan> writePlan(const FtpSettings& settings, FtpSurroundings found) {
    DaemonPlan plan;
    plan.configurationHash = hashOf(settings, found);
    plan.folder = found.places.runFolder / "configurations" / plan.configurationHash;
    found.places.anonymousShare = plan.folder / "anonymous";
    const auto configuration = plan.folder / "proftpd.conf";
    if (writeSurroundings(settings, found.places) < 0 ||
        toContract(replaceFile(configuration, renderProftpd(settings, found.places), 0600)) < 0) {
        return std::nullopt;
    }
    // In the foreground, and with "-q" left out: the reason of a failed start then comes on standard error.
    plan.arguments = {program, "-n", "-c", configuration.string()};
    plan.executable = program;
    plan.listenPorts = {controlPort(settings.record)};
    return plan;
}

} // namespace

int testFtpCandidate(const FtpSettings& settings) {
    const auto found = surveyFtp(settings);
    return found ? testRendering(settings, found->places) : -1;
}

std::optional<DaemonPlan> planFtpDaemon() {
    const StateLock lock;
    const auto settings = lock ? orLastError(loadFtpSettings()) : std::nullopt;
    if (!settings) {
        return std::nullopt;
    }
    if ((settings->record.service_flags & (VELT_FTP_SERVICE_PLAIN | VELT_FTP_SERVICE_TLS)) == 0) {
        fail(ErrorNumber::invalid, "Neither FTP nor FTPS is enabled.");
        return std::nullopt;
    }
    const auto found = toContract(checkFtpSettings(*settings)) < 0 ? std::nullopt : surveyFtp(*settings);
    if (!found || testRendering(*settings, found->places) < 0) {
        return std::nullopt;
    }
    // Else the daemon would start well, and refuse every login.
    if (!found->places.accountFiles && toContract(checkSessionMounts()) < 0) {
        return std::nullopt;
    }
    return writePlan(*settings, *found);
}

} // namespace velt
