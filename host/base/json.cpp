#include "host/base/json.h"

#include "base/json_text.h"
#include "base/utf8.h"

namespace velt::host {

namespace {

constexpr const char* blanks = " \t\r\n";

/// Bytes that are not UTF-8 are inside strings, where any character may take their place.
std::string repaired(const std::string& text) {
    constexpr std::string_view replacement = "\xEF\xBF\xBD";
    std::string good;
    std::string_view rest = text;
    for (std::size_t bad = findInvalidUtf8(rest); bad != std::string_view::npos;
         bad = findInvalidUtf8(rest)) {
        good.append(rest.substr(0, bad)).append(replacement);
        rest.remove_prefix(bad + 1);
    }
    return good.append(rest);
}

} // namespace

Result<Json::Value> parseObject(std::string_view text) {
    if (text.find_first_not_of(blanks) == std::string_view::npos) {
        return Json::Value(Json::objectValue);
    }
    if (const std::size_t invalid = findInvalidUtf8(text); invalid != std::string_view::npos) {
        return Error(placeIn(text, invalid) + ": the text is not UTF-8");
    }
    auto value = parseJson(text);
    if (value && !value->isObject()) {
        return Error(placeIn(text, text.find_first_not_of(blanks)) +
                     ": expected a JSON object, such as {\"key\": true}");
    }
    return value;
}

std::string toJson(const Json::Value& value) {
    std::string text = jsonText(value);
    return findInvalidUtf8(text) == std::string_view::npos ? text : repaired(text);
}

std::string pointerToken(const std::string& name) {
    std::string token;
    for (const char character : name) {
        token += character == '~' ? "~0" : character == '/' ? "~1" : std::string(1, character);
    }
    return token;
}

} // namespace velt::host
