#include "standalone/settings/settings_store.h"

#include "base/file.h"
#include "base/ipv4.h"
#include "standalone/core/effects.h"
#include "standalone/core/error_number.h"
#include "standalone/core/key_value_file.h"
#include "standalone/core/paths.h"
#include "standalone/core/staged_files.h"
#include "standalone/core/state_lock.h"
#include "standalone/core/state_root.h"
#include "standalone/settings/settings_files.h"

namespace velt {

namespace {

constexpr mode_t settingsMode = 0644;

template<class Settings>
Result<Settings> loadFile(std::string_view name, const SettingsFile<Settings>& form) {
    VELT_ASSIGN_OR_RETURN(StrictFile file, StrictFile::load(statePath(name), {form.version}));
    return readSettings(form, file);
}

Result<> storeFile(std::string_view subject, std::string_view name, const std::string& contents) {
    return perform(Effect::store, subject, [&]() -> Result<> {
        VELT_ASSIGN_OR_RETURN(const auto place, storePath(name));
        return replaceFile(place, contents, settingsMode);
    });
}

} // namespace

Result<FtpSettings> loadFtpFile() {
    return loadFile(paths::ftpSettings, ftpSettingsFile());
}

Result<FtpSettings> loadFtpSettings() {
    VELT_ASSIGN_OR_RETURN(FtpSettings settings, loadFtpFile());
    const auto file = statePath(paths::systemInformation);
    VELT_ASSIGN_OR_RETURN(const auto address, readKeyValue(file, externalAddressKey));
    settings.externalAddress = address.value_or("");
    if (!settings.externalAddress.empty() && !parseIPv4(settings.externalAddress))
        return Error(ErrorNumber::damaged,
                     "Cannot read " + file.string() + ": ftp_ext_ip: expected an IPv4 address.");
    return settings;
}

Result<SftpSettings> loadSftpSettings() {
    return loadFile(paths::sftpSettings, sftpSettingsFile());
}

Result<NetworkSettings> loadNetworkSettings() {
    VELT_ASSIGN_OR_RETURN(StrictFile file, StrictFile::load(statePath(paths::networkSettings)));
    NetworkSettings settings;
    settings.loopbackOnly = file.boolean("loopback_only", settings.loopbackOnly);
    VELT_RETURN_IF_ERROR(file.finish());
    return settings;
}

Result<> storeFtpSettings(const FtpSettings& settings) {
    return storeFile("ftp settings", paths::ftpSettings, formatSettings(ftpSettingsFile(), settings));
}

Result<> storeSftpSettings(const SftpSettings& settings) {
    return storeFile("sftp settings", paths::sftpSettings, formatSettings(sftpSettingsFile(), settings));
}

Result<> writeMissingSettings() {
    VELT_ASSIGN_OR_RETURN(const auto lock, StateLock::take());
    VELT_ASSIGN_OR_RETURN(const bool hasFtp, isThere(statePath(paths::ftpSettings)));
    if (!hasFtp)
        VELT_RETURN_IF_ERROR(storeFtpSettings(defaultFtpSettings()));
    VELT_ASSIGN_OR_RETURN(const bool hasSftp, isThere(statePath(paths::sftpSettings)));
    return hasSftp ? Result<>() : storeSftpSettings(defaultSftpSettings());
}

} // namespace velt
