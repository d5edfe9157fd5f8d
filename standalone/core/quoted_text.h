// Any bytes as one line of readable text in double quotes.
#ifndef VELT_STANDALONE_CORE_QUOTED_TEXT_H
#define VELT_STANDALONE_CORE_QUOTED_TEXT_H

#include <optional>
#include <string>
#include <string_view>

namespace velt {

/// The text in double quotes, with \" \\ and \xHH for what is not printable UTF-8.
std::string quotedText(std::string_view text);

/// Takes back quotedText; nothing when the text does not have that form.
std::optional<std::string> readQuotedText(std::string_view quoted);

} // namespace velt

#endif
