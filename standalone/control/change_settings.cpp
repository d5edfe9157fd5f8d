#include "standalone/control/change_settings.h"

#include "standalone/control/follow_with_sftp.h"
#include "standalone/core/effects.h"
#include "standalone/core/key_value_file.h"
#include "standalone/core/paths.h"
#include "standalone/core/staged_files.h"
#include "standalone/core/state_lock.h"
#include "standalone/daemons/proftpd/proftpd_plan.h"
#include "standalone/daemons/sshd/sshd_plan.h"
#include "standalone/settings/confinement_settings.h"
#include "standalone/settings/settings_store.h"

#include <tuple>

namespace velt {

namespace {

// The daemon's own test needs what the daemon needs: its program, its account, shares that can be read. While
// the service is off, or is being switched off, settings can be changed without these; switching it on tests
// them all.
Result<> check(const FtpSettings& settings) {
    VELT_RETURN_IF_ERROR(checkFtpSettings(settings));
    if (enablesFtp(settings.record)) {
        VELT_ASSIGN_OR_RETURN([[maybe_unused]] const auto hash, testFtpCandidate(settings));
    }
    return {};
}

Result<> check(const SftpSettings& settings) {
    VELT_RETURN_IF_ERROR(checkSftpSettings(settings));
    if (settings.enabled) {
        VELT_ASSIGN_OR_RETURN(const auto confinement, loadConfinementSettings());
        VELT_ASSIGN_OR_RETURN([[maybe_unused]] const auto hash, testSftpCandidate(settings, confinement));
    }
    return {};
}

template<class Settings>
Result<> changeStored(Result<Settings> (&load)(), const std::function<void(Settings&)>& change,
                      const std::function<Result<>(const Settings&)>& store) {
    VELT_ASSIGN_OR_RETURN(const auto lock, StateLock::take());
    VELT_ASSIGN_OR_RETURN(Settings settings, load());
    change(settings);
    VELT_RETURN_IF_ERROR(check(settings));
    return store(settings);
}

Result<> storeExternalAddress(const FtpSettings& settings) {
    return perform(Effect::store, "external address", [&]() -> Result<> {
        VELT_ASSIGN_OR_RETURN(const auto file, storePath(paths::systemInformation));
        return writeKeyValue(file, externalAddressKey, settings.externalAddress);
    });
}

/// What of FTP's settings the configuration of SFTP follows from, too.
auto sharedWithSftp(const FtpSettings& settings) {
    return std::make_tuple(settings.umask, settings.fipsOnly);
}

} // namespace

Result<> changeFtpSettings(const std::function<void(FtpSettings&)>& change) {
    bool concernsSftp = false;
    const auto noted = [&](FtpSettings& settings) {
        const auto before = sharedWithSftp(settings);
        change(settings);
        concernsSftp = sharedWithSftp(settings) != before;
    };
    VELT_RETURN_IF_ERROR(changeStored<FtpSettings>(loadFtpSettings, noted, storeFtpSettings));
    return concernsSftp ? followWithSftp() : Result<>();
}

Result<> changeSftpSettings(const std::function<void(SftpSettings&)>& change) {
    return changeStored<SftpSettings>(loadSftpSettings, change, storeSftpSettings);
}

Result<> changeExternalAddress(const std::string& address) {
    VELT_RETURN_IF_ERROR(checkExternalAddress(address));
    const auto change = [&](FtpSettings& settings) { settings.externalAddress = address; };
    return changeStored<FtpSettings>(loadFtpFile, change, storeExternalAddress);
}

} // namespace velt
