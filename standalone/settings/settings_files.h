// The settings files as text. Pure functions: no file is read or written here.
#ifndef VELT_STANDALONE_SETTINGS_SETTINGS_FILES_H
#define VELT_STANDALONE_SETTINGS_SETTINGS_FILES_H

#include "base/result.h"
#include "standalone/settings/settings.h"

#include <string>
#include <string_view>

namespace velt {

inline constexpr std::string_view externalAddressKey = "ftp_ext_ip";

/// The text of the FTP settings file: every byte of the record, and the settings beside it. The external
/// address stands in the system information file, not here.
std::string formatFtpSettings(const FtpSettings& settings);

/// Reads what formatFtpSettings wrote; errors name the file by `name`, and the line. The external address
/// stays empty.
Result<FtpSettings> parseFtpSettings(const std::string& name, std::string_view contents);

std::string formatSftpSettings(const SftpSettings& settings);
Result<SftpSettings> parseSftpSettings(const std::string& name, std::string_view contents);

} // namespace velt

#endif
