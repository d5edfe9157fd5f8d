// The settings files as text. Pure functions: no file is read or written here.
#ifndef VELT_STANDALONE_SETTINGS_SETTINGS_FILES_H
#define VELT_STANDALONE_SETTINGS_SETTINGS_FILES_H

#include "standalone/settings/settings.h"

#include <optional>
#include <string>
#include <string_view>

namespace velt {

inline constexpr std::string_view externalAddressKey = "ftp_ext_ip";

/// The text of the FTP settings file: every byte of the record, and the settings beside it. The external
/// address stands in the system information file, not here.
std::string formatFtpSettings(const FtpSettings& settings);

/// Reads what formatFtpSettings wrote; nothing, with the last error naming `file` and the line, when the text
/// does not have that form. The external address stays empty.
std::optional<FtpSettings> parseFtpSettings(const std::string& file, std::string_view contents);

std::string formatSftpSettings(const SftpSettings& settings);
std::optional<SftpSettings> parseSftpSettings(const std::string& file, std::string_view contents);

} // namespace velt

#endif
