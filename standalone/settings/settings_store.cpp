#include "standalone/settings/settings_store.h"

#include "base/file.h"
#include "base/ipv4.h"
#include "standalone/core/effects.h"
#include "standalone/core/error_number.h"
#include "standalone/core/key_value_file.h"
#include "standalone/core/paths.h"
#include "standalone/core/state_lock.h"
#include "standalone/core/state_root.h"
#include "standalone/settings/settings_files.h"

#include <unistd.h>

#include <cstring>

namespace velt {

namespace {

constexpr mode_t settingsMode = 0644;

template<class Settings>
using Parse = Result<Settings> (*)(const std::string& name, std::string_view contents);

template<class Settings>
Result<Settings> loadFile(std::string_view name, Parse<Settings> parse, const Settings& defaults) {
    const auto path = statePath(name);
    const auto contents = readOptionalFile(path);
    if (!contents)
        return contents.error();
    return *contents ? parse(path.string(), **contents) : defaults;
}

Result<> storeFile(std::string_view subject, std::string_view name, const std::string& contents) {
    return perform(Effect::store, subject,
                   [&] { return replaceFile(statePath(name), contents, settingsMode); });
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
    const auto address = readKeyValue(file, externalAddressKey);
    if (!address)
        return address.error();
    settings->externalAddress = address->value_or("");
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
    const auto lock = StateLock::take();
    if (!lock)
        return lock.error();
    if (isMissing(paths::ftpSettings))
        if (Result<> stored = storeFtpSettings(defaultFtpSettings()); !stored)
            return stored;
    return isMissing(paths::sftpSettings) ? storeSftpSettings(SftpSettings()) : Result<>();
}

} // namespace velt
