// The settings files as text. Pure: no file is read or written here.
#ifndef VELT_STANDALONE_SETTINGS_SETTINGS_FILES_H
#define VELT_STANDALONE_SETTINGS_SETTINGS_FILES_H

#include "base/result.h"
#include "standalone/core/strict_file.h"
#include "standalone/settings/settings_fields.h"

#include <string>

namespace velt {

/// The settings with every value at its default.
template<class Settings> Settings defaultSettings(const SettingsFile<Settings>& form);

/// The text of the settings file: every byte of every field, each below what an administrator wants to know
/// of it. The external address is not in it, but in the system information file.
template<class Settings> std::string formatSettings(const SettingsFile<Settings>& form, Settings settings);

/// Reads what formatSettings wrote in this version or an earlier one. The external address stays empty.
template<class Settings> Result<Settings> readSettings(const SettingsFile<Settings>& form, StrictFile& file);

} // namespace velt

#endif
