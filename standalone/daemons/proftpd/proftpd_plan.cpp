#include "standalone/daemons/proftpd/proftpd_plan.h"

#include "base/file.h"
#include "base/sha256.h"
#include "standalone/core/error_number.h"
#include "standalone/core/scratch_folder.h"
#include "standalone/core/state_lock.h"
#include "standalone/daemons/daemon_configuration.h"
#include "standalone/daemons/proftpd/proftpd_surroundings.h"
#include "standalone/login/session_mounts.h"
#include "standalone/rules/rule_store.h"

namespace velt {
namespace {

constexpr const char* program = "/usr/sbin/proftpd";

// The same text, but for the files that the daemon would write: its test writes some of them, too.
Result<> testRendering(const FtpSettings& settings, ProftpdPlaces places) {
    const auto scratch = ScratchFolder::make();
    if (!scratch) {
        return scratch.error();
    }
    places.runFolder = scratch->path();
    const auto configuration = scratch->path() / "proftpd.conf";
    if (auto written = replaceFile(configuration, renderProftpd(settings, places), 0600); !written) {
        return written;
    }
    return runConfigurationTest("FTP", {program, "-t", "-c", configuration.string()});
}

Result<> makeFolder(const std::filesystem::path& path) {
    std::error_code error;
    std::filesystem::create_directories(path, error);
    if (!error) {
        // Sessions walk through them as the user who logged in; nobody else may write there.
        std::filesystem::permissions(path, std::filesystem::perms(0755), error);
    }
    if (error) {
        return Error(ErrorNumber::store,
                     "Cannot make the folder " + path.string() + ": " + error.message() + ".");
    }
    return {};
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

Result<> writeSurroundings(const FtpSettings& settings, const ProftpdPlaces& places) {
    for (const auto& folder : {places.runFolder, places.loginRoot, places.anonymousShare.parent_path()}) {
        if (auto made = makeFolder(folder); !made) {
            return made;
        }
    }
    if (auto rules = makeRulesFile(); !rules) {
        return rules;
    }
    return confinesAnonymous(settings)
               ? replaceFile(places.anonymousShare, settings.record.anonymous_chroot_share, 0600)
               : Result<>();
}

Result<DaemonPlan> writePlan(const FtpSettings& settings, FtpSurroundings found) {
    const std::string hash = hashOf(settings, found);
    const auto folder = found.places.runFolder / "configurations" / hash;
    found.places.anonymousShare = folder / "anonymous";
    if (const auto written = writeSurroundings(settings, found.places); !written) {
        return written.error();
    }
    const auto configuration = folder / "proftpd.conf";
    if (const auto written = replaceFile(configuration, renderProftpd(settings, found.places), 0600);
        !written) {
        return written.error();
    }
    // In the foreground, and with "-q" left out: the reason of a failed start then comes on standard error.
    return DaemonPlan{{hash, {controlPort(settings.record)}, {program, "-n", "-c", configuration.string()}},
                      folder};
}

} // namespace

Result<> testFtpCandidate(const FtpSettings& settings) {
    const auto found = surveyFtp(settings);
    return found ? testRendering(settings, found->places) : found.error();
}

Result<std::optional<DaemonPlan>> planFtpDaemon() {
    const auto lock = StateLock::take();
    if (!lock) {
        return lock.error();
    }
    const auto settings = loadFtpSettings();
    if (!settings) {
        return settings.error();
    }
    if (!enablesFtp(settings->record)) {
        return std::nullopt;
    }
    if (const auto checked = checkFtpSettings(*settings); !checked) {
        return checked.error();
    }
    const auto found = surveyFtp(*settings);
    if (!found) {
        return found.error();
    }
    if (const auto tested = testRendering(*settings, found->places); !tested) {
        return tested.error();
    }
    // Else the daemon would start well, and refuse every login.
    if (const auto mounts = found->places.accountFiles ? Result<>() : checkSessionMounts(); !mounts) {
        return mounts.error();
    }
    auto plan = writePlan(*settings, *found);
    if (!plan) {
        return plan.error();
    }
    return std::move(*plan);
}

} // namespace velt
