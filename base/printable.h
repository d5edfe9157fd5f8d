// Texts that a terminal shows and does not obey.
#ifndef VELT_BASE_PRINTABLE_H
#define VELT_BASE_PRINTABLE_H

#include <string>
#include <string_view>

namespace velt {

/// The text with each control character as \xNN.
std::string printable(std::string_view text);

/// JSON as the library writes it, which escapes only the first set of control characters: the others become
/// \u00NN.
std::string printableJson(const std::string& json);

} // namespace velt

#endif
