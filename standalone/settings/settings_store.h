// The files of the stored settings.
#ifndef VELT_STANDALONE_SETTINGS_SETTINGS_STORE_H
#define VELT_STANDALONE_SETTINGS_SETTINGS_STORE_H

#include "standalone/settings/settings.h"

#include <string_view>

namespace velt {

/// The key of the external address in the system information file, which other programs use as well.
inline constexpr std::string_view externalAddressKey = "ftp_ext_ip";

/// The FTP settings without the external address, so that a damaged one can be read past and repaired; else
/// as loadFtpSettings.
Result<FtpSettings> loadFtpFile();

/// Writes the settings as they are: no check, no daemon asked. To be called under the StateLock.
Result<> storeFtpSettings(const FtpSettings& settings);
Result<> storeSftpSettings(const SftpSettings& settings);

} // namespace velt

#endif
