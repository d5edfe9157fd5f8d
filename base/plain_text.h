// Telling text that can be shown and stored in one line from bytes that cannot.
#ifndef VELT_BASE_PLAIN_TEXT_H
#define VELT_BASE_PLAIN_TEXT_H

#include <cstddef>
#include <string>
#include <string_view>

namespace velt {

/// Whether the text is valid UTF-8 without control characters and line or paragraph separators.
bool isPlainText(std::string_view text);

/// The text with each byte or character that is not plain text replaced by U+FFFD, cut after a whole
/// character to at most `limit` bytes, of which the last are then an ellipsis. `limit` is 3 at least.
std::string plainText(std::string_view text, std::size_t limit);

} // namespace velt

#endif
