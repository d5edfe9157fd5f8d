// The files of the stored settings.
#ifndef VELT_STANDALONE_SETTINGS_SETTINGS_STORE_H
#define VELT_STANDALONE_SETTINGS_SETTINGS_STORE_H

#include "standalone/settings/settings.h"

#include <optional>

namespace velt {

/// The FTP settings without the external address, so that a damaged one can be read past and repaired; else
/// as loadFtpSettings.
std::optional<FtpSettings> loadFtpFile();

/// Writes the settings down as they are: no check, no daemon asked. To be called under the StateLock.
/// Negative on failure, with the last error set.
int storeFtpSettings(const FtpSettings& settings);
int storeSftpSettings(const SftpSettings& settings);

} // namespace velt

#endif
