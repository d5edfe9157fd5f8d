#include "standalone/control/change_settings.h"

#include "standalone/core/effects.h"
#include "standalone/core/key_value_file.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_lock.h"
#include "standalone/core/state_root.h"
#include "standalone/daemons/candidate.h"
#include "standalone/settings/settings_files.h"
#include "standalone/settings/settings_store.h"

namespace velt {

namespace {

// The daemon's test needs what the daemon needs: its program, its account, shares that can be read. Settings
// that switch a service off, or are changed while it is off, must not fail for the want of these; switching
// it on tests them all.
int testIfOn(const FtpSettings& settings) {
    return enablesFtp(settings.record) ? testFtpCandidate(settings) : 0;
}

int testIfOn(const SftpSettings& settings) {
    return settings.enabled ? testSftpCandidate(settings) : 0;
}

} // namespace

int changeFtpSettings(const std::function<void(FtpSettings&)>& change) {
    const StateLock lock;
    if (!lock)
        return -1;
    auto settings = loadFtpSettings();
    if (!settings)
        return -1;
    change(*settings);
    if (checkFtpSettings(*settings) < 0 || testIfOn(*settings) < 0)
        return -1;
    return storeFtpSettings(*settings);
}

int changeSftpSettings(const std::function<void(SftpSettings&)>& change) {
    const StateLock lock;
    if (!lock)
        return -1;
    auto settings = loadSftpSettings();
    if (!settings)
        return -1;
    change(*settings);
    if (checkSftpSettings(*settings) < 0 || testIfOn(*settings) < 0)
        return -1;
    return storeSftpSettings(*settings);
}

int changeExternalAddress(const std::string& address) {
    const StateLock lock;
    if (!lock)
        return -1;
    auto settings = loadFtpFile();
    if (!settings)
        return -1;
    settings->externalAddress = address;
    if (checkFtpSettings(*settings) < 0 || testIfOn(*settings) < 0)
        return -1;
    return perform(Effect::store, "external address", [&] {
        return writeKeyValue(statePath(paths::systemInformation), externalAddressKey, address);
    });
}

} // namespace velt
