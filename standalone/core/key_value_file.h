// Text files of key=value lines, as other programs of the server keep them.
//
// A line is a comment ("# ..."), blank, or "key=value" with blanks around either part left out; a value may
// be in double quotes. Of two lines with the same key the last one counts. Any other line is somebody else's
// and is left alone.
#ifndef VELT_STANDALONE_CORE_KEY_VALUE_FILE_H
#define VELT_STANDALONE_CORE_KEY_VALUE_FILE_H

#include "base/result.h"

#include <filesystem>
#include <optional>
#include <string>
#include <string_view>

namespace velt {

/// The key's value; nothing when the key or the whole file is not there. Thread-safe.
Result<std::optional<std::string>> readKeyValue(const std::filesystem::path& file, std::string_view key);

/// Writes the key's value in the line where it stands, or in a new last line; all other bytes of the file
/// stay, and so does its mode (a new file gets 0644). Refuses a key other than
/// letters, digits, "_", "-" and ".", and a value with a control byte or of more than 4096 bytes. To be
/// called under the StateLock.
Result<> writeKeyValue(const std::filesystem::path& file, std::string_view key, std::string_view value);

} // namespace velt

#endif
