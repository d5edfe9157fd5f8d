#include "standalone/activity/activity_settings.h"
#include "standalone/bans/ban_settings.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_root.h"
#include "standalone/health/checks.h"
#include "standalone/health/mends.h"
#include "standalone/journal/log_retention.h"
#include "standalone/ports/known_services.h"
#include "standalone/settings/confinement_settings.h"
#include "standalone/settings/settings.h"

namespace velt {
namespace {

/// A finding where what was loaded cannot be used.
template<class Value>
void judge(std::string_view file, const char* subject, const Result<Value>& loaded,
           const std::string& consequence, Findings& findings) {
    if (!loaded) {
        findings.push_back({"settings-damaged", Severity::warning, subject,
                            loaded.error().message + " " + consequence, correct(statePath(file))});
    }
}

/// Values that can be read, so that they can be seen, but that no daemon takes. A file that cannot be read
/// is for the services to tell.
template<class Settings>
void judgeValues(std::string_view file, const char* subject, const std::string& service,
                 const Result<Settings>& settings, Result<> (*check)(const Settings&), Findings& findings) {
    const auto checked = settings ? check(*settings) : Result<>();
    if (!checked) {
        findings.push_back({"settings-refused", Severity::warning, subject,
                            checked.error().message + " " + service +
                                " cannot be started with this, and none of its settings can be changed.",
                            correct(statePath(file))});
    }
}

} // namespace

Findings settingsFileFindings() {
    Findings findings;
    judgeValues(paths::ftpSettings, "ftp", "FTP", loadFtpSettings(), checkFtpSettings, findings);
    judgeValues(paths::sftpSettings, "sftp", "SFTP", loadSftpSettings(), checkSftpSettings, findings);
    const std::string noChange = "No service can be started, and no setting of theirs can be changed.";
    judge(paths::networkSettings, "settings", loadNetworkSettings(), noChange, findings);
    judge(paths::confinementSettings, "sftp", loadConfinementSettings(), "SFTP cannot be started again.",
          findings);
    judge(paths::banSettings, "settings", loadBanSettings(),
          "Until then failed logins are counted as without this file.", findings);
    judge(paths::knownServices, "settings", loadKnownServices(), "No port of a service can be changed.",
          findings);
    judge(paths::activitySettings, "sessions", loadActivitySettings(),
          "No record of what sessions did is removed.", findings);
    judge(paths::logRetention, "log", loadRetention(), "No entry of the log is removed.", findings);
    return findings;
}

} // namespace velt
