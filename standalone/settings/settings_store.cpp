#include "standalone/settings/settings_store.h"

#include "base/ipv4.h"
#include "standalone/core/effects.h"
#include "standalone/core/file_store.h"
#include "standalone/core/key_value_file.h"
#include "standalone/core/last_error.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_lock.h"
#include "standalone/core/state_root.h"
#include "standalone/settings/settings_files.h"

#include <unistd.h>

#include <cerrno>
#include <cstring>

namespace velt {

namespace {

constexpr mode_t settingsMode = 0644;

template<class Settings>
using Parse = Result<Settings> (*)(const std::string& name, std::string_view contents);

template<class Settings>
Result<Settings> loadFile(std::string_view name, Parse<Settings> parse, const Settings& defaults) {
    const auto path = statePath(name);
    if (const auto contents = readFile(path))
        return parse(path.string(), *contents);
    if (errno == ENOENT)
        return defaults;
    return Error(ErrorNumber::store, "Cannot read " + path.string() + ": " + std::strerror(errno) + ".");
}

Result<> storeFile(std::string_view subject, std::string_view name, const std::string& contents) {
    return perform(Effect::store, subject, [&]() -> Result<> {
        if (replaceFile(statePath(name), contents, settingsMode) < 0)
            return lastErrorAsValue();
        return {};
    });
}

bool isMissing(std::string_view name) {
    return ::access(statePath(name).c_str(), F_OK) != 0;
}

} // namespace

FtpSettings defaultFtpSettings() {
    FtpSettings settings;
    std::strcpy(settings.record.portnum, "21");
    settings.record.support_utf8 = 1;
    return settings;
}

Result<FtpSettings> loadFtpFile() {
    return loadFile<FtpSettings>(paths::ftpSettings, parseFtpSettings, defaultFtpSettings());
}

Result<FtpSettings> loadFtpSettings() {
    Result<FtpSettings> settings = loadFtpFile();
    if (!settings)
        return settings;
    const auto file = statePath(paths::systemInformation);
    if (readKeyValue(file, externalAddressKey, settings->externalAddress) < 0)
        return lastErrorAsValue();
    if (!settings->externalAddress.empty() && !parseIPv4(settings->externalAddress))
        return Error(ErrorNumber::damaged,
                     "File " + file.string() + ": the value of ftp_ext_ip is no IPv4 address.");
    return settings;
}

Result<SftpSettings> loadSftpSettings() {
    return loadFile<SftpSettings>(paths::sftpSettings, parseSftpSettings, SftpSettings());
}

Result<> storeFtpSettings(const FtpSettings& settings) {
    return storeFile("ftp settings", paths::ftpSettings, formatFtpSettings(settings));
}

Result<> storeSftpSettings(const SftpSettings& settings) {
    return storeFile("sftp settings", paths::sftpSettings, formatSftpSettings(settings));
}

Result<> writeMissingSettings() {
    const StateLock lock;
    if (!lock)
        return lastErrorAsValue();
    if (isMissing(paths::ftpSettings))
        if (Result<> stored = storeFtpSettings(defaultFtpSettings()); !stored)
            return stored;
    return isMissing(paths::sftpSettings) ? storeSftpSettings(SftpSettings()) : Result<>();
}

} // namespace velt
