// JSON values from text and to text.
#ifndef VELT_BASE_JSON_TEXT_H
#define VELT_BASE_JSON_TEXT_H

#include "base/result.h"

#include <json/value.h>

#include <cstddef>
#include <string>
#include <string_view>

namespace velt {

/// The value of a JSON text: no comments, no duplicate keys, nothing after the value. An error says where the
/// first mistake is, "line 1, column 5: ...", without a full stop. Thread-safe.
Result<Json::Value> parseJson(std::string_view text);

/// Where in the text the byte at `offset` is: "line 1, column 5".
std::string placeIn(std::string_view text, std::size_t offset);

/// The value as text, UTF-8 as it is: on one line, or indented by this text and without a line end.
/// Thread-safe.
std::string jsonText(const Json::Value& value, const char* indentation = "");

} // namespace velt

#endif
