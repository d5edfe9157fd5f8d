#include "standalone/settings/settings_store.h"

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
std::optional<Settings> loadFile(std::string_view name, Parse<Settings> parse, const Settings& defaults) {
    const auto path = statePath(name);
    const auto contents = readFile(path);
    if (contents) {
        if (Result<Settings> settings = parse(path.string(), *contents))
            return *settings;
        else
            fail(settings.error());
        return std::nullopt;
    }
    if (errno == ENOENT)
        return defaults;
    fail(ErrorNumber::store, "Cannot read " + path.string() + ": " + std::strerror(errno) + ".");
    return std::nullopt;
}

int storeFile(std::string_view subject, std::string_view name, const std::string& contents) {
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

std::optional<FtpSettings> loadFtpFile() {
    return loadFile<FtpSettings>(paths::ftpSettings, parseFtpSettings, defaultFtpSettings());
}

std::optional<FtpSettings> loadFtpSettings() {
    auto settings = loadFtpFile();
    if (!settings)
        return std::nullopt;
    const auto file = statePath(paths::systemInformation);
    if (readKeyValue(file, externalAddressKey, settings->externalAddress) < 0)
        return std::nullopt;
    if (!settings->externalAddress.empty() && !isIPv4Address(settings->externalAddress)) {
        fail(ErrorNumber::damaged, "File " + file.string() + ": the value of ftp_ext_ip is no IPv4 address.");
        return std::nullopt;
    }
    return settings;
}

std::optional<SftpSettings> loadSftpSettings() {
    return loadFile<SftpSettings>(paths::sftpSettings, parseSftpSettings, SftpSettings());
}

int storeFtpSettings(const FtpSettings& settings) {
    return storeFile("ftp settings", paths::ftpSettings, formatFtpSettings(settings));
}

int storeSftpSettings(const SftpSettings& settings) {
    return storeFile("sftp settings", paths::sftpSettings, formatSftpSettings(settings));
}

int writeMissingSettings() {
    const StateLock lock;
    if (!lock)
        return -1;
    if (isMissing(paths::ftpSettings) && storeFtpSettings(defaultFtpSettings()) < 0)
        return -1;
    return isMissing(paths::sftpSettings) ? storeSftpSettings(SftpSettings()) : 0;
}

} // namespace velt
