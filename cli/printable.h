// Texts that a terminal shows and does not obey.
#ifndef VELT_CLI_PRINTABLE_H
#define VELT_CLI_PRINTABLE_H

#include <string>

namespace velt::cli {

/// The text with each control character as \xNN.
std::string printable(const std::string& text);

/// JSON as the library writes it, which escapes only the first set of control characters: the others become
/// \u00NN.
std::string printableJson(const std::string& json);

} // namespace velt::cli

#endif
