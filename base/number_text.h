// Numbers as text.
#ifndef VELT_BASE_NUMBER_TEXT_H
#define VELT_BASE_NUMBER_TEXT_H

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace velt {

/// The decimal number that the text consists of: no sign but '-', no blanks. Nothing for any other text.
std::optional<std::int64_t> parseNumber(std::string_view text);

/// What is expected of a number: "a number from 0 to 65535"; "1" where only that is possible.
std::string numberText(std::int64_t least, std::int64_t most);

} // namespace velt

#endif
