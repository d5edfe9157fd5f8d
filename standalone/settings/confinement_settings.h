// Which services hold their users to the rules and shares, beside FTP, which always does.
#ifndef VELT_STANDALONE_SETTINGS_CONFINEMENT_SETTINGS_H
#define VELT_STANDALONE_SETTINGS_CONFINEMENT_SETTINGS_H

#include "base/result.h"

namespace velt {

struct ConfinementSettings {
    bool sftp = false; ///< a login over SFTP sees what the same login over FTP sees

    bool operator==(const ConfinementSettings&) const = default;
};

/// The settings of the file
///
///     version = 1
///     sftp = 1
///
/// or the defaults without a file, as servers have it that were installed before there was one. Thread-safe.
Result<ConfinementSettings> loadConfinementSettings();

/// To be called under the StateLock.
Result<> storeConfinementSettings(const ConfinementSettings& settings);

} // namespace velt

#endif
