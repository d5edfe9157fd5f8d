// Texts that a terminal shows and does not obey.
#ifndef VELT_BASE_PRINTABLE_H
#define VELT_BASE_PRINTABLE_H

#include <string>
#include <string_view>

namespace velt {

/// The text with each control character, and each byte that is not part of UTF-8, as \xNN, and each one that
/// would break the line or turn the direction of what follows as \u20NN.
std::string printable(std::string_view text);

/// JSON as the library writes it, which escapes only the first set of control characters: the others become
/// \u00NN, and those of direction \u20NN.
std::string printableJson(const std::string& json);

} // namespace velt

#endif
