// How the journal renders arguments.
#ifndef VELT_TESTS_SUPPORT_FAKE_PLATFORM_TEXT_H
#define VELT_TESTS_SUPPORT_FAKE_PLATFORM_TEXT_H

#include <json/value.h>

#include <string>
#include <utility>
#include <vector>

namespace fake {

/// Text that stands in the journal as it is, such as the name of a handle.
struct Verbatim {
    std::string text;
};

/// A number shown as 0x and upper-case hexadecimal digits.
struct Hex {
    unsigned long value;
};

/// "text" with C escapes for quotes, backslashes and control characters.
std::string quoted(const std::string& text);

std::string render(const char* text); ///< quoted, or null
std::string render(const std::string& text);
std::string render(int number);
std::string render(bool value);
std::string render(Hex number);
std::string render(const Verbatim& verbatim);
std::string render(const Json::Value& value); ///< compact JSON
std::string render(const std::vector<std::string>& texts);
/// {"KEY": "value", ...} in the given order.
std::string render(const std::vector<std::pair<std::string, std::string>>& entries);

/// All arguments rendered, with ", " between them.
template<typename... Args> std::string arguments(const Args&... args) {
    std::string joined;
    ((joined += (joined.empty() ? "" : ", ") + render(args)), ...);
    return joined;
}

} // namespace fake

#endif
